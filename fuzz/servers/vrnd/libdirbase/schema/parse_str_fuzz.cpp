// Schema text of any kind, from parsing to the printed definitions and back.
//
// The input is read together with a few well-known definitions, so that a single definition can be complete. Whatever
// goes wrong must be an exception of the library's own tree.
#include <string>

#include "fuzz/support/fuzz_support.h"
#include "servers/vrnd/libdirbase/schema/ldcf_schema.h"

namespace {

using fuzz_support::expect;

constexpr char known_definitions[] = R"(
ldapSyntaxes {
    ( 1.3.6.1.4.1.1466.115.121.1.5 ) ( 1.3.6.1.4.1.1466.115.121.1.6 )
    ( 1.3.6.1.4.1.1466.115.121.1.7 ) ( 1.3.6.1.4.1.1466.115.121.1.11 )
    ( 1.3.6.1.4.1.1466.115.121.1.12 ) ( 1.3.6.1.4.1.1466.115.121.1.15 )
    ( 1.3.6.1.4.1.1466.115.121.1.24 ) ( 1.3.6.1.4.1.1466.115.121.1.25 )
    ( 1.3.6.1.4.1.1466.115.121.1.26 ) ( 1.3.6.1.4.1.1466.115.121.1.27 )
    ( 1.3.6.1.4.1.1466.115.121.1.38 ) ( 1.3.6.1.4.1.1466.115.121.1.40 )
    ( 1.3.6.1.4.1.1466.115.121.1.44 ) ( 1.3.6.1.4.1.1466.115.121.1.50 )
    ( 1.3.6.1.4.1.1466.115.121.1.58 )
}
matchingRules {
    ( 2.5.13.0 NAME 'objectIdentifierMatch' SYNTAX 1.3.6.1.4.1.1466.115.121.1.38 )
    ( 2.5.13.1 NAME 'distinguishedNameMatch' SYNTAX 1.3.6.1.4.1.1466.115.121.1.12 )
    ( 2.5.13.2 NAME 'caseIgnoreMatch' SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )
    ( 2.5.13.4 NAME 'caseIgnoreSubstringsMatch' SYNTAX 1.3.6.1.4.1.1466.115.121.1.58 )
    ( 2.5.13.5 NAME 'caseExactMatch' SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )
    ( 2.5.13.14 NAME 'integerMatch' SYNTAX 1.3.6.1.4.1.1466.115.121.1.27 )
    ( 2.5.13.15 NAME 'integerOrderingMatch' SYNTAX 1.3.6.1.4.1.1466.115.121.1.27 )
    ( 2.5.13.17 NAME 'octetStringMatch' SYNTAX 1.3.6.1.4.1.1466.115.121.1.40 )
    ( 2.5.13.27 NAME 'generalizedTimeMatch' SYNTAX 1.3.6.1.4.1.1466.115.121.1.24 )
    ( 1.3.6.1.4.1.1466.109.114.2 NAME 'caseIgnoreIA5Match' SYNTAX 1.3.6.1.4.1.1466.115.121.1.26 )
}
attributeTypes {
    ( 2.5.4.0 NAME 'objectClass' EQUALITY objectIdentifierMatch SYNTAX 1.3.6.1.4.1.1466.115.121.1.38 )
    ( 2.5.4.41 NAME 'name' EQUALITY caseIgnoreMatch SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )
}
objectClasses {
    ( 2.5.6.0 NAME 'top' ABSTRACT MUST objectClass )
}
)";

void add(std::string& text, const char* what, const csgl_string& value)
{
    text += what;
    text += value.c_str();
    text += '\n';
}

// A line for each name of a set, of texts or of definitions.
void add(std::string& text, const char* what, const ldcf_names& names)
{
    for (const csgl_string& name : names) {
        add(text, what, name);
    }
}
template <typename T>
void add(std::string& text, const char* what, const csgl_set<T>& definitions)
{
    ldcf_names names;
    for (const T& definition : definitions) {
        expect(static_cast<bool>(definition), "no set of definitions holds an empty handle");
        names.insert(definition.oid());
    }
    add(text, what, names);
}
template <typename T>
void add_reference(std::string& text, const char* what, const T& definition)
{
    add(text, what, definition ? definition.oid() : csgl_string("none"));
}
void add_number(std::string& text, const char* what, long value)
{
    text += what + std::to_string(value) + "\n";
}

