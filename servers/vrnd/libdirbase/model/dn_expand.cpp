// Naming attributes: see dn_expand.h.
#include "servers/vrnd/libdirbase/model/dn_expand.h"

#include <cstring>
#include <memory>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/model/attr_lookup.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/model/dn_esc.h"
#include "servers/vrnd/libdirbase/model/dn_plain.h"

namespace {

struct free_dn {
    void operator()(ldap_escDN* dn) const noexcept { free_ldap_escDN(&dn); }
};

bool has_dn(const Entry* entry)
{
    return entry != nullptr && entry->e_dn != nullptr && *entry->e_dn != '\0';
}

int add_attr_to_entry_and_checkdup(Entry* entry, const char* type, char* text)
{
    asyntaxinfo* info = nullptr;
    if (look_up_attr(type, &info) != LDAP_SUCCESS) {
        debug_error("Error - add_attr_to_entry_and_checkdup: malloc() failed. Out of memory\n");
        return LDAP_NO_MEMORY;
    }
    if (info == nullptr) {
        debug_error("Error - add_attr_to_entry_and_checkdup: ldcf_api_attr_get_info() failed.\n");
        return LDAP_OTHER;
    }
    berval value = {std::strlen(text), text};
    berval* values[] = {&value, nullptr};
    return attr_merge(entry, type, values, 1, 1, info);
}

// Adds a pair "type=value", which is overwritten.
int add_type_value_pair(Entry* entry, char* rdn)
{
    char* const sign = std::strchr(rdn, '=');
    if (sign == nullptr) {
        debug_error("Error - add_type_value_pair: Invalid DN syntax, rdn = %s\n", rdn);
        return LDAP_INVALID_DN_SYNTAX;
    }
    *sign = '\0';
    const heap_text value(minAttrValue(sign + 1));
    if (value == nullptr) {
        debug_error("Error - add_type_value_pair: minAttrValue() failed. Out of memory\n");
        return LDAP_NO_MEMORY;
    }
    return add_attr_to_entry_and_checkdup(entry, rdn, value.get());
}

// The end of the pair at `at` of a cleaned DN: a separator in the value, but for its first character, or the end of the
// text. A backslash hides the character behind it, and a value that begins with a quote runs to the next one.
char* find_pair_end(char* at)
{
    at += std::strcspn(at, "=");
    if (*at == '\0') {
        return at;
    }
    const char* const value = ++at;
    bool quoted = *at == '"';
    for (at += quoted ? 1 : 0; *at != '\0'; ++at) {
        if (*at == '\\' && at[1] != '\0') {
            ++at;
        } else if (quoted) {
            quoted = *at != '"';
        } else if ((*at == ',' || *at == ';' || *at == '+') && at != value) {
            break;
        }
    }
    return at;
}

}  // namespace

extern "C" {

int expand_rdn(Entry* entry)
{
    if (!has_dn(entry)) {
        return -1;
    }
    const heap_text dn(strdup(entry->e_dn));
    if (dn == nullptr) {
        debug_error("Error - expand_rdn: strdup() failed. Out of memory\n");
        return LDAP_NO_MEMORY;
    }
    char separator = '+';
    for (char* at = dn_normalize_light(dn.get(), 0); separator == '+';) {
        char* const end = find_pair_end(at);
        separator = *end;
        *end = '\0';
        const int result = add_type_value_pair(entry, at);
        if (result != LDAP_SUCCESS) {
            debug_error("Error - expand_rdn: add_type_value_pair failed!\n");
            return result;
        }
        at = end + 1;
    }
    return LDAP_SUCCESS;
}

int expand_rdn_esc(Entry* entry)
{
    if (!has_dn(entry)) {
        return -1;
    }
    const std::unique_ptr<ldap_escDN, free_dn> dn(parse_escDN(entry->e_dn, dn_order_sorted, 1));
    if (dn == nullptr) {
        return LDAP_NO_MEMORY;
    }
    if (dn->internal_error != 0) {
        return dn->internal_error == DN_ERR_UNDEFINED ? static_cast<int>(LDAP_OTHER) : getRC(dn.get());
    }
    int result = LDAP_SUCCESS;
    const ldapRDN_elem33* pair = dn->rdns == nullptr ? nullptr : dn->rdns->pairs;
    for (; pair != nullptr; pair = pair->next) {
        result = add_attr_to_entry_and_checkdup(entry, pair->rdn->type, pair->rdn->value);
    }
    return result;
}

}  // extern "C"
