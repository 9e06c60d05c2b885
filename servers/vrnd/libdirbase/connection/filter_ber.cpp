// Filters from BER: see filter_ber.h.
//
// A member of a construction can't be read beyond that construction: while it is read, the element ends there
// (ber_scope). The canonical text of a filter grows in one block from the inside out: a list begins with its own
// operator, and its members' texts are put behind it.
#include "servers/vrnd/libdirbase/connection/filter_ber.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <string_view>
#include <utility>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/base/charray.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/password_values.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/base/text_builder.h"
#include "servers/vrnd/libdirbase/base/utf8_text.h"
#include "servers/vrnd/libdirbase/model/attr_names.h"
#include "servers/vrnd/libdirbase/model/filter_guards.h"
#include "servers/vrnd/libdirbase/model/value_normalize.h"

namespace {

constexpr int encryption_two_way = 0x80;
constexpr std::size_t longest_shown = 8100;  // of a value in the debug log

// Enters the construction at the position of an element: reads end with it, and behind it goes on what comes next.
class ber_scope {
public:
    explicit ber_scope(BerElement* ber) : ber_(ber), outer_end_(ber == nullptr ? nullptr : ber->ber_end)
    {
        ber_len_t length = 0;
        entered_ = ber_skip_tag(ber, &length) != LBER_ERROR;
        if (entered_) {
            ber_->ber_end = ber_->ber_ptr + length;
        }
    }
    ~ber_scope()
    {
        if (entered_) {
            ber_->ber_ptr = ber_->ber_end;
            ber_->ber_end = outer_end_;
        }
    }
    ber_scope(const ber_scope&) = delete;
    ber_scope& operator=(const ber_scope&) = delete;

