// Filters from BER: see filter_ber.h.
//
// A member of a construction can't be read beyond that construction: while it is read, the element ends there
// (ber_scope). The canonical text is written while the filter is read, into one builder; what a filter wrote before it
// turned out to be undefined is cut off again.
#include "servers/vrnd/libdirbase/connection/filter_ber.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <string_view>
#include <utility>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"
#include "libraries/libpwd/pwd_format.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/password_values.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/base/text_builder.h"
#include "servers/vrnd/libdirbase/base/utf8_text.h"
#include "servers/vrnd/libdirbase/model/attr_names.h"
#include "servers/vrnd/libdirbase/model/filter_guards.h"
#include "servers/vrnd/libdirbase/model/substring_pieces.h"
#include "servers/vrnd/libdirbase/model/value_normalize.h"

namespace {

constexpr ber_tag_t constructed = 0x20;
constexpr std::size_t first_room = 128;      // of a text
constexpr std::size_t longest_shown = 8100;  // of a value in the debug log

// Enters the construction at the position of an element: reads end with it, and behind it goes on what comes next.
class ber_scope {
public:
    explicit ber_scope(BerElement* ber) : ber_(ber), outer_end_(ber == nullptr ? nullptr : ber->ber_end)
    {
        ber_len_t length = 0;
        const ber_tag_t tag = ber_peek_tag(ber, &length);
        entered_ = ber != nullptr && tag != LBER_ERROR && (tag & constructed) != 0;
        if (entered_) {
            ber_skip_tag(ber, &length);
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
    text_builder& text;
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

// ---- assertions -----------------------------------------------------------------------------------------------------

// A text would end there.
bool has_zero(const berval& value)
{
    return std::memchr(value.bv_val, '\0', value.bv_len) != nullptr;
}

int read_assertion(const Connection* conn, BerElement* ber, ava& assertion, std::uint64_t choice, char** error_text)
{
    {
        const ber_scope inside(ber);
        heap_text type = inside ? read_type(ber) : nullptr;
        berval& value = assertion.ava_value;
        if (type == nullptr || fber_get_string_len(ber, &value.bv_val, &value.bv_len) == LBER_ERROR) {
            return malformed_assertion(conn);
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
    int result = filter_check_attr_constraints(conn, choice, info, error_text);
    if (result == LDAP_SUCCESS && (syntax & SC_CIS) != 0 && has_zero(assertion.ava_value)) {
        debug_error("get_ava_for_filter: a byte 0 in a text\n");
        result = LDAP_INVALID_SYNTAX;
    }
    if (result == LDAP_SUCCESS) {
        result = value_normalize_berval(&assertion.ava_value, syntax, 0);
    }
    if (result == LDAP_SUCCESS && (info->encryption & PWD_TWO_WAY) != 0) {
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
int keep_piece(ber_tag_t tag, heap_text piece, filter_substrings& pieces, substring_pieces& inner)
{
    switch (tag) {
    case LDAP_SUBSTRING_ANY: return inner.add(std::move(piece)) ? LDAP_SUCCESS : tell_no_memory("get_substring_filter");
    case LDAP_SUBSTRING_INITIAL:
    case LDAP_SUBSTRING_FINAL: {
        char*& place = tag == LDAP_SUBSTRING_INITIAL ? pieces.f_sub_initial : pieces.f_sub_final;
        if (place != nullptr) {
            debug_error("get_substring_filter: two pieces at one end\n");
            return LDAP_PROTOCOL_ERROR;
        }
        place = piece.release();
        return LDAP_SUCCESS;
    }
    default: debug_error("get_substring_filter: unknown type\n"); return LDAP_PROTOCOL_ERROR;
    }
}

// Makes a piece ready to be compared with values of an attribute.
int prepare_piece(heap_text& piece, std::size_t length, const asyntaxinfo& info)
{
    const std::size_t limit = info.attr == nullptr ? 0 : info.attr->length;
    if (limit != 0 && length > limit) {
        debug_error("get_substring_filter: value longer than schema allows.\n");
        return LDAP_CONSTRAINT_VIOLATION;
    }
    return normalize_piece(piece, info.syntax);
}

// Reads the pieces of an attribute, which `info` is null for when the schema doesn't know it.
int read_pieces(const filter_source& from, const asyntaxinfo* info, filter_substrings& pieces)
{
    substring_pieces inner;
    char* last = nullptr;
    ber_len_t length = 0;
    if (ber_peek_tag(from.ber, &length) != LBER_SEQUENCE) {  // there is more that can be entered
        return malformed("get_substring_filter");
    }
    ber_tag_t tag = ber_first_element(from.ber, &length, &last);
    if (tag == LBER_DEFAULT) {
        return malformed("get_substring_filter");  // there is one piece at least
    }
    for (; tag != LBER_DEFAULT; tag = ber_next_element(from.ber, &length, last)) {
        heap_text piece;
        int result = tag == LBER_ERROR ? malformed("get_substring_filter") : read_piece(from.ber, piece, &length);
        if (result == LDAP_SUCCESS && info != nullptr) {
            result = prepare_piece(piece, length, *info);
        }
        if (result == LDAP_SUCCESS) {
            from.text.append(tag == LDAP_SUBSTRING_INITIAL ? "" : "*");
            append_expanded(from.text, piece.get());
            result = keep_piece(tag, std::move(piece), pieces, inner);
        }
        if (result != LDAP_SUCCESS) {
            return result;
        }
    }
    from.text.append(pieces.f_sub_final == nullptr ? "*)" : ")");
    pieces.f_sub_any = inner.release();
    return LDAP_SUCCESS;
}

int read_substrings(const filter_source& from, filter_substrings& pieces)
{
    const ber_scope inside(from.ber);
    heap_text type = inside ? read_type(from.ber) : nullptr;
    if (type == nullptr) {
        return malformed("get_substring_filter");
    }
    pieces.f_sub_type = type.release();
    asyntaxinfo* info = nullptr;
    if (attr_syntax_for_filter_return_asi(pieces.f_sub_type, &info) == 0) {
        info = nullptr;
    }
    int result = filter_check_attr_constraints(from.conn, LDAP_FILTER_SUBSTRINGS, info, from.error_text);
    if (result == LDAP_SUCCESS) {
        from.text.append('(') && from.text.append(pieces.f_sub_type) && from.text.append('=');
        result = read_pieces(from, info, pieces);
    }
    if (result == LDAP_SUCCESS && info == nullptr) {
        debug_error("get_substring_filter: Unknown attribute in filter.\n");
        result = LDAP_NO_SUCH_ATTRIBUTE;
    }
    return result;
}

// ---- filters --------------------------------------------------------------------------------------------------------

int read_filter(const filter_source& from, unsigned depth, filter_guard& filter);

// Reads the members of the set at the position, `depth` levels down. There are none when one of them makes it
// undefined.
int read_list(const filter_source& from, std::uint64_t choice, unsigned depth, filter_list& members)
{
    const ber_scope inside(from.ber);
    if (!inside) {
        return malformed("get_filter_list");
    }
    bool undefined = false;
    while (!inside.at_end()) {
        filter_guard member;
        const int result = read_filter(from, depth, member);
        if (result != LDAP_SUCCESS) {
            return result;
        }
        if (member == nullptr && choice != LDAP_FILTER_AND && choice != LDAP_FILTER_OR) {
            return LDAP_OPERATIONS_ERROR;
        }
        undefined = undefined || (member == nullptr && choice == LDAP_FILTER_AND);
        if (undefined) {
            members.clear();
        } else if (member != nullptr) {
            members.append(std::move(member));
        }
    }
    return LDAP_SUCCESS;
}

int read_presence(const filter_source& from, filter_guard& filter)
{
    if (ber_scanf_w(from.ber, "a", &filter->f_type) == LBER_ERROR) {
        return malformed("get_filter");
    }
    if (attr_syntax_for_filter(filter->f_type) == 0) {
        return LDAP_NO_SUCH_ATTRIBUTE;
    }
    from.text.append('(') && from.text.append(attr_normalize(filter->f_type)) && from.text.append("=*)");
    return LDAP_SUCCESS;
}

int read_and_or(const filter_source& from, unsigned depth, filter_guard& filter)
{
    from.text.append(filter->f_choice == LDAP_FILTER_AND ? "(&" : "(|");
    filter_list members;
    const int result = read_list(from, filter->f_choice, depth + 1, members);
    if (result == LDAP_SUCCESS && members.empty()) {
        filter.reset();
    } else if (result == LDAP_SUCCESS) {
        filter->f_list = members.release();
        from.text.append(')');
    }
    return result;
}

int read_not(const filter_source& from, unsigned depth, filter_guard& filter)
{
    const ber_scope inside(from.ber);
    filter_guard child;
    from.text.append("(!");
    const int result = inside ? read_filter(from, depth + 1, child) : malformed("get_filter");
    if (result != LDAP_SUCCESS) {
        return result;
    }
    if (!inside.at_end()) {
        return malformed("get_filter");  // a NOT has one child
    }
    if (child == nullptr) {
        filter.reset();
    } else {
        filter->f_list = child.release();
        from.text.append(')');
    }
    return LDAP_SUCCESS;
}

int read_ava(const filter_source& from, Filter& filter)
{
    ava& assertion = filter.f_ava;
    const int result = read_assertion(from.conn, from.ber, assertion, filter.f_choice, from.error_text);
    if (result == LDAP_SUCCESS) {
        from.text.append('(') && from.text.append(assertion.ava_type) &&
            from.text.append(filter_comparison(filter.f_choice)) &&
            append_expanded(from.text, assertion.ava_value.bv_val) && from.text.append(')');
    }
    return result;
}

int tell_too_deep(char** error_text)
{
    debug_error("Error - get_filter: more than %u levels of nesting\n", FILTER_MAX_DEPTH);
    if (error_text != nullptr) {
        vrn_asprintf(error_text, "The search filter has more than %u levels.", FILTER_MAX_DEPTH);
    }
    return LDAP_UNWILLING_TO_PERFORM;
}

// Reads what the filter's choice says is there. The filter is released when its members make it undefined.
int read_choice(const filter_source& from, unsigned depth, filter_guard& filter)
{
    switch (filter->f_choice) {
    case LDAP_FILTER_AND:
    case LDAP_FILTER_OR: return read_and_or(from, depth, filter);
    case LDAP_FILTER_NOT: return read_not(from, depth, filter);
    case LDAP_FILTER_EQUALITY:
    case LDAP_FILTER_GE:
    case LDAP_FILTER_LE:
    case LDAP_FILTER_APPROX: return read_ava(from, *filter);
    case LDAP_FILTER_PRESENT: return read_presence(from, filter);
    case LDAP_FILTER_SUBSTRINGS: return read_substrings(from, filter->f_sub);
    case LDAP_FILTER_EXTENDED:
        debug_error("get_filter: extensibleMatch filter type is not supported\n");
        ber_scanf(from.ber, "x");
        return LDAP_NO_SUCH_ATTRIBUTE;
    default:
        debug_error("get_filter: unknown filter type %d\n", static_cast<int>(filter->f_choice));
        return LDAP_PROTOCOL_ERROR;
    }
}

// Reads a filter `depth` levels down; there is none when it is undefined.
int read_filter(const filter_source& from, unsigned depth, filter_guard& filter)
{
    if (depth > FILTER_MAX_DEPTH) {
        return tell_too_deep(from.error_text);
    }
    filter.reset(static_cast<Filter*>(std::calloc(1, sizeof(Filter))));
    if (filter == nullptr) {
        debug_error("Error - get_filter: malloc for f failed. Out of memory\n");
        return LDAP_NO_MEMORY;
    }
    ber_len_t length = 0;
    filter->f_choice = ber_peek_tag(from.ber, &length);
    const std::size_t start = from.text.length();
    int result = read_choice(from, depth, filter);
    // What makes an assertion undefined isn't a failure.
    if (result == LDAP_NO_SUCH_ATTRIBUTE || result == LDAP_CONSTRAINT_VIOLATION) {
        filter.reset();
        result = LDAP_SUCCESS;
    }
    if (filter == nullptr) {
        from.text.cut(start);
    }
    return result;
}

// Hands the text over; LDAP_NO_MEMORY when it couldn't be written.
int finish_text(text_builder& text, char** result, const char* function)
{
    *result = text.release().release();
    return *result == nullptr ? tell_no_memory(function) : LDAP_SUCCESS;
}

}  // namespace

extern "C" {

int get_filter(const Connection* conn, BerElement* ber, Filter** filter, char** text, char** error_text)
{
    *filter = nullptr;
    *text = nullptr;
    text_builder canonical(first_room);
    filter_guard made;
    int result = read_filter({conn, ber, error_text, canonical}, 1, made);
    if (result == LDAP_SUCCESS && made != nullptr) {
        result = finish_text(canonical, text, "get_filter");
        *filter = result == LDAP_SUCCESS ? made.release() : nullptr;
    }
    return result;
}

int get_filter_list(const Connection* conn, BerElement* ber, Filter** list, char** text, std::uint64_t choice,
                    char** error_text)
{
    *list = nullptr;
    *text = nullptr;
    text_builder joined(first_room);
    filter_list members;
    int result = read_list({conn, ber, error_text, joined}, choice, 1, members);
    if (result == LDAP_SUCCESS && !members.empty()) {
        result = finish_text(joined, text, "get_filter_list");
        *list = result == LDAP_SUCCESS ? members.release() : nullptr;
    }
    return result;
}

int get_substring_filter(const Connection* conn, BerElement* ber, Filter* filter, char** text, char** error_text)
{
    *text = nullptr;
    filter->f_choice = LDAP_FILTER_SUBSTRINGS;
    filter->f_sub = {};
    text_builder canonical(first_room);
    const int result = read_substrings({conn, ber, error_text, canonical}, filter->f_sub);
    return result == LDAP_SUCCESS ? finish_text(canonical, text, "get_substring_filter") : result;
}

int get_ava_for_filter(const Connection* conn, BerElement* ber, ava* assertion, std::uint64_t choice, char** error_text)
{
    ava_init(assertion);
    const int result = read_assertion(conn, ber, *assertion, choice, error_text);
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
    append_expanded(expanded, {value, length});
    return finish_text(expanded, text, "expand_filter_value");
}

}  // extern "C"
