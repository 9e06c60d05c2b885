// The command line of `dirbase`: groups, commands, options, and what becomes of a failure.
#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <iterator>
#include <sstream>
#include <string_view>

#include "tools/dirbase/command_line.h"
#include "tools/dirbase/current_failure.h"
#include "tools/dirbase/data_commands.h"

namespace dirbase_tool {

namespace {

constexpr char check_details[] =
    R"(A syntax error is told as FILE:LINE: TEXT, a fault between definitions as TEXT. What a server would only
remark on in its log (matching rules that don't suit their syntax, names cut for the store) is told as a
warning and doesn't change the exit status. Faults and warnings go to standard error.
)";

constexpr char print_details[] =
    R"(Without --kind the lines stand in sections as in a schema file. Without --form too, that file is the whole
schema: the standard definitions, and the extended ones of the attribute types that have them. It loads by
itself and prints the same again. One thing it can't carry: attribute types count as configuration attributes
by the name of their file, V3.config.at.

Forms:
  v3           the standard definitions alone; without --kind a schema file too
  xan          the extended definitions; without --kind a section of those of attribute types
  xan-default  the same for all attribute types, defaults filled in, as a server shows them
  inherited    what the definition in the same line of --form v3 leaves out; this can't be loaded
)";

constexpr char diff_details[] =
    R"(A definition that stands in one directory only is told as new or gone; one that differs with both texts, and
of an object class also what that changes: its kind, its superiors, and the attribute types that it lists
itself. The order and the spelling of files don't count. Exit status 1 says that there are differences.
)";

constexpr char modify_details[] =
    R"(The change is made whole or not at all. An added definition goes to the file that is listed last, a replaced
one stays in its file. A file that changes is written anew from its definitions, without its comments. What
changed is printed.

FILE holds one definition, in a section as in a schema file. An attribute type may bring its extended
definition in a second section; without one, replace takes the old one away. For delete only the oid and the
names count, and names need not be given. A schema file that is a symbolic link is refused.
)";

constexpr char dn_details[] =
    R"(The attribute types of a DN are looked up in the schema, so every spelling of a DN has one normal form. A DN
that is - stands for those on standard input, one a line. Each DN has its answer, in their order.
)";

constexpr char dn_check_details[] =
    R"(The strict grammar needs no schema. A DN that is - stands for those on standard input, one a line. Each DN has
its answer, in their order.
)";

constexpr char value_details[] =
    R"(A text or a DN has its normal form, a number and a boolean their value, a time its instant in UTC. Each value
has its answer, in their order.
)";

struct options {
    common_options common;
    std::vector<std::string> files;
    std::string form;
    std::string kind;
    std::vector<std::string> names;
    std::string property;
    std::string before;
    std::string after;
    std::vector<std::string> dns;
    std::vector<std::string> values;
    bool light = false;
    std::string operation;
    std::string definition_file;
    entry_options entries;
};

constexpr word<print_form> forms[] = {
    {"v3", print_form::v3},
    {"xan", print_form::xan},
    {"xan-default", print_form::xan_default},
    {"inherited", print_form::inherited},
};

constexpr word<print_kind> kinds[] = {
    {"syntaxes", print_kind::syntaxes},
    {"matchingrules", print_kind::matching_rules},
    {"attributetypes", print_kind::attribute_types},
    {"objectclasses", print_kind::object_classes},
};

void add_check(CLI::App& group, options& given, command& chosen)
{
    CLI::App* app =
        add_command(group, "check", "Load the schema and prove that it is whole", check_details, given.common);
    app->add_option("FILE", given.files, "Schema files to load after those of the directory, - for standard input")
        ->check(not_empty())
        ->type_name("");
    app->callback(
        [&] { chosen = [&](message_collector& log) { return check_schema(given.common, given.files, log); }; });
}

void add_print(CLI::App& group, options& given, command& chosen)
{
    CLI::App* app =
        add_command(group, "print", "Print the definitions, one a line, sorted by oid", print_details, given.common);
    app->add_option("--form", given.form, "What to print of each definition")
        ->transform(one_of(forms))
        ->type_name("FORM");
    app->add_option("--kind", given.kind, "Print the definitions of one kind, without a section around them")
        ->transform(one_of(kinds))
        ->type_name("KIND");
    app->callback([&] {
        chosen = [&](message_collector&) {
            return print_schema(given.common, value_of(given.form, forms, print_form::whole),
                                value_of(given.kind, kinds, print_kind::all));
        };
    });
}