    explicit operator bool() const { return entered_; }
    bool at_end() const { return ber_->ber_ptr == ber_->ber_end; }

private:
    BerElement* ber_;
    char* outer_end_;
    bool entered_;
};

// What all steps of one call share.
struct filter_source {
    const Connection* conn;
    BerElement* ber;
    char** error_text;
};

// What was read: no filter and no text when it is undefined.
struct filter_read {
    filter_guard filter;
    heap_text text;
};

int malformed(const char* function)
{
    debug_error("Error - %s: SBER_SCANF failed.\n", function);
    return LDAP_PROTOCOL_ERROR;
}

int malformed_assertion(const Connection* conn)
{
    constexpr char function[] = "get_ava_for_filter";
    const char* const client = conn == nullptr || conn->c_client_ip == nullptr ? "NULL" : conn->c_client_ip;
    const int operation = conn == nullptr || conn->c_ops == nullptr ? 0 : conn->c_ops->o_opid;
    PrintMessage(MSG_COMPONENT_SERVER, MSG_WARNING, 5, conn == nullptr ? -1 : conn->c_connid, client, operation,
                 function);
    return malformed(function);
}

int tell_no_memory(const char* function)
{
    debug_error("Error - %s: malloc failed. Out of memory\n", function);
    return LDAP_NO_MEMORY;
}

// Reads the name of an attribute and puts it in its plain form; null when none is there. A name holds no byte 0.
heap_text read_type(BerElement* ber)
{
    char* text = nullptr;
    ber_len_t length = 0;
    fber_get_string_len(ber, &text, &length);
    heap_text type(text);
    if (type != nullptr && std::strlen(type.get()) != length) {
        type.reset();
    }
    if (type != nullptr) {
        attr_normalize(type.get());
    }
    return type;
}

// ---- texts ----------------------------------------------------------------------------------------------------------

// Adds the text of a value.
bool append_expanded(text_builder& text, std::string_view value)
{
    constexpr char digits[] = "0123456789abcdef";
    const std::size_t start = text.length();
    bool added = true;
    while (!value.empty() && added) {
        const std::size_t plain = std::min(value.find_first_of("()*\\"), value.size());
        added = text.append(value.substr(0, plain));
        value.remove_prefix(plain);
        if (!value.empty() && added) {
            const auto byte = static_cast<unsigned char>(value.front());
            const char escaped[] = {'\\', digits[byte >> 4], digits[byte & 15]};
            added = text.append({escaped, sizeof escaped});
            value.remove_prefix(1);
        }
    }
    if (added && (read_ldap_debug() & LDAP_DEBUG_TRACE) != 0) {
        const std::string_view expanded = text.view().substr(start);
        const bool is_short = expanded.size() < longest_shown;
        PrintDebug(LDAP_DEBUG_TRACE, "expand_filter_value: %.*s\n", is_short ? static_cast<int>(expanded.size()) : 8,
                   is_short ? expanded.data() : "too long");
    }
    return added;
}

// The text of a value as far as other texts hold it, which is up to its first zero byte.
std::string_view text_of(const berval& value)
{
    return value.bv_val == nullptr ? std::string_view() : std::string_view(value.bv_val);
}

// Releases the text into the result, or tells that memory ran out.
int finish_text(text_builder& text, heap_text& result, const char* function)
{
    result = text.release();
    return result == nullptr ? tell_no_memory(function) : LDAP_SUCCESS;
}

int make_assertion_text(const Filter& filter, heap_text& result)
{
    const char* const between = filter.f_choice == LDAP_FILTER_GE       ? ">="
                                : filter.f_choice == LDAP_FILTER_LE     ? "<="
                                : filter.f_choice == LDAP_FILTER_APPROX ? "~="
                                                                        : "=";
    const std::string_view type = filter.f_ava.ava_type;
    const std::string_view value = text_of(filter.f_ava.ava_value);
    text_builder text(type.size() + value.size() + sizeof "(~=)");
    text.append('(') && text.append(type) && text.append(between) && append_expanded(text, value) && text.append(')');
    return finish_text(text, result, "get_filter");
}

// ---- assertions -----------------------------------------------------------------------------------------------------

int read_assertion(const filter_source& from, ava& assertion, std::uint64_t choice)
{
    {
        const ber_scope inside(from.ber);
        heap_text type = inside ? read_type(from.ber) : nullptr;
        berval& value = assertion.ava_value;
        if (type == nullptr || fber_get_string_len(from.ber, &value.bv_val, &value.bv_len) == LBER_ERROR) {
            return malformed_assertion(from.conn);
        }
        assertion.ava_type = type.release();
    }
    if (std::strcmp(assertion.ava_type, "debug") == 0) {
        return LDAP_SUCCESS;
    }
    asyntaxinfo* info = nullptr;
    const std::uint32_t syntax = attr_syntax_for_filter_return_asi(assertion.ava_type, &info);
    if (syntax == 0) {
        debug_error("get_ava_for_filter: Unknown attribute in filter.\n");
        return LDAP_NO_SUCH_ATTRIBUTE;
    }
    int result = filter_check_attr_constraints(from.conn, choice, info, from.error_text);
    if (result == LDAP_SUCCESS) {
        result = value_normalize_berval(&assertion.ava_value, syntax, 0);
    }
    if (result == LDAP_SUCCESS && (info->encryption & encryption_two_way) != 0) {
        result = value_encode_one_value(info->encryption, &assertion.ava_value, &assertion.ava_encoded, nullptr);
    }
    if (result != LDAP_SUCCESS) {
        return result;
    }
    if (info->attr != nullptr && info->attr->length != 0 && assertion.ava_value.bv_len > info->attr->length) {
        debug_error("get_ava_for_filter: value specified exceeds attribute length in schema.\n");
        return LDAP_CONSTRAINT_VIOLATION;
    }
    return LDAP_SUCCESS;
}

// ---- substrings -----------------------------------------------------------------------------------------------------

// Puts a piece in normal form. Part of a DN, and one letter of a country, needn't be values themselves.
int normalize_piece(heap_text& piece, std::uint32_t syntax)
{
    char* text = piece.release();
    const int result = value_normalize(&text, syntax);
    piece.reset(text);
    const bool is_letter_of_country =
        result == LDAP_INVALID_SYNTAX && (syntax & SC_COUNTRY_STRING) != 0 && text != nullptr && std::strlen(text) == 1;
    if (result == LDAP_INVALID_DN_SYNTAX || is_letter_of_country) {
        utfToUpper(text);
        return LDAP_SUCCESS;
    }
    return result;
}

// Reads the text of a piece. A byte 0 is part of no value that pieces are looked for in.
int read_piece(BerElement* ber, heap_text& piece, ber_len_t* length)
{
    char* text = nullptr;
    if (fber_get_string_len(ber, &text, length) == LBER_ERROR) {
        return malformed("get_substring_filter");
    }
    piece.reset(text);
    if (*length == 0 || std::strlen(text) != *length) {
        debug_error("get_substring_filter: Invalid syntax\n");
        return LDAP_INVALID_SYNTAX;
    }
    return LDAP_SUCCESS;
}

// Puts a piece where its tag says.
int keep_piece(ber_tag_t tag, heap_text piece, filter_substrings& pieces)
{
    if (tag == LDAP_SUBSTRING_ANY) {
        if (charray_add(&pieces.f_sub_any, piece.get()) != LDAP_SUCCESS) {
            return LDAP_NO_MEMORY;
        }
        (void)piece.release();  // the array has it
        return LDAP_SUCCESS;
    }
    char*& place = tag == LDAP_SUBSTRING_INITIAL ? pieces.f_sub_initial : pieces.f_sub_final;
    if (place != nullptr) {
        debug_error("get_substring_filter: two pieces at one end\n");
        return LDAP_PROTOCOL_ERROR;
    }
    place = piece.release();
    return LDAP_SUCCESS;
}

bool is_substring_tag(ber_tag_t tag)
{
    return tag == LDAP_SUBSTRING_INITIAL || tag == LDAP_SUBSTRING_ANY || tag == LDAP_SUBSTRING_FINAL;
}

// Reads the pieces of an attribute, which `info` is null for when the schema doesn't know it.
int read_pieces(const filter_source& from, const asyntaxinfo* info, filter_substrings& pieces, text_builder& text)
{
    const std::size_t limit = info == nullptr || info->attr == nullptr ? 0 : info->attr->length;
    char* last = nullptr;
    ber_len_t length = 0;
    ber_tag_t tag = ber_first_element(from.ber, &length, &last);
    if (tag == LBER_DEFAULT) {
        return malformed("get_substring_filter");  // there is one piece at least
    }
    for (; tag != LBER_DEFAULT; tag = ber_next_element(from.ber, &length, last)) {
        heap_text piece;
        int result = tag == LBER_ERROR ? malformed("get_substring_filter") : read_piece(from.ber, piece, &length);
        if (result == LDAP_SUCCESS && !is_substring_tag(tag)) {
            debug_error("get_substring_filter: unknown type\n");
            result = LDAP_PROTOCOL_ERROR;
        }
        if (result == LDAP_SUCCESS && limit != 0 && length > limit) {
            debug_error("get_substring_filter: value longer than schema allows.\n");
            result = LDAP_CONSTRAINT_VIOLATION;
        }
        if (result == LDAP_SUCCESS && info != nullptr) {
            result = normalize_piece(piece, info->syntax);
        }
        if (result == LDAP_SUCCESS) {
            if (tag != LDAP_SUBSTRING_INITIAL) {
                text.append('*');
            }
            append_expanded(text, piece.get());
            result = keep_piece(tag, std::move(piece), pieces);
        }
        if (result != LDAP_SUCCESS) {
            return result;
        }
    }
    if (pieces.f_sub_final == nullptr) {
        text.append('*');
    }
    return LDAP_SUCCESS;
}

int read_substrings(const filter_source& from, filter_substrings& pieces, heap_text& result)
{
    const ber_scope inside(from.ber);
    heap_text type = inside ? read_type(from.ber) : nullptr;
    if (type == nullptr) {
        return malformed("get_substring_filter");
    }
    pieces.f_sub_type = type.release();
    asyntaxinfo* info = nullptr;
    const bool known = attr_syntax_for_filter_return_asi(pieces.f_sub_type, &info) != 0;
    int failed =
        filter_check_attr_constraints(from.conn, LDAP_FILTER_SUBSTRINGS, known ? info : nullptr, from.error_text);
    if (failed != LDAP_SUCCESS) {
        return failed;
    }
    text_builder text(2 * static_cast<std::size_t>(from.ber->ber_end - from.ber->ber_ptr) + sizeof "(=*)");
    text.append('(') && text.append(pieces.f_sub_type) && text.append('=');
    failed = read_pieces(from, known ? info : nullptr, pieces, text);
    if (failed != LDAP_SUCCESS) {
        return failed;
    }
    if (!known) {
        debug_error("get_substring_filter: Unknown attribute in filter.\n");
        return LDAP_NO_SUCH_ATTRIBUTE;
    }
    text.append(')');
    return finish_text(text, result, "get_substring_filter");
}

// ---- filters --------------------------------------------------------------------------------------------------------

int read_filter(const filter_source& from, unsigned depth, filter_read& read);

// Reads the members of the set at the position, `depth` levels down. There is no list when one of them makes it
// undefined. Their texts are put behind what `text` holds.
int read_list(const filter_source& from, std::uint64_t choice, unsigned depth, filter_list& list, text_builder& text)
{
    const ber_scope inside(from.ber);
    if (!inside) {
        return malformed("get_filter_list");
    }
    bool undefined = false;
    while (!inside.at_end()) {
        filter_read member;
        const int result = read_filter(from, depth, member);
        if (result != LDAP_SUCCESS) {
            return result;
        }
        if (member.filter != nullptr) {
            if (!undefined && !text.append(member.text.get())) {
                return tell_no_memory("get_filter_list");
            }
            list.append(std::move(member.filter));
        } else if (choice == LDAP_FILTER_AND) {
            undefined = true;
        } else if (choice != LDAP_FILTER_OR) {
            return LDAP_OPERATIONS_ERROR;
        }
    }
    if (undefined) {
        list.clear();
    }
    return LDAP_SUCCESS;
}

int read_presence(const filter_source& from, filter_read& read)
{
    if (ber_scanf_w(from.ber, "a", &read.filter->f_type) == LBER_ERROR) {
        return malformed("get_filter");
    }
    if (attr_syntax_for_filter(read.filter->f_type) == 0) {
        read.filter.reset();
        return LDAP_SUCCESS;
    }
    const std::string_view type = attr_normalize(read.filter->f_type);
    text_builder text(type.size() + sizeof "(=*)");
    text.append('(') && text.append(type) && text.append("=*)");
    return finish_text(text, read.text, "get_filter");
}

int read_and_or(const filter_source& from, unsigned depth, filter_read& read)
{
    text_builder text(64);
    text.append(read.filter->f_choice == LDAP_FILTER_AND ? "(&" : "(|");
    filter_list list;
    const int result = read_list(from, read.filter->f_choice, depth + 1, list, text);
    if (result != LDAP_SUCCESS) {
        return result;
    }
    read.filter->f_list = list.release();
    if (read.filter->f_list == nullptr) {
        read.filter.reset();
        return LDAP_SUCCESS;
    }
    text.append(')');
    return finish_text(text, read.text, "get_filter");
}

int read_not(const filter_source& from, unsigned depth, filter_read& read)
{
    filter_read child;
    {
        const ber_scope inside(from.ber);
        const int result = inside ? read_filter(from, depth + 1, child) : LDAP_PROTOCOL_ERROR;
        if (result != LDAP_SUCCESS) {
            return result;
        }
        if (!inside.at_end()) {
            return malformed("get_filter");  // a NOT has one child
        }
    }
    if (child.filter == nullptr) {
        read.filter.reset();
        return LDAP_SUCCESS;
    }
    read.filter->f_list = child.filter.release();
    text_builder text(std::strlen(child.text.get()) + sizeof "(!)");
    text.append("(!") && text.append(child.text.get()) && text.append(')');
    return finish_text(text, read.text, "get_filter");
}

// What makes an assertion undefined isn't a failure.
int undefined_or_failed(int result, filter_read& read)
{
    if (result == LDAP_NO_SUCH_ATTRIBUTE || result == LDAP_CONSTRAINT_VIOLATION) {
        read.filter.reset();
        return LDAP_SUCCESS;
    }
    return result;
}

int read_ava(const filter_source& from, filter_read& read)
{
    const int result = read_assertion(from, read.filter->f_ava, read.filter->f_choice);
    if (result != LDAP_SUCCESS) {
        return undefined_or_failed(result, read);
    }
    return make_assertion_text(*read.filter, read.text);
}

int tell_too_deep(char** error_text)
{
    debug_error("Error - get_filter: more than %u levels of nesting\n", FILTER_MAX_DEPTH);
    if (error_text != nullptr) {
        vrn_asprintf(error_text, "The search filter has more than %u levels.", FILTER_MAX_DEPTH);
    }
    return LDAP_UNWILLING_TO_PERFORM;
}

// Reads a filter `depth` levels down.
int read_filter(const filter_source& from, unsigned depth, filter_read& read)
{
    if (depth > FILTER_MAX_DEPTH) {
        return tell_too_deep(from.error_text);
    }
    read.filter.reset(static_cast<Filter*>(std::calloc(1, sizeof(Filter))));
    if (read.filter == nullptr) {
        debug_error("Error - get_filter: malloc for f failed. Out of memory\n");
        return LDAP_NO_MEMORY;
    }
    ber_len_t length = 0;
    const ber_tag_t tag = ber_peek_tag(from.ber, &length);
    read.filter->f_choice = tag;
    switch (tag) {
    case LDAP_FILTER_AND:
    case LDAP_FILTER_OR: return read_and_or(from, depth, read);
    case LDAP_FILTER_NOT: return read_not(from, depth, read);
    case LDAP_FILTER_EQUALITY:
    case LDAP_FILTER_GE:
    case LDAP_FILTER_LE:
    case LDAP_FILTER_APPROX: return read_ava(from, read);
    case LDAP_FILTER_PRESENT: return read_presence(from, read);
    case LDAP_FILTER_SUBSTRINGS: return undefined_or_failed(read_substrings(from, read.filter->f_sub, read.text), read);
    case LDAP_FILTER_EXTENDED:
        debug_error("get_filter: extensibleMatch filter type is not supported\n");
        ber_scanf(from.ber, "x");
        read.filter.reset();
        return LDAP_SUCCESS;
    default: debug_error("get_filter: unknown filter type %d\n", static_cast<int>(tag)); return LDAP_PROTOCOL_ERROR;
    }
}

}  // namespace

