// The schema as an entry: every definition once, in texts that give the schema back.
#include <memory>
#include <set>

#include "tests/servers/vrnd/libdirbase/schema/entry_check_fixture.h"

namespace {

// The entry as "name: value" lines in order.
std::string lines_of(const ldcf_schema& schema)
{
    const std::unique_ptr<Entry, decltype(&entry_free)> entry(ldcf_api_schema2entry(&schema), entry_free);
    std::string text = std::string("dn: ") + entry->e_dn + "\nnorm: " + entry->e_norm_dn + "\n";
    for (const Attribute* attr = entry->e_attrs; attr != nullptr; attr = attr->a_next) {
        for (berval** value = attr->a_vals; *value != nullptr; ++value) {
            text += attr->a_type + (": " + model_test::text_of(**value)) + "\n";
        }
    }
    return text;
}

}  // namespace

TEST(LdcfApiEntry, TheEntryGivesTheShippedSchemaBack)
{
    const schema_test::relational_store store;
    ldcf_schema schema;
    schema_test::load_shipped(schema);
    schema.complete();
    schema.complete_db_names();
    std::string expected = "dn: cn=schema\nnorm: CN=SCHEMA\ncn: schema\nobjectclass: top\nobjectclass: subschema\n"
                           "objectclass: XANsubschema\n";
    const std::size_t front = expected.size();
    const auto add_all = [&](const char* name, const auto& map, auto form) {
        std::set<const void*> seen;  // each stands under its OID first, for OIDs come ahead of names
        for (const auto& [key, definition] : map) {
            expected +=
                seen.insert(definition.get()).second ? name + (": " + std::string(form(definition))) + "\n" : "";
        }
    };
    const auto standard = [](const auto& definition) { return definition->v3_string(); };
    add_all("objectClasses", schema.object_classes, standard);
    add_all("attributeTypes", schema.attribute_types, standard);
    add_all("XANattributeTypes", schema.attribute_types,
            [](const auto& type) { return type->xan_string_with_default(); });
    add_all("ldapSyntaxes", schema.syntaxes, standard);
    add_all("matchingRules", schema.matching_rules, standard);
    EXPECT_EQ(lines_of(schema), expected);

    ldcf_schema again;
    again.parse_str(expected.substr(front).c_str(), "again");
    again.complete();
    again.complete_db_names();
    EXPECT_EQ(lines_of(again), expected);
}