void add_show(CLI::App& group, options& given, command& chosen)
{
    CLI::App* app =
        add_command(group, "show", "Explain definitions: what they say, inherit and come to", "", given.common);
    app->add_option("NAME", given.names, "Names or oids, in any case, of definitions of any kind")
        ->type_name("")
        ->required();
    app->callback([&] { chosen = [&](message_collector&) { return show_definitions(given.common, given.names); }; });
}

void add_list(CLI::App& group, options& given, command& chosen)
{
    std::string words = "Properties:";
    for (const std::string& word : list_words()) {
        words += (words.size() - words.rfind('\n') + word.size() > 100 ? "\n  " : " ") + word;
    }
    CLI::App* app = add_command(group, "list", "List the attribute types that have a property, a name a line",
                                words + "\n", given.common);
    app->add_option("PROPERTY", given.property, "The property, such as encryptable or nonencryptable")
        ->check(CLI::IsMember(list_words()).description(""))
        ->type_name("")
        ->required();
    app->callback([&] { chosen = [&](message_collector&) { return list_attributes(given.common, given.property); }; });
}

void add_diff(CLI::App& group, options& given, command& chosen)
{
    CLI::App* app = add_bare_command(group, "diff", "Tell how one schema directory differs from another", diff_details,
                                     given.common);
    app->add_option("BEFORE", given.before, "The directory to compare with")
        ->check(not_empty())
        ->type_name("")
        ->required();
    app->add_option("AFTER", given.after, "The directory that may differ")
        ->check(not_empty())
        ->type_name("")
        ->required();
    app->callback(
        [&] { chosen = [&](message_collector&) { return diff_schemas(given.common, given.before, given.after); }; });
}

void add_modify(CLI::App& group, options& given, command& chosen)
{
    CLI::App* app = add_command(group, "modify", "Add, delete or replace one definition in the schema files",
                                modify_details, given.common);
    app->add_option("OPERATION", given.operation, "What to do")
        ->check(CLI::IsMember({"add", "delete", "replace"}))
        ->type_name("")
        ->required();
    app->add_option("FILE", given.definition_file, "File of the definition, - for standard input")
        ->check(not_empty())
        ->type_name("")
        ->required();
    app->callback([&] {
        chosen = [&](message_collector& log) {
            return modify_schema(given.common, given.operation, given.definition_file, log);
        };
    });
}

void add_light(CLI::App& app, options& given)
{
    app.add_flag("--light", given.light, "Do without the schema: types stay as they are written");
}

void add_dn_question(CLI::App& group, const std::string& name, const std::string& description, dn_question question,
                     options& given, command& chosen)
{
    const bool uses_schema = question != dn_question::check;
    CLI::App* app = uses_schema ? add_command(group, name, description, dn_details, given.common)
                                : add_bare_command(group, name, description, dn_check_details, given.common);
    app->add_option("DN", given.dns, "Distinguished names, - for standard input")->type_name("")->required();
    if (uses_schema) {
        add_light(*app, given);
    }
    app->callback([&given, &chosen, question] {
        chosen = [&given, question](message_collector&) {
            return ask_of_dns(given.common, question, given.dns, given.light);
        };
    });
}

void add_dn_group(CLI::App& app, options& given, command& chosen)
{
    CLI::App* group = app.add_subcommand("dn", "Normalise, check and compare distinguished names");
    add_flags_of_all(*group);
    expect_subcommand(*group);
    add_dn_question(*group, "normalize", "Print the canonical and the upper text of DNs", dn_question::normalize, given,
                    chosen);
    add_dn_question(*group, "check", "Tell whether DNs keep to the strict grammar", dn_question::check, given, chosen);
    add_dn_question(*group, "parent", "Print the canonical text of the parents of DNs", dn_question::parent, given,
                    chosen);
    CLI::App* compare = add_command(*group, "compare", "Tell whether two DNs are the same", "", given.common);
    compare->add_option("DN", given.dns, "The two DNs")->type_name("")->required()->expected(2);
    add_light(*compare, given);
    compare->callback([&given, &chosen] {
        chosen = [&given](message_collector&) {
            return compare_dns(given.common, given.dns[0], given.dns[1], given.light);
        };
    });
}

void add_value_group(CLI::App& app, options& given, command& chosen)
{
    CLI::App* group = app.add_subcommand("value", "Normalise attribute values");
    add_flags_of_all(*group);
    expect_subcommand(*group);
    CLI::App* normalize =
        add_command(*group, "normalize", "Print what values are held and compared as", value_details, given.common);
    normalize->add_option("SYNTAX", given.property, "An attribute type by name or OID, or the OID of a syntax")
        ->type_name("")
        ->required();
    normalize->add_option("VALUE", given.values, "Values")->type_name("")->required();
    normalize->callback([&given, &chosen] {
        chosen = [&given](message_collector&) { return normalize_values(given.common, given.property, given.values); };
    });
}

