// The schema as the entry "cn=schema" (RFC 4512, section 4.2): see ldcf_api.h.
#include <cstring>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/model/record_guards.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"

namespace {

constexpr char schema_dn[] = "cn=schema";
constexpr char schema_norm_dn[] = "CN=SCHEMA";

// Adds one value; false when that failed.
bool add(Entry& entry, const char* type, const char* text)
{
    return add_attr_to_entry(&entry, type, text, 0) == LDAP_SUCCESS;
}

// Adds a text form of every definition.
template <typename T, typename Form>
bool add_each(Entry& entry, const char* type, const ldcf_map_name_to<T>& map, Form&& form)
{
    bool added = true;
    ldcf_for_each_definition(
        map, [&](const T& definition) { added = added && add(entry, type, csgl_string(form(definition))); });
    return added;
}

bool add_schema(Entry& entry, const ldcf_schema& schema)
{
    const auto standard = [](const auto& definition) { return definition.v3_string(); };
    const auto extended = [](const ldcf_attrtype& type) { return type->xan_string_with_default(); };
    return add(entry, "cn", "schema") && add(entry, "objectclass", "top") && add(entry, "objectclass", "subschema") &&
           add(entry, "objectclass", "XANsubschema") &&
           add_each(entry, "objectClasses", schema.object_classes, standard) &&
           add_each(entry, "attributeTypes", schema.attribute_types, standard) &&
           add_each(entry, "XANattributeTypes", schema.attribute_types, extended) &&
           add_each(entry, "ldapSyntaxes", schema.syntaxes, standard) &&
           add_each(entry, "matchingRules", schema.matching_rules, standard);
}

}  // namespace

extern "C" {

int add_attr_to_entry(Entry* entry, const char* type, const char* text, int flag)
{
    berval value = {text == nullptr ? 0 : std::strlen(text), const_cast<char*>(text)};
    berval* values[] = {&value, nullptr};
    return attr_merge(entry, type, values, flag, flag, nullptr);
}

Entry* ldcf_api_schema2entry(const ldcf_schema* schema)
{
    Entry* made = nullptr;
    CreateEntry(&made);
    entry_guard entry(made);
    if (made == nullptr || (made->e_dn = strdup(schema_dn)) == nullptr) {
        debug_error("ldcf_api_schema2entry: e->e_dn out of memory !\n");
        return nullptr;
    }
    made->e_norm_dn = strdup(schema_norm_dn);
    if (made->e_norm_dn == nullptr) {
        debug_error("ldcf_api_schema2entry: e->e_norm_dn out of memory !\n");
        return nullptr;
    }
    bool complete = false;
    try {
        complete = add_schema(*made, *schema);
    } catch (const exc_not_enough_memory_t&) {
        complete = false;  // a text form that couldn't be made
    }
    if (!complete) {
        debug_error("ldcf_api_schema2entry: add_attr_to_entry failed!\n");
        return nullptr;
    }
    return entry.release();
}

}  // extern "C"
