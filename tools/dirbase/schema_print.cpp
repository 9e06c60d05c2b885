// dirbase schema print
//
// What is printed without --kind is a schema file, in sections; a section's lines are what --kind prints. The
// exception is the inherited form, which is no definition: line for line it says what the standard form leaves out.
#include "servers/vrnd/libdirbase/schema/ldcf_schema.h"
#include "tools/dirbase/schema_commands.h"
#include "tools/dirbase/schema_directory.h"

namespace dirbase_tool {

namespace {

// One line of the output.
struct printed_definition {
    const char* kind;
    const char* form;
    std::string oid;
    std::string name;
    std::string text;
};

struct printed_section {
    const char* keyword;
    std::vector<printed_definition> definitions;
};

const char* name_of(print_form form)
{
    switch (form) {
    case print_form::xan: return "xan";
    case print_form::xan_default: return "xan-default";
    case print_form::inherited: return "inherited";
    case print_form::whole:
    case print_form::v3: break;
    }
    return "v3";
}

// Only attribute types have extended definitions, so only theirs has defaults.
template <typename T>
csgl_string with_default(const T& definition)
{
    return definition.xan_string();
}
csgl_string with_default(const ldcf_attrtype& attribute)
{
    return attribute->xan_string_with_default();
}

template <typename T>
csgl_string text_in(print_form form, const T& definition)
{
    switch (form) {
    case print_form::xan: return definition.xan_string();
    case print_form::xan_default: return with_default(definition);
    case print_form::inherited: return definition.v3_string_inherited();
    case print_form::whole:
    case print_form::v3: break;
    }
    return definition.v3_string();
}

template <typename Map>
printed_section section_of(const char* keyword, const char* kind, print_form form, const Map& map)
{
    printed_section section = {keyword, {}};
    ldcf_for_each_definition(map, [&](const auto& definition) {
        std::string text = text_of(text_in(form, definition));
        if (!text.empty()) {  // an attribute type without an extended definition
            section.definitions.push_back(
                {kind, name_of(form), text_of(definition.oid()), text_of(definition.name()), std::move(text)});
        }
    });
    return section;
}

// The sections in the order in which a reader learns the terms; the parser takes them in any.
std::vector<printed_section> sections_of(const ldcf_schema& schema, print_form form, print_kind kind)
{
    const bool extended = form == print_form::xan || form == print_form::xan_default;
    const bool all = kind == print_kind::all;
    // The extended forms of the other kinds say nothing, and no section of a schema file holds them.
    const bool others = all && !extended;

    std::vector<printed_section> sections;
    if (others || kind == print_kind::syntaxes) {
        sections.push_back(section_of("ldapSyntaxes", LDCF_KIND_SYNTAX, form, schema.syntaxes));
    }
    if (others || kind == print_kind::matching_rules) {
        sections.push_back(section_of("matchingRules", LDCF_KIND_MATCHING_RULE, form, schema.matching_rules));
    }
    if (all || kind == print_kind::attribute_types) {
        sections.push_back(section_of(extended ? "XANattributeTypes" : "attributeTypes", LDCF_KIND_ATTRIBUTE_TYPE, form,
                                      schema.attribute_types));
    }
    if (all && form == print_form::whole) {
        sections.push_back(
            section_of("XANattributeTypes", LDCF_KIND_ATTRIBUTE_TYPE, print_form::xan, schema.attribute_types));
    }
    if (others || kind == print_kind::object_classes) {
        sections.push_back(section_of("objectClasses", LDCF_KIND_OBJECT_CLASS, form, schema.object_classes));
    }
    return sections;
}

// Into a file every byte goes as it is, so that it can be read back; a terminal gets no control bytes.
std::string as_text(const std::vector<printed_section>& sections, bool with_keywords)
{
    std::string text;
    for (const printed_section& section : sections) {
        if (with_keywords) {
            text.append(text.empty() ? "" : "\n").append(section.keyword).append(" {\n");
        }
        for (const printed_definition& definition : section.definitions) {
            text.append(shown(definition.text)).append("\n");
        }
        if (with_keywords) {
            text.append("}\n");
        }
    }
    return text;
}

json as_json(const std::vector<printed_section>& sections)
{
    json definitions = json::array();
    for (const printed_section& section : sections) {
        for (const printed_definition& definition : section.definitions) {
            definitions.push_back({{"kind", definition.kind},
                                   {"oid", json_of_value(definition.oid)},
                                   {"name", json_of_value(definition.name)},
                                   {"form", definition.form},
                                   {"text", json_of_value(definition.text)}});
        }
    }
    return json{{"ok", true}, {"definitions", std::move(definitions)}};
}

}  // namespace

int print_schema(const common_options& common, print_form form, print_kind kind)
{
    const schema_directory directory(common.schema_folder, schema_directory::purpose::read);
    directory.load();

    const std::vector<printed_section> sections = sections_of(*ldcf_schema_g, form, kind);
    if (common.as_json) {
        write_json(as_json(sections));
    } else {
        write_result(as_text(sections, kind == print_kind::all));
    }
    return status_yes;
}

}  // namespace dirbase_tool
