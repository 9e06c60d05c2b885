// Names of attributes: see attr_names.h.
#include "servers/vrnd/libdirbase/model/attr_names.h"

#include <cstdlib>
#include <cstring>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/base/environment.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/oid_prefix.h"
#include "servers/vrnd/libdirbase/base/server_globals.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/attr_lookup.h"
#include "servers/vrnd/libdirbase/model/dn_plain.h"
#include "servers/vrnd/libdirbase/model/language_tag.h"

avl_node* attr_syntaxes = nullptr;

namespace {

bool is_digit(char c)
{
    return c >= '0' && c <= '9';
}

bool is_letter(char c)
{
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}

// Numbers with single points between them.
bool is_numeric_name(const char* at, const char* end)
{
    bool digit_before = false;
    for (; at != end; ++at) {
        if (!is_digit(*at) && (*at != '.' || !digit_before)) {
            return false;
        }
        digit_before = is_digit(*at);
    }
    return digit_before;
}

// The "$" of a mapping with something on both sides; null when there is none.
const char* find_mapping_sign(const char* mapping)
{
    const char* const sign = std::strlen(mapping) < 3 ? nullptr : std::strchr(mapping + 1, '$');
    return sign != nullptr && sign[1] != '\0' ? sign : nullptr;
}

int refuse_mapping(int message, const char* text)
{
    PrintMessage(MSG_COMPONENT_SERVER, MSG_SEVERE, message, text);
    return LDAP_CONSTRAINT_VIOLATION;
}

}  // namespace