extern "C" {

int get_filter(const Connection* conn, BerElement* ber, Filter** filter, char** text, char** error_text)
{
    *filter = nullptr;
    *text = nullptr;
    filter_read read;
    const int result = read_filter({conn, ber, error_text}, 1, read);
    if (result == LDAP_SUCCESS && read.filter != nullptr) {
        *filter = read.filter.release();
        *text = read.text.release();
    }
    return result;
}

int get_filter_list(const Connection* conn, BerElement* ber, Filter** list, char** text, std::uint64_t choice,
                    char** error_text)
{
    *list = nullptr;
    *text = nullptr;
    filter_list filters;
    text_builder joined(64);
    const int result = read_list({conn, ber, error_text}, choice, 1, filters, joined);
    if (result != LDAP_SUCCESS) {
        return result;
    }
    if (filters.empty()) {
        return LDAP_SUCCESS;
    }
    heap_text made;
    const int failed = finish_text(joined, made, "get_filter_list");
    if (failed == LDAP_SUCCESS) {
        *list = filters.release();
        *text = made.release();
    }
    return failed;
}

int get_substring_filter(const Connection* conn, BerElement* ber, Filter* filter, char** text, char** error_text)
{
    filter->f_sub = {};
    heap_text made;
    const int result = read_substrings({conn, ber, error_text}, filter->f_sub, made);
    *text = made.release();
    return result;
}

int get_ava_for_filter(const Connection* conn, BerElement* ber, ava* assertion, std::uint64_t choice, char** error_text)
{
    ava_init(assertion);
    const int result = read_assertion({conn, ber, error_text}, *assertion, choice);
    if (result != LDAP_SUCCESS) {
        ava_free(assertion, 0);
    }
    return result;
}

int get_ava(BerElement* ber, ava* assertion)
{
    ava_init(assertion);
    if (ber_scanf_w(ber, "{ao}", &assertion->ava_type, &assertion->ava_value) == LBER_ERROR) {
        PrintMessage(MSG_COMPONENT_SERVER, MSG_WARNING, 5, -1, "NULL", 0, "get_ava");
        return LDAP_PROTOCOL_ERROR;
    }
    attr_normalize(assertion->ava_type);
    value_normalize_berval(&assertion->ava_value, attr_syntax(assertion->ava_type), 0);
    return LDAP_SUCCESS;
}

int expand_filter_value(const char* value, unsigned long length, char** text)
{
    *text = nullptr;
    text_builder expanded(3 * length + 1);
    if (append_expanded(expanded, {value, length})) {
        *text = expanded.release().release();
    }
    return *text == nullptr ? tell_no_memory("expand_filter_value") : LDAP_SUCCESS;
}

}  // extern "C"
