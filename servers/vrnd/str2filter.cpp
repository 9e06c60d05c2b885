// Filters from text: see str2filter.h. A text is read in place, by views of its parts.
#include "servers/vrnd/str2filter.h"

#include <cstdlib>
#include <cstring>
#include <string_view>
#include <utility>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/base/utf8_text.h"
#include "servers/vrnd/libdirbase/model/attr_names.h"
#include "servers/vrnd/libdirbase/model/filter_guards.h"
#include "servers/vrnd/libdirbase/model/substring_pieces.h"
#include "servers/vrnd/libdirbase/model/value_normalize.h"

namespace {

void tell_no_memory(const char* function)
{
    debug_error("Error - %s: malloc failed. Out of memory\n", function);
}

heap_text copy_of(std::string_view text)
{
    heap_text copy(static_cast<char*>(std::malloc(text.size() + 1)));
    if (copy != nullptr) {
        text.copy(copy.get(), text.size());
        copy.get()[text.size()] = '\0';
    }
    return copy;
}

filter_guard new_filter(std::uint64_t choice)
{
    filter_guard filter(static_cast<Filter*>(std::calloc(1, sizeof(Filter))));
    if (filter == nullptr) {
        tell_no_memory("str2filter");
    } else {
        filter->f_choice = choice;
    }
    return filter;
}

bool is_space(char c)
{
    return c == ' ' || (c >= '\t' && c <= '\r');
}

// The place of what closes the parenthesis at the start, or npos; see find_matching_paren.
std::size_t matching_parenthesis(std::string_view text)
{
    std::int64_t depth = 0;
    bool hidden = false;
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (!hidden && text[i] == '(') {
            ++depth;
        } else if (!hidden && text[i] == ')') {
            --depth;
        }
        if (depth == 0) {
            return i;
        }
        hidden = !hidden && text[i] == '\\';
    }
    return std::string_view::npos;
}

// The value of a hexadecimal digit, or -1.
int digit_value(char c)
{
    return c >= '0' && c <= '9'   ? c - '0'
           : c >= 'a' && c <= 'f' ? c - 'a' + 10
           : c >= 'A' && c <= 'F' ? c - 'A' + 10
                                  : -1;
}

// The bytes that a value stands for; null without memory.
heap_text unescaped(std::string_view text, std::size_t* length)
{
    heap_text value(static_cast<char*>(std::malloc(text.size() + 1)));
    if (value == nullptr) {
        tell_no_memory("unescape_value");
        return nullptr;
    }
    std::size_t used = 0;
    for (std::size_t i = 0; i < text.size(); ++i) {
        const int first = text[i] == '\\' && i + 1 < text.size() ? digit_value(text[i + 1]) : -1;
        const int second = first >= 0 && i + 2 < text.size() ? digit_value(text[i + 2]) : -1;
        char byte = text[i];
        if (second >= 0) {
            byte = static_cast<char>(first << 4 | second);
            i += 2;
        } else if (first >= 0) {
            byte = static_cast<char>(first);
            ++i;
        }
        value.get()[used++] = byte;
    }
    value.get()[used] = '\0';
    *length = used;
    return value;
}

// ---- simple items ---------------------------------------------------------------------------------------------------

// Puts a piece of a substring filter in normal form, as far as it has one.
void normalize_piece(heap_text& piece, std::uint32_t syntax)
{
    char* text = piece.release();
    const int result = value_normalize(&text, syntax);
    piece.reset(text);
    if (result == LDAP_INVALID_DN_SYNTAX && (syntax & SC_DN) != 0) {
        utfToUpper(text);  // a part of a DN needn't be one
    }
}

bool add_pieces(std::string_view text, filter_substrings& pieces, std::uint32_t syntax, bool normalize)
{
    substring_pieces inner;
    for (bool first = true, last = false; !last; first = false) {
        const std::size_t end = text.find('*');
        last = end == std::string_view::npos;
        if (last && text.empty() && !first) {
            break;
        }
        heap_text piece = copy_of(text.substr(0, end));
        if (piece == nullptr) {
            tell_no_memory("str2subvals");
            return false;
        }
        if (normalize) {
            normalize_piece(piece, syntax);
        }
        if (first) {
            pieces.f_sub_initial = piece.release();
        } else if (last) {
            pieces.f_sub_final = piece.release();
        } else if (!inner.add(std::move(piece))) {
            tell_no_memory("str2subvals");
            return false;
        }
        text.remove_prefix(last ? text.size() : end + 1);
    }
    pieces.f_sub_any = inner.release();
    return true;
}

filter_guard parse_presence(heap_text type)
{
    filter_guard filter = new_filter(LDAP_FILTER_PRESENT);
    if (filter != nullptr) {
        filter->f_type = attr_normalize(type.release());
    }
    return filter;
}

filter_guard parse_substrings(heap_text type, std::string_view value, bool normalize)
{
    filter_guard filter = new_filter(LDAP_FILTER_SUBSTRINGS);
    if (filter == nullptr) {
        return nullptr;
    }
    filter_substrings& pieces = filter->f_sub;
    pieces.f_sub_type = type.release();
    const std::uint32_t syntax = normalize ? attr_syntax_for_filter(attr_normalize(pieces.f_sub_type)) : 0;
    if (!add_pieces(value, pieces, syntax, normalize)) {
        return nullptr;
    }
    return filter;
}