extern "C" {

// ---- texts ----------------------------------------------------------------------------------------------------------

char* attr_normalize(char* name)
{
    for (char* at = name; *at != '\0'; ++at) {
        *at = *at >= 'A' && *at <= 'Z' ? static_cast<char>(*at - 'A' + 'a') : *at;
    }
    return string_strip_trailing(string_strip_leading(name));
}

char* removeOIDstr(char* name)
{
    if (has_oid_prefix(name)) {
        std::memmove(name, name + oid_prefix_length, std::strlen(name + oid_prefix_length) + 1);
    }
    return name;
}

char* uppercase(char* text)
{
    for (char* at = text; at != nullptr && *at != '\0'; ++at) {
        *at = *at >= 'a' && *at <= 'z' ? static_cast<char>(*at - 'a' + 'A') : *at;
    }
    return text;
}

// ---- tests ----------------------------------------------------------------------------------------------------------

bool is_attr_name_valid(const char* name, int length)
{
    if (name == nullptr || length < 1) {
        return false;
    }
    const char* const end = name + length;
    const bool prefixed = length > static_cast<int>(oid_prefix_length) && has_oid_prefix(name);
    if (prefixed || is_digit(*name)) {
        return is_numeric_name(name + (prefixed ? oid_prefix_length : 0), end);
    }
    for (const char* at = name; at != end; ++at) {
        if (!is_letter(*at) && (at == name || (!is_digit(*at) && *at != '-' && *at != ';'))) {
            return false;
        }
    }
    return true;
}

bool is_string_alphanum(const char* text)
{
    while (text != nullptr && (is_letter(*text) || is_digit(*text))) {
        ++text;
    }
    return text == nullptr || *text == '\0';
}

bool attr_selected(const char* name, char** list)
{
    if (list == nullptr) {
        return true;
    }
    for (char** member = list; *member != nullptr; ++member) {
        if (std::strcmp(*member, "*") == 0 || vrn_strcasecmp(*member, name) == 0) {
            return true;
        }
    }
    return false;
}

bool is_subtype_attr(const char* a, const char* b)
{
    const bool marked = std::strchr(a, ';') != nullptr;
    if (marked && (std::strchr(b, ';') == nullptr || strtagcmp(find_language_tag(a), find_language_tag(b)) != 0)) {
        return false;
    }
    asyntaxinfo* info_a = nullptr;
    asyntaxinfo* info_b = nullptr;
    return look_up_attr(a, &info_a) == LDAP_SUCCESS && look_up_attr(b, &info_b) == LDAP_SUCCESS && info_a == info_b;
}

int verifyAttributeMapping(const char* mapping, char** second, char** first)
{
    if (mapping == nullptr || *mapping == '\0') {
        return LDAP_CONSTRAINT_VIOLATION;
    }
    const char* const sign = find_mapping_sign(mapping);
    if (sign == nullptr) {
        return refuse_mapping(171, mapping);
    }
    heap_text left(strndup(mapping, static_cast<std::size_t>(sign - mapping)));
    heap_text right(strdup(sign + 1));
    if (left == nullptr || right == nullptr) {
        debug_error("Error - verifyAttributeMapping: strdup() failed. Out of memory\n");
        return LDAP_NO_MEMORY;
    }
    removeOIDstr(string_strip_trailing(left.get()));
    removeOIDstr(string_strip_leading(right.get()));
    asyntaxinfo* info = nullptr;
    if (look_up_attr(left.get(), &info) != LDAP_SUCCESS) {
        debug_error("Error - verifyAttributeMapping: malloc() failed. Out of memory\n");
        return LDAP_NO_MEMORY;
    }
    if (info == nullptr) {
        debug_error("verifyAttributeMapping: Attribute '%s' not found in schema.\n", left.get());
        return refuse_mapping(168, left.get());
    }
    if (!is_attr_name_valid(right.get(), static_cast<int>(std::strlen(right.get())))) {
        debug_error("verifyAttributeMapping: Attribute name '%s' is not valid.\n", right.get());
        return refuse_mapping(170, right.get());
    }
    if (first != nullptr) {
        *first = left.release();
    }
    if (second != nullptr) {
        *second = right.release();
    }
    return LDAP_SUCCESS;
}

// ---- order ----------------------------------------------------------------------------------------------------------

int compare_asyntaxinfo(const asyntaxinfo* a, const asyntaxinfo* b, const char* name_a, const char* name_b)
{
    if (a == nullptr && b == nullptr) {
        return vrn_strcasecmp(name_a, name_b);
    }
    if (a == b) {
        return 0;
    }
    return a == nullptr || b == nullptr ? 1 : vrn_strcasecmp(a->names[0], b->names[0]);
}

int attr_type_cmp(const attr_type_key* a, const attr_type_key* b)
{
    return compare_asyntaxinfo(a->info, b->info, a->name, b->name);
}

int attr_syntax_name_cmp(const char* name, const asyntaxinfo* info)
{
    return vrn_strcasecmp(name, info->names[0]);
}

int attr_syntax_names_cmp(const char* name, const asyntaxinfo* info)
{
    for (char** other = info->names; *other != nullptr; ++other) {
        if (vrn_strcasecmp(name, *other) == 0) {
            return 0;
        }
    }
    return 1;
}

// ---- syntaxes -------------------------------------------------------------------------------------------------------

std::uint32_t attr_syntax(const char* name)
{
    const asyntaxinfo* info = ldcf_api_attr_get_info(name, nullptr);
    return info == nullptr ? SC_CIS : info->syntax;
}

std::uint32_t attr_syntax_for_filter(const char* name)
{
    return attr_syntax_for_filter_return_asi(name, nullptr);
}

std::uint32_t attr_syntax_for_filter_return_asi(const char* name, asyntaxinfo** info)
{
    asyntaxinfo* found = ldcf_api_attr_get_info(name, nullptr);
    if (found != nullptr && get_g_language_tags_enabled() == 0 && find_language_tag(name) != nullptr) {
        found = nullptr;
    }
    if (info != nullptr) {
        *info = found;
    }
    return found == nullptr ? 0 : found->syntax;
}

avl_node* attr_syntaxes_get(void)
{
    return attr_syntaxes;
}

int convertAttrLowerCase(void)
{
    static const int answer = [] {
        const heap_text value = environment_value("XANLDAP_ATTRLOWERCASE");
        const bool off =
            value != nullptr && (vrn_strcasecmp(value.get(), "FALSE") == 0 || vrn_strcasecmp(value.get(), "NO") == 0);
        return off ? 0 : 1;
    }();
    return answer;
}

}  // extern "C"
