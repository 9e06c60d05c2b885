// dirbase schema show
#include "tools/dirbase/describe_definition.h"
#include "tools/dirbase/schema_commands.h"

namespace dirbase_tool {

namespace {

template <typename T>
void describe_if_there(std::vector<definition_sheet>& sheets, const ldcf_map_name_to<T>& map, const csgl_string& name,
                       const ldcf_schema& schema, const schema_directory& directory)
{
    if (const T found = ldcf_find(map, name); found) {
        sheets.push_back(describe(found, schema, directory));
    }
}

}  // namespace

int show_definitions(const common_options& common, const std::vector<std::string>& names)
{
    const schema_directory directory(common.schema_folder, schema_directory::purpose::read);
    directory.load();

    const ldcf_schema& schema = *ldcf_schema_g;
    std::vector<definition_sheet> sheets;
    std::vector<std::string> unknown;
    for (const std::string& text : names) {
        const csgl_string name(text.c_str());
        const std::size_t before = sheets.size();
        describe_if_there(sheets, schema.attribute_types, name, schema, directory);
        describe_if_there(sheets, schema.object_classes, name, schema, directory);
        describe_if_there(sheets, schema.matching_rules, name, schema, directory);
        describe_if_there(sheets, schema.syntaxes, name, schema, directory);
        if (sheets.size() == before) {
            unknown.push_back(text);
        }
    }

    if (common.as_json) {
        json definitions = json::array();
        for (const definition_sheet& sheet : sheets) {
            definitions.push_back(sheet.as_json());
        }
        write_json(json{
            {"ok", unknown.empty()}, {"definitions", std::move(definitions)}, {"unknown", json_of_values(unknown)}});
    } else {
        std::string text;
        for (const definition_sheet& sheet : sheets) {
            text.append(text.empty() ? "" : "\n").append(sheet.as_text());
        }
        write_result(text);
    }
    for (const std::string& name : unknown) {
        tell(name + ": no definition of the schema has this name or oid");
    }
    return unknown.empty() ? status_yes : status_findings;
}

}  // namespace dirbase_tool
