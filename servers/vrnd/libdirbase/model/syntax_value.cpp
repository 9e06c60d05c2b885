// Values by their syntax: see syntax_value.h.
#include "servers/vrnd/libdirbase/model/syntax_value.h"

#include <cstdlib>
#include <optional>
#include <string_view>

#include <strings.h>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/dn_check.h"
#include "servers/vrnd/libdirbase/model/timestamp.h"

namespace {

// Null after setting *result when memory ran out for a function of that name.
heap_pointer<std::int32_t> new_integer(const char* function, int* result)
{
    heap_pointer<std::int32_t> integer(static_cast<std::int32_t*>(std::malloc(sizeof(std::int32_t))));
    if (integer == nullptr) {
        debug_error("Error - %s: malloc failed. Out of memory\n", function);
        *result = LDAP_NO_MEMORY;
    }
    return integer;
}

std::optional<bool> boolean_of(const char* text)
{
    if (text == nullptr) {
        return std::nullopt;
    }
    if (strcasecmp(text, "TRUE") == 0) {
        return true;
    }
    return strcasecmp(text, "FALSE") == 0 ? std::optional(false) : std::nullopt;
}

int check_boolean(const char* text)
{
    if (boolean_of(text)) {
        return LDAP_SUCCESS;
    }
    debug_error("bad boolean value %s\n", text == nullptr ? "(null)" : text);
    return LDAP_INVALID_SYNTAX;
}

}  // namespace

extern "C" {

int int_str_check(const char* text)
{
    if (text == nullptr) {
        return LDAP_INVALID_SYNTAX;
    }
    std::string_view digits = text;
    const bool negative = digits.starts_with('-');
    if (negative || digits.starts_with('+')) {
        digits.remove_prefix(1);
    }
    const std::string_view limit = negative ? "2147483648" : "2147483647";
    if (digits.find_first_not_of("0123456789") != std::string_view::npos || digits.size() > limit.size()) {
        return LDAP_INVALID_SYNTAX;
    }
    return digits.size() < limit.size() || digits <= limit ? LDAP_SUCCESS : LDAP_INVALID_SYNTAX;
}

std::int32_t* str2int(const char* text, int* result)
{
    heap_pointer<std::int32_t> value = new_integer("str2int", result);
    if (value == nullptr) {
        return nullptr;
    }
    *result = int_str_check(text);
    if (*result != LDAP_SUCCESS) {
        return nullptr;
    }
    *value = static_cast<std::int32_t>(std::strtoll(text, nullptr, 10));
    return value.release();
}

std::int32_t* str2bool(const char* text, int* result)
{
    heap_pointer<std::int32_t> value = new_integer("str2bool", result);
    if (value == nullptr) {
        return nullptr;
    }
    const std::optional<bool> boolean = boolean_of(text);
    *result = boolean ? LDAP_SUCCESS : LDAP_INVALID_SYNTAX;
    if (!boolean) {
        return nullptr;
    }
    *value = *boolean ? 1 : 0;
    return value.release();
}

int check_syntax(std::uint32_t syntax, const char* text)
{
    switch (syntax) {
    case SC_DN | SC_CIS: return dn_check(text, nullptr);
    case SC_INT: return int_str_check(text);
    case SC_BOOL: return check_boolean(text);
    case SC_GT: return str2GeneralizedTime(text, nullptr);
    case SC_UTCT: return str2UTCTime(text, nullptr);
    default: return LDAP_SUCCESS;
    }
}

int find_value_length(std::uint32_t syntax, int text_length, int* length)
{
    *length = 0;
    if (text_length < 0) {
        return LDAP_SUCCESS;
    }
    if ((syntax & (SC_CIS | SC_CES)) != 0) {
        *length = text_length;
    } else if ((syntax & SC_BIN) != 0) {
        *length = 1;
    } else if ((syntax & (SC_GT | SC_UTCT)) != 0) {
        *length = sizeof(tag_timestamp_struct);
    } else if ((syntax & (SC_INT | SC_BOOL)) != 0) {
        *length = sizeof(std::int32_t);
    } else {
        return LDAP_INVALID_SYNTAX;
    }
    return LDAP_SUCCESS;
}

void* str2syntaxvalue(const char* text, std::uint32_t syntax, int* result)
{
    switch (syntax) {
    case SC_INT: return str2int(text, result);
    case SC_BOOL: return str2bool(text, result);
    case SC_GT:
    case SC_UTCT: return str2timestamp(text, syntax, result);
    case SC_CIS:
    case SC_CES:
    case SC_BIN:
    case SC_TEL | SC_CIS:
    case SC_DN | SC_CIS:
    case SC_BIT_STRING | SC_CIS:
    case SC_NUMERIC_STRING | SC_CIS:
    case SC_COUNTRY_STRING | SC_CIS: *result = LDAP_SUCCESS; return nullptr;
    default: *result = LDAP_INVALID_SYNTAX; return nullptr;
    }
}

}  // extern "C"