// Tells a failure, to the eyes and with --json to programs, and gives its exit status. What can't be written to standard
// output is told once, and to the eyes alone.
int report(const tool_failure& failure, bool as_json)
{
    const auto* const of_output = dynamic_cast<const output_failure*>(&failure);
    if (of_output == nullptr || !of_output->is_repeated()) {
        tell(failure.message());
        if (!failure.note().empty()) {
            tell("note: " + failure.note());
        }
    }
    if (as_json && of_output == nullptr) {
        write_json(json{{"ok", false}, {"error", json_of(failure)}});
    }
    return failure.status();
}

int run(const command& chosen, const common_options& common)
{
    message_collector log(common.verbosity);
    try {
        return chosen(log);
    } catch (const output_failure& failure) {
        return report(failure, common.as_json);
    } catch (...) {
        return report(current_failure(common.schema_folder), common.as_json);
    }
}

// Help and version go to standard output, and faults of the call to standard error.
//
//   as_json  whether a fault is an object on standard output too
int report_call(const CLI::App& app, const CLI::ParseError& outcome, bool as_json)
{
    std::ostringstream results;
    std::ostringstream faults;
    const int status = app.exit(outcome, results, faults);
    write_result(results.str());
    std::istringstream lines(faults.str());
    for (std::string line; std::getline(lines, line);) {
        tell(line);
    }
    if (status != 0 && as_json) {
        write_json(json{{"ok", false}, {"error", {{"text", outcome.what()}}}});
    }
    return status == 0 ? status_yes : status_unusable;
}

// Whether a call asks for JSON, also one that the parser gives up on before it comes to that.
bool asks_for_json(int argc, char** argv)
{
    const std::vector<std::string_view> arguments(argv, argv + argc);
    const auto end = std::find(arguments.begin(), arguments.end(), "--");
    return std::find(arguments.begin(), end, "--json") != end;
}

// Takes the places of standard streams that are closed, or a file would be opened there and be taken for one of them.
// Using such a stream fails as before: what stands in its place is open for the other direction.
bool fill_standard_streams()
{
    constexpr int handles[] = {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO};
    return std::all_of(std::begin(handles), std::end(handles), [](int handle) {
        const bool is_open = ::fcntl(handle, F_GETFD) >= 0 || errno != EBADF;
        return is_open || ::open("/dev/null", handle == STDIN_FILENO ? O_WRONLY : O_RDONLY) == handle;
    });
}

int main_of_tool(int argc, char** argv)
{
    options given;
    command chosen;

    CLI::App app("Tools for the data of an LDAP directory server.", "dirbase");
    add_flags_of_all(app);
    expect_subcommand(app);
    CLI::App* schema = app.add_subcommand("schema", "Check, print, explain, compare and change schema files");
    add_flags_of_all(*schema);
    expect_subcommand(*schema);
    add_check(*schema, given, chosen);
    add_print(*schema, given, chosen);
    add_show(*schema, given, chosen);
    add_list(*schema, given, chosen);
    add_diff(*schema, given, chosen);
    add_modify(*schema, given, chosen);
    add_dn_group(app, given, chosen);
    add_value_group(app, given, chosen);
    add_filter_group(app, given.common, given.entries, chosen);
    add_ldif_group(app, given.common, given.entries, chosen);

    unshield(app);
    try {
        std::vector<std::string> arguments = shielded(argc, argv);
        app.parse(arguments);
        if (!chosen) {
            throw CLI::RequiredError::Subcommand(1);
        }
    } catch (const CLI::ParseError& outcome) {
        return report_call(app, outcome, asks_for_json(argc, argv));
    }
    return run(chosen, given.common);
}

}  // namespace

}  // namespace dirbase_tool

int main(int argc, char** argv)
{
    if (!dirbase_tool::fill_standard_streams()) {
        return dirbase_tool::status_unusable;  // with nowhere to say so
    }
    try {
        return dirbase_tool::main_of_tool(argc, argv);
    } catch (const dirbase_tool::tool_failure& failure) {
        return dirbase_tool::report(failure, false);  // the report itself couldn't be written
    } catch (const std::exception& failure) {
        dirbase_tool::tell(failure.what());
        return dirbase_tool::status_unusable;
    }
}
