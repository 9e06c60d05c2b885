// dirbase schema check
#include "servers/vrnd/libdirbase/schema/ldcf_schema.h"
#include "tools/dirbase/schema_commands.h"
#include "tools/dirbase/schema_directory.h"

namespace dirbase_tool {

namespace {

template <typename Map>
std::size_t count_of(const Map& map)
{
    std::size_t count = 0;
    ldcf_for_each_definition(map, [&count](const auto&) { ++count; });
    return count;
}

}  // namespace

int check_schema(const common_options& common, const std::vector<std::string>& files, message_collector& log)
{
    const schema_directory directory(common.schema_folder, schema_directory::purpose::read);
    directory.load(files);

    const ldcf_schema& schema = *ldcf_schema_g;
    const std::vector<std::string> warnings = log.take_warnings();
    for (const std::string& warning : warnings) {
        tell("warning: " + warning);
    }
    const std::size_t syntaxes = count_of(schema.syntaxes);
    const std::size_t rules = count_of(schema.matching_rules);
    const std::size_t types = count_of(schema.attribute_types);
    const std::size_t classes = count_of(schema.object_classes);
    if (common.as_json) {
        write_json(json{{"ok", true},
                        {"syntaxes", syntaxes},
                        {"matchingRules", rules},
                        {"attributeTypes", types},
                        {"objectClasses", classes},
                        {"warnings", warnings}});
    } else {
        write_result("ok: " + std::to_string(syntaxes) + " syntaxes, " + std::to_string(rules) + " matching rules, " +
                     std::to_string(types) + " attribute types, " + std::to_string(classes) + " object classes\n");
    }
    return status_yes;
}

}  // namespace dirbase_tool