filter_guard parse_assertion(heap_text type, std::uint64_t choice, std::string_view value, bool normalize)
{
    filter_guard filter = new_filter(choice);
    if (filter == nullptr) {
        return nullptr;
    }
    ava& assertion = filter->f_ava;
    assertion.ava_type = type.release();
    std::size_t length = 0;
    assertion.ava_value.bv_val = unescaped(value, &length).release();
    assertion.ava_value.bv_len = length;
    if (assertion.ava_value.bv_val == nullptr) {
        return nullptr;
    }
    if (normalize) {
        const std::uint32_t syntax = attr_syntax_for_filter(attr_normalize(assertion.ava_type));
        if (syntax == 0) {
            debug_error("str2simple: Unknown attribute %s in filter.\n", assertion.ava_type);
            return nullptr;
        }
        // A value that its syntax refuses stays as it is.
        value_normalize_berval(&assertion.ava_value, syntax, 0);
    }
    return filter;
}

filter_guard parse_simple(std::string_view text, bool normalize)
{
    const std::size_t equals = text.find('=');
    if (equals == std::string_view::npos) {
        return nullptr;
    }
    std::string_view type = text.substr(0, equals);
    const std::string_view value = text.substr(equals + 1);
    std::uint64_t choice = LDAP_FILTER_EQUALITY;
    if (!type.empty()) {
        const char mark = type.back();
        choice = mark == '<'   ? LDAP_FILTER_LE
                 : mark == '>' ? LDAP_FILTER_GE
                 : mark == '~' ? LDAP_FILTER_APPROX
                               : choice;
    }
    if (choice != LDAP_FILTER_EQUALITY) {
        type.remove_suffix(1);
    }
    heap_text name = copy_of(type);
    if (name == nullptr) {
        tell_no_memory("str2simple");
        return nullptr;
    }
    if (choice != LDAP_FILTER_EQUALITY || value.find('*') == std::string_view::npos) {
        return parse_assertion(std::move(name), choice, value, normalize);
    }
    return value == "*" ? parse_presence(std::move(name)) : parse_substrings(std::move(name), value, normalize);
}

// ---- filters --------------------------------------------------------------------------------------------------------

filter_guard parse_list(std::string_view text, std::uint64_t choice, bool normalize, unsigned depth);

// Parses what stands between the parentheses of a filter `depth` levels down.
filter_guard parse_inside(std::string_view text, bool normalize, unsigned depth)
{
    if (depth > FILTER_MAX_DEPTH) {
        debug_error("Error - str2filter: more than %u levels of nesting\n", FILTER_MAX_DEPTH);
        return nullptr;
    }
    switch (text.empty() ? '\0' : text.front()) {
    case '&': return parse_list(text.substr(1), LDAP_FILTER_AND, normalize, depth);
    case '|': return parse_list(text.substr(1), LDAP_FILTER_OR, normalize, depth);
    case '!': return parse_list(text.substr(1), LDAP_FILTER_NOT, normalize, depth);
    default: return parse_simple(text, normalize);
    }
}

// Parses the filter that a text begins with, and takes it off the text. A text that doesn't begin with a parenthesis
// is no member of a list.
filter_guard take_member(std::string_view& text, bool normalize, unsigned depth)
{
    const std::size_t end = matching_parenthesis(text);
    if (end == std::string_view::npos || end == 0) {
        return nullptr;
    }
    filter_guard member = parse_inside(text.substr(1, end - 1), normalize, depth);
    text.remove_prefix(end + 1);
    return member;
}

filter_guard parse_list(std::string_view text, std::uint64_t choice, bool normalize, unsigned depth)
{
    filter_guard parent = new_filter(choice);
    filter_list members;
    while (parent != nullptr) {
        while (!text.empty() && is_space(text.front())) {
            text.remove_prefix(1);
        }
        if (text.empty()) {
            parent->f_list = members.release();
            break;
        }
        filter_guard member = take_member(text, normalize, depth + 1);
        if (member == nullptr) {
            return nullptr;
        }
        members.append(std::move(member));
    }
    return parent;
}

filter_guard parse_filter(std::string_view text, bool normalize)
{
    if (text.empty()) {
        return nullptr;
    }
    return text.front() == '(' ? take_member(text, normalize, 1) : parse_simple(text, normalize);
}

}  // namespace

extern "C" {

Filter* str2filter(const char* text, int normalize)
{
    return text == nullptr ? nullptr : parse_filter(text, normalize != 0).release();
}

Filter* str2list(const char* text, std::uint64_t choice, int normalize)
{
    return text == nullptr || !filter_has_list(choice) ? nullptr
                                                       : parse_list(text, choice, normalize != 0, 1).release();
}

Filter* str2simple(const char* text, int normalize)
{
    return text == nullptr ? nullptr : parse_simple(text, normalize != 0).release();
}

int str2subvals(const char* text, Filter* filter, std::uint32_t syntax, int normalize)
{
    return add_pieces(text, filter->f_sub, syntax, normalize != 0) ? LDAP_SUCCESS : LDAP_NO_MEMORY;
}

const char* find_matching_paren(const char* text)
{
    const std::size_t place = text == nullptr ? std::string_view::npos : matching_parenthesis(text);
    return place == std::string_view::npos ? nullptr : text + place;
}

char* unescape_value(const char* text)
{
    std::size_t length = 0;
    return text == nullptr ? nullptr : unescaped(text, &length).release();
}

}  // extern "C"
