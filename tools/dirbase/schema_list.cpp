// dirbase schema list
#include "servers/vrnd/libdirbase/base/charray.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"
#include "tools/dirbase/schema_commands.h"
#include "tools/dirbase/schema_directory.h"

namespace dirbase_tool {

namespace {

struct property {
    const char* word;
    char** (*list)();
};

constexpr property properties[] = {
    {"langtag", ldcf_api_get_langtag_attrs},         {"nonlangtag", ldcf_api_get_nonlangtag_attrs},
    {"unique", ldcf_api_get_unique_attrs},           {"nonunique", ldcf_api_get_nonunique_attrs},
    {"attrcache", ldcf_api_get_attrcache_attrs},     {"nonattrcache", ldcf_api_get_nonattrcache_attrs},
    {"config", ldcf_api_get_config_attrs},           {"nonconfig", ldcf_api_get_nonconfig_attrs},
    {"operational", ldcf_api_get_operational_attrs}, {"nonoperational", ldcf_api_get_nonoperational_attrs},
    {"encryptable", ldcf_api_get_encryptable_attrs}, {"nonencryptable", ldcf_api_get_nonencryptable_attrs},
    {"encrypted", ldcf_api_get_encrypted_attrs},     {"nonencrypted", ldcf_api_get_nonencrypted_attrs},
};

std::vector<std::string> names_in(char** array)
{
    std::vector<std::string> names;
    for (char** name = array; name != nullptr && *name != nullptr; ++name) {
        names.emplace_back(*name);
    }
    charray_free(array);
    return names;
}

}  // namespace

std::vector<std::string> list_words()
{
    std::vector<std::string> words;
    for (const property& known : properties) {
        words.emplace_back(known.word);
    }
    return words;
}

int list_attributes(const common_options& common, const std::string& word)
{
    const schema_directory directory(common.schema_folder, schema_directory::purpose::read);
    directory.load();
    std::vector<std::string> names;
    for (const property& known : properties) {
        if (word == known.word) {
            names = names_in(known.list());
        }
    }
    if (common.as_json) {
        write_json(json{{"ok", true}, {"property", word}, {"attributeTypes", json_of_values(names)}});
        return status_yes;
    }
    std::string text;
    for (const std::string& name : names) {
        text.append(shown(name)).append("\n");
    }
    write_result(text);
    return status_yes;
}

}  // namespace dirbase_tool
