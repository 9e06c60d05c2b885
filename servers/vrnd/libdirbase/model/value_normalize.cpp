// Normal forms: see value_normalize.h. Rules check a text before they write, so what they refuse stays whole.
#include "servers/vrnd/libdirbase/model/value_normalize.h"

#include <cstring>
#include <utility>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/base/utf8_text.h"
#include "servers/vrnd/libdirbase/model/dn_esc.h"

namespace {

// The lines of the debug log; each form of the call has its own.
struct refusal_lines {
    const char* no_leading_quote;
    const char* bit_out_of_range;
    const char* no_bits;
    const char* unfinished_bits;
    const char* junk_behind_bits;
    const char* digit_out_of_range;
    const char* inner_space;
    const char* country;
};

constexpr refusal_lines lines_of_text = {
    "Error - value_normalize: bit string missing leading quote %s\n",
    "Error - value_normalize: bit string value out of range %s\n",
    "Error - value_normalize: empty bit string\n",
    "Error - value_normalize: bad bit string value %s\n",
    "Error - value_normalize: bad bit string value %s\n",
    "Error - value_normalize: numeric string value out of range %s\n",
    "Error - value_normalize: bad numeric string value %s\n",
    "Error - value_normalize: bad country string value %s\n",
};
constexpr refusal_lines lines_of_berval = {
    "Error - value_normalize_berval: bit string missing leading quote %s\n",
    "Error - value_normalize_berval: bit string value out of range 'B' %s\n",
    "Error - value_normalize_berval: empty bit string value %s\n",
    "Error - value_normalize_berval: bit string missing trailing 'B' %s\n",
    "Error - value_normalize_berval: bad bit string value %s\n",
    "Error - value_normalize_berval: numeric string value out of range %s\n",
    "Error - value_normalize_berval: bad numeric string value %s\n",
    "Error - value_normalize_berval: bad country string value %s\n",
};

int refuse(const char* line, const char* text)
{
    debug_error(line, text);
    return LDAP_INVALID_SYNTAX;
}

bool is_letter(char c)
{
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}

// Makes [from, from + length) all of the text that begins at `text`.
int keep(char* text, const char* from, std::size_t length)
{
    std::memmove(text, from, length);
    text[length] = '\0';
    return LDAP_SUCCESS;
}

int normalize_telephone(char* text)
{
    char* out = text;
    for (const char* in = text; *in != '\0'; ++in) {
        if (*in != ' ' && *in != '-') {
            *out++ = *in >= 'a' && *in <= 'z' ? static_cast<char>(*in - 'a' + 'A') : *in;
        }
    }
    *out = '\0';
    return LDAP_SUCCESS;
}

int normalize_bits(char* text, const refusal_lines& lines)
{
    const char* at = text + std::strspn(text, " ");
    if (*at != '\'') {
        return refuse(lines.no_leading_quote, text);
    }
    const char* const bits = ++at;
    const std::size_t count = std::strspn(bits, "01");
    at += count;
    if (*at == '\0') {
        return refuse(lines.unfinished_bits, text);
    }
    if (*at != '\'') {
        return refuse(lines.bit_out_of_range, text);
    }
    if (count == 0) {
        return refuse(lines.no_bits, text);
    }
    ++at;
    if (*at != 'B' && *at != 'b') {
        return refuse(lines.unfinished_bits, text);
    }
    ++at;
    return at[std::strspn(at, " ")] == '\0' ? keep(text, bits, count) : refuse(lines.junk_behind_bits, text);
}

int normalize_digits(char* text, const refusal_lines& lines)
{
    const char* const digits = text + std::strspn(text, " ");
    const std::size_t count = std::strspn(digits, "0123456789");
    const char* const behind = digits + count;
    if (*behind != '\0' && *behind != ' ') {
        return refuse(lines.digit_out_of_range, text);
    }
    return behind[std::strspn(behind, " ")] == '\0' ? keep(text, digits, count) : refuse(lines.inner_space, text);
}

// Every rule but that of DNs; the text can't grow.
int normalize_in_place(char* text, std::uint32_t syntax, const refusal_lines& lines)
{
    if ((syntax & SC_TEL) != 0) {
        return normalize_telephone(text);
    }
    if ((syntax & SC_BIT_STRING) != 0) {
        return normalize_bits(text, lines);
    }
    if ((syntax & SC_NUMERIC_STRING) != 0) {
        return normalize_digits(text, lines);
    }
    if ((syntax & SC_COUNTRY_STRING) != 0 && !(is_letter(text[0]) && is_letter(text[1]) && text[2] == '\0')) {
        return refuse(lines.country, text);
    }
    utfToUpper(text);
    return LDAP_SUCCESS;
}

// Whether the rule may refuse a text.
bool has_form(std::uint32_t syntax)
{
    return (syntax & SC_DN) != 0 ||
           ((syntax & SC_TEL) == 0 && (syntax & (SC_BIT_STRING | SC_NUMERIC_STRING | SC_COUNTRY_STRING)) != 0);
}

// The normal form of a DN in a new text; null with the failure in *result.
heap_text normal_dn(const char* dn, int* result)
{
    ldap_escDN* record = dn_normalize_esc(dn);
    heap_text upper;
    *result = record == nullptr ? static_cast<int>(LDAP_NO_MEMORY) : record->result;
    if (*result == LDAP_SUCCESS) {
        upper.reset(std::exchange(record->upper, nullptr));  // saves a copy
        *result = upper == nullptr ? LDAP_NO_MEMORY : LDAP_SUCCESS;
    }
    free_ldap_escDN(&record);
    return upper;
}

int normalize_dn(berval* value, const char* dn, bool embedded)
{
    int result = LDAP_SUCCESS;
    heap_text upper = normal_dn(dn, &result);
    if (upper == nullptr) {
        return result;
    }
    const std::size_t length = std::strlen(upper.get());
    if (value->bv_val != nullptr && length <= value->bv_len) {
        std::memcpy(value->bv_val, upper.get(), length + 1);
    } else {
        if (!embedded) {
            std::free(value->bv_val);
        }
        value->bv_val = upper.release();
    }
    value->bv_len = length;
    return LDAP_SUCCESS;
}

}  // namespace

