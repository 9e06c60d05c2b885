// What the groups of commands have in common: see command_line.h.
#include "tools/dirbase/command_line.h"

namespace dirbase_tool {

namespace {

// Help is wrapped by hand, since the parser's library doesn't wrap.
constexpr char exit_statuses[] = R"(
Exit status: 0 for yes, 1 for findings (the message says what, and where), 2 for a wrong call, input
that can't be read, or a failure of the operating system. With --json "ok" is true for 0 alone.)";

// Stands behind a shielded argument: no argument holds it.
constexpr char shield = '\0';

}  // namespace

std::vector<std::string> shielded(int argc, char** argv)
{
    std::vector<std::string> arguments;
    for (int i = argc - 1; i > 0; --i) {
        std::string& argument = arguments.emplace_back(argv[i]);
        const bool is_list = argument.starts_with('[') && argument.ends_with(']');
        const bool lacks_value = argument.starts_with("--") && argument.find('=') == argument.size() - 1;
        argument += is_list || lacks_value || argument == "++" ? std::string(1, shield) : "";
    }
    return arguments;
}

void unshield(CLI::App& app)
{
    for (CLI::Option* option : app.get_options()) {
        if (option->get_items_expected_max() > 0) {  // not a flag
            option->transform([](std::string text) {
                text.resize(text.size() - (text.ends_with(shield) ? 1 : 0));
                return text;
            });
        }
    }
    for (CLI::App* below : app.get_subcommands([](CLI::App*) { return true; })) {
        unshield(*below);
    }
}

CLI::Validator not_empty()
{
    return CLI::Validator([](const std::string& name) { return name.empty() ? "the name is empty" : ""; }, "");
}

void add_flags_of_all(CLI::App& app)
{
    app.set_version_flag("--version", "dirbase " DIRBASE_VERSION, "Print the version and exit");
    app.set_help_flag("-h,--help", "Print this help and exit");
}

void expect_subcommand(CLI::App& app)
{
    app.require_subcommand(0, 1);
}

CLI::App* add_bare_command(CLI::App& group, const std::string& name, const std::string& description,
                           const std::string& details, common_options& common)
{
    CLI::App* app = group.add_subcommand(name, description);
    add_flags_of_all(*app);
    app->footer(details + exit_statuses);
    app->add_flag("--json", common.as_json,
                  "Write the result as JSON; a failure is an object too, with \"ok\": false and \"error\"");
    app->add_flag("-v,--verbose", common.verbosity,
                  "Show the message log on standard error; given twice, the debug log too");
    return app;
}

CLI::App* add_command(CLI::App& group, const std::string& name, const std::string& description,
                      const std::string& details, common_options& common)
{
    CLI::App* app = add_bare_command(group, name, description, details, common);
    app->add_option("--schema", common.schema_folder,
                    "Directory of schema.list and the files that it names (default: that of\n"
                    "the environment variable DIRBASE_SCHEMA, else the one that came along)")
        ->check(not_empty())
        ->type_name("DIR");
    return app;
}

}  // namespace dirbase_tool
