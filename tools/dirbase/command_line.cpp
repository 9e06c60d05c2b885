// What the groups of commands have in common: see command_line.h.
#include "tools/dirbase/command_line.h"

namespace dirbase_tool {

namespace {

// Help is wrapped by hand, since the parser's library doesn't wrap.
constexpr char exit_statuses[] = R"(
Exit status: 0 for yes, 1 for findings (the message says what, and where), 2 for a wrong call or input that
can't be read.)";

}  // namespace

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
        ->type_name("DIR");
    return app;
}

}  // namespace dirbase_tool