extern "C" {

int value_normalize(char** text, std::uint32_t syntax)
{
    if ((syntax & SC_CIS) == 0) {
        return LDAP_SUCCESS;
    }
    if ((syntax & SC_DN) == 0) {
        return normalize_in_place(*text, syntax, lines_of_text);
    }
    int result = LDAP_SUCCESS;
    heap_text upper = normal_dn(*text, &result);
    if (upper != nullptr) {
        std::free(*text);
        *text = upper.release();
    }
    return result;
}

int value_normalize_berval(berval* value, std::uint32_t syntax, int embedded)
{
    if ((syntax & SC_CIS) == 0) {
        return LDAP_SUCCESS;
    }
    char empty[] = "";
    char* const text = value->bv_val == nullptr ? empty : value->bv_val;
    if (has_form(syntax) && std::strlen(text) < value->bv_len) {  // what is behind a byte 0 is of no form
        refuse("Error - value_normalize_berval: byte 0 behind %s\n", text);
        return (syntax & SC_DN) != 0 ? LDAP_INVALID_DN_SYNTAX : LDAP_INVALID_SYNTAX;
    }
    if ((syntax & SC_DN) != 0) {
        return normalize_dn(value, text, embedded != 0);
    }
    const int result = normalize_in_place(text, syntax, lines_of_berval);
    if (result == LDAP_SUCCESS) {
        value->bv_len = std::strlen(text);
    }
    return result;
}

int value_normalize_for_tables(const berval* source, berval** target, std::uint32_t syntax)
{
    if ((syntax & SC_BIN) != 0) {
        *target = nullptr;
        return LDAP_SUCCESS;
    }
    const std::size_t length = source->bv_val == nullptr ? 0 : source->bv_len;
    **target = {0, static_cast<char*>(std::malloc(length + 1))};
    if ((*target)->bv_val == nullptr) {
        debug_error("Error - value_normalize_for_tables: malloc() failed. Out of memory\n");
        return LDAP_NO_MEMORY;
    }
    if (length != 0) {
        std::memcpy((*target)->bv_val, source->bv_val, length);
    }
    (*target)->bv_val[length] = '\0';
    (*target)->bv_len = length;
    if ((syntax & (SC_CIS | SC_CES)) != 0 && value_normalize_berval(*target, syntax, 0) == LDAP_NO_MEMORY) {
        std::free((*target)->bv_val);
        **target = {0, nullptr};
        return LDAP_NO_MEMORY;
    }
    return LDAP_SUCCESS;
}

}  // extern "C"