// Everything that completion works out; the printed forms are kept once made and so wouldn't tell of a change.
void add_links(std::string& text, const ldcf_matchrule& rule)
{
    add(text, "rule ", rule.name());
    add(text, "name ", rule->names());
    add_reference(text, "syntax ", rule->syntax());
}
void add_links(std::string& text, const ldcf_attrtype& type)
{
    add(text, "attribute ", type.name());
    add(text, "name ", type->names());
    add(text, "equality ", type->equality());
    add(text, "ordering ", type->ordering());
    add(text, "substr ", type->substr());
    add_reference(text, "equality rule ", type->equality_rule());
    add_reference(text, "ordering rule ", type->ordering_rule());
    add_reference(text, "substr rule ", type->substr_rule());
    add_reference(text, "syntax ", type->syntax());
    add_reference(text, "supertype ", type->supertype());
    add(text, "subtype ", type->subtypes());
    add(text, "inherited ", type.v3_string_inherited());
    add_number(text, "length ", type->effective_length());
    add_number(text, "id ", type->attr_id());
    add_number(text, "encryptable ", type->may_be_encrypted());
}
void add_links(std::string& text, const ldcf_objclass& type)
{
    add(text, "class ", type.name());
    add(text, "name ", type->names());
    add(text, "superclass ", type->superclasses());
    add(text, "subclass ", type->subclasses());
    add(text, "must ", type->complete_must());
    add(text, "may ", type->complete_may());
    add(text, "inherited ", type.v3_string_inherited());
}

std::string links_of(const ldcf_schema& schema)
{
    std::string text;
    const auto add_links_of = [&](const auto& definition) { add_links(text, definition); };
    ldcf_for_each_definition(schema.matching_rules, add_links_of);
    ldcf_for_each_definition(schema.attribute_types, add_links_of);
    ldcf_for_each_definition(schema.object_classes, add_links_of);
    return text;
}

// The schema as its definitions print, in sections.
std::string print(const ldcf_schema& schema)
{
    std::string text;
    const auto section = [&](const char* keyword, const auto& map, const auto& form) {
        text += std::string(keyword) + " {\n";
        ldcf_for_each_definition(map, [&](const auto& definition) {
            const csgl_string& printed = form(definition);
            if (!printed.empty()) {
                add(text, "", printed);
            }
        });
        text += "}\n";
    };
    const auto standard = [](const auto& definition) -> const csgl_string& { return definition.v3_string(); };
    const auto extended = [](const auto& definition) -> const csgl_string& { return definition.xan_string(); };
    section("ldapSyntaxes", schema.syntaxes, standard);
    section("matchingRules", schema.matching_rules, standard);
    section("attributeTypes", schema.attribute_types, standard);
    section("XANattributeTypes", schema.attribute_types, extended);
    section("objectClasses", schema.object_classes, standard);
    return text;
}

// Reads and links; false for a text that isn't a schema.
bool load(ldcf_schema& schema, const char* text)
{
    try {
        schema.parse_str(text, "input");
        schema.parse_str(known_definitions, "known");  // behind the input, which most often is no schema
        schema.complete_nocheck();
        return true;
    } catch (const exc_t& failure) {
        expect(failure.message().text() != nullptr, "a failure has a text");
        return false;
    }
}

void expect_prints_read_back(const ldcf_schema& schema)
{
    const std::string prints = print(schema);
    ldcf_schema again;
    try {
        again.parse_str(prints.c_str(), "printed");
        again.complete_nocheck();
    } catch (const exc_t&) {
        expect(false, "printed definitions can be read and completed");
    }
    expect(print(again) == prints, "printed definitions print the same when read again");
}

// Names in the store may be refused; nothing else may happen.
void try_db_names(ldcf_schema& schema)
{
    try {
        schema.complete_db_names();
    } catch (const exc_t&) {
        return;
    }
    ldcf_for_each_definition(schema.attribute_types, [](const ldcf_attrtype& type) {
        expect(!type->table().empty() && !type->column().empty(), "every attribute type has a table and a column");
    });
}

void exercise(const char* text)
{
    ldcf_schema schema;
    if (!load(schema, text)) {
        return;
    }
    const std::string links = links_of(schema);
    expect_prints_read_back(schema);
    {
        ldcf_schema twin;
        expect(links_of(twin.copy(schema)) == links, "a copy is linked as the original");
    }
    expect(links_of(schema) == links, "the original doesn't change with its copy");
    try_db_names(schema);

    schema.incomplete();
    try {
        schema.complete_nocheck();
    } catch (const exc_t&) {
        expect(false, "what was complete can be completed again");
    }
    expect(links_of(schema) == links, "completing again gives the same");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size)
{
    exercise(fuzz_support::exact_text(data, size).c_str());
    return 0;
}
