// Predicates on attribute types, and the lists of those that have a property: see ldcf_api.h.
#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <memory>
#include <string_view>

#include "servers/vrnd/libdirbase/base/charray.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"
#include "servers/vrnd/libdirbase/schema/ldcf_well_known_oids.h"

namespace {

// A property of an attribute type; each is asked for one name by a predicate, and of all types by a list.
using property = bool (*)(const ldcf_attrtype_& attribute);

constexpr int attr_class_unlisted = 11;  // counts as operational, but not in the list of those

constexpr std::string_view oids_without_tags[] = {
    "2.5.4.0",           "2.5.4.31", "2.5.4.50",         "2.16.840.1.113730.3.1.198",
    "1.3.77.0.2.4.2242", "2.5.4.35", "1.3.77.0.2.4.155", "2.16.840.1.113730.3.1.34",
};

constexpr std::string_view binary_syntaxes[] = {
    ldcf_syntax_binary, ldcf_syntax_certificate, ldcf_syntax_certificate_list, ldcf_syntax_certificate_pair,
    ldcf_syntax_fax,    ldcf_syntax_jpeg,        ldcf_syntax_octet_string,
};

template <std::size_t count>
bool holds(const std::string_view (&list)[count], const char* text)
{
    return std::find(std::begin(list), std::end(list), text) != std::end(list);
}

bool is_user(const ldcf_attrtype_& a)
{
    return a.attr_class() == ldcf_attr_class_user;
}
bool is_configuration(const ldcf_attrtype_& a)
{
    return a.attr_class() == ldcf_attr_class_configuration;
}
bool takes_language_tags(const ldcf_attrtype_& a)
{
    return is_user(a) && checkIfLangTagAttrByOid(a.oid());
}
bool is_cn_or_objectclass(const ldcf_attrtype_& a)
{
    return a.oid() == "2.5.4.3" || a.oid() == "2.5.4.0";
}
bool may_be_unique(const ldcf_attrtype_& a)
{
    return is_user(a) && !is_cn_or_objectclass(a) && !ldcf_api_is_binary_syntax(a.syntax_oid());
}
// Not the opposite of the above: of the binary syntaxes only Binary itself counts.
bool may_not_be_unique(const ldcf_attrtype_& a)
{
    return !is_user(a) || is_cn_or_objectclass(a) || a.syntax_oid() == ldcf_syntax_binary;
}
bool is_operational(const ldcf_attrtype_& a)
{
    return !is_user(a) && !is_configuration(a);
}
bool is_listed_operational(const ldcf_attrtype_& a)
{
    return is_operational(a) && a.attr_class() != attr_class_unlisted;
}
bool is_encryptable(const ldcf_attrtype_& a)
{
    return a.may_be_encrypted();
}
bool is_encrypted(const ldcf_attrtype_& a)
{
    return a.encryption() != ldcf_encryption::none;
}
bool is_protected(const ldcf_attrtype_& a)
{
    return is_encrypted(a) || a.secure_connection() || a.return_value() != ldcf_return_value::cleartext ||
           a.non_matchable();
}

template <property has>
bool opposite(const ldcf_attrtype_& attribute)
{
    return !has(attribute);
}

bool type_has(const char* name, property has)
{
    if (name == nullptr) {
        return false;
    }
    const auto& map = ldcf_schema_g->attribute_types;
    const auto found = map.find(name);
    return found != map.end() && has(*found->second);
}

// What a list without members gives.
enum class without_members { null, empty_array };

struct free_charray {
    void operator()(char** array) const { charray_free(array); }
};

// The names as an array of texts of their own; null when memory ran out.
char** make_array(const csgl_vector<const char*>& names)
{
    std::unique_ptr<char*, free_charray> array(static_cast<char**>(std::calloc(names.size() + 1, sizeof(char*))));
    for (std::size_t i = 0; array != nullptr && i < names.size(); ++i) {
        array.get()[i] = strdup(names[i]);
        if (array.get()[i] == nullptr) {
            array.reset();
        }
    }
    return array.release();
}

char** names_of_types_with(property wanted, without_members if_none = without_members::null)
try {
    ldcf_names seen;
    csgl_vector<const char*> names;
    for (const auto& [key, attribute] : ldcf_schema_g->attribute_types) {
        if (wanted(*attribute) && seen.insert(attribute.name()).second) {
            names.push_back(attribute.name());
        }
    }
    return names.empty() && if_none == without_members::null ? nullptr : make_array(names);
} catch (const exc_not_enough_memory_t&) {
    return nullptr;
}

}  // namespace

bool checkIfLangTagAttrByOid(const char* oid)
{
    return oid == nullptr || !holds(oids_without_tags, oid);
}

bool ldcf_api_is_binary_syntax(const char* oid)
{
    return oid != nullptr && holds(binary_syntaxes, oid);
}

bool ldcf_api_is_langtag_attr(const char* name)
{
    return type_has(name, takes_language_tags);
}
bool ldcf_api_is_unique_attr(const char* name)
{
    return type_has(name, may_be_unique);
}
bool ldcf_api_is_attrcache_attr(const char* name)
{
    return type_has(name, opposite<is_user>);
}
bool ldcf_api_is_config_attr(const char* name)
{
    return type_has(name, is_configuration);
}
bool ldcf_api_is_operational_attr(const char* name)
{
    return type_has(name, is_operational);
}
bool ldcf_api_is_encryptable_attr(const char* name)
{
    return type_has(name, is_encryptable);
}
bool ldcf_api_is_encrypted_attr(const char* name)
{
    return type_has(name, is_encrypted);
}

char** ldcf_api_get_langtag_attrs(void)
{
    return names_of_types_with(takes_language_tags);
}
char** ldcf_api_get_nonlangtag_attrs(void)
{
    return names_of_types_with(opposite<takes_language_tags>);
}
char** ldcf_api_get_unique_attrs(void)
{
    return names_of_types_with(may_be_unique);
}
char** ldcf_api_get_nonunique_attrs(void)
{
    return names_of_types_with(may_not_be_unique);
}
char** ldcf_api_get_attrcache_attrs(void)
{
    return names_of_types_with(is_user);
}
char** ldcf_api_get_nonattrcache_attrs(void)
{
    return names_of_types_with(opposite<is_user>);
}
char** ldcf_api_get_config_attrs(void)
{
    return names_of_types_with(is_configuration);
}
char** ldcf_api_get_nonconfig_attrs(void)
{
    return names_of_types_with(opposite<is_configuration>);
}
char** ldcf_api_get_operational_attrs(void)
{
    return names_of_types_with(is_listed_operational);
}
char** ldcf_api_get_nonoperational_attrs(void)
{
    return names_of_types_with(opposite<is_listed_operational>);
}
char** ldcf_api_get_encryptable_attrs(void)
{
    return names_of_types_with(is_encryptable, without_members::empty_array);
}
char** ldcf_api_get_nonencryptable_attrs(void)
{
    return names_of_types_with(opposite<is_encryptable>, without_members::empty_array);
}
char** ldcf_api_get_encrypted_attrs(void)
{
    return names_of_types_with(is_protected, without_members::empty_array);
}
char** ldcf_api_get_nonencrypted_attrs(void)
{
    return names_of_types_with(opposite<is_protected>, without_members::empty_array);
}

int ldcf_api_schema_contains_encrypted_attributes(void)
{
    const auto& map = ldcf_schema_g->attribute_types;
    const bool any = std::any_of(map.begin(), map.end(), [](const auto& entry) { return is_encrypted(*entry.second); });
    return any ? 1 : 0;
}
