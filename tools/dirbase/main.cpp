// The command line of `dirbase`: groups, commands, options, and what becomes of a failure.
#include <new>
#include <sstream>

#include "tools/dirbase/command_line.h"
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
names count, and names need not be given.
)";

constexpr char dn_details[] =
    R"(DNs are looked up in the schema, so every spelling of a DN has one normal form. A DN that is - stands for
those on standard input, one a line. Each DN has its answer, in their order.
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
    app->add_option("BEFORE", given.before, "The directory to compare with")->type_name("")->required();
    app->add_option("AFTER", given.after, "The directory that may differ")->type_name("")->required();
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
    CLI::App* app = add_command(group, name, description, dn_details, given.common);
    app->add_option("DN", given.dns, "Distinguished names, - for standard input")->type_name("")->required();
    if (question != dn_question::check) {
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

// Tells a failure, to the eyes and with --json to programs, and gives its exit status.
int report(const tool_failure& failure, bool as_json)
{
    tell(failure.message());
    if (!failure.note().empty()) {
        tell("note: " + failure.note());
    }
    if (as_json) {
        json error = {{"text", failure.what()}};
        if (!failure.file().empty()) {
            error["file"] = failure.file();
        }
        if (failure.line() > 0) {
            error["line"] = failure.line();
        }
        if (!failure.note().empty()) {
            error["note"] = failure.note();
        }
        write_json(json{{"ok", false}, {"error", std::move(error)}});
    }
    return failure.status();
}

int run(const command& chosen, const common_options& common)
{
    message_collector log(common.verbosity);
    try {
        return chosen(log);
    } catch (const tool_failure& failure) {
        return report(failure, common.as_json);
    } catch (const exc_t& failure) {
        return report(failure_of(failure, common.schema_folder), common.as_json);
    } catch (const std::bad_alloc&) {
        return report(tool_failure(status_unusable, "", 0, "not enough memory"), common.as_json);
    }
}

// Help and version go to standard output, and faults of the call to standard error.
int report_call(const CLI::App& app, const CLI::ParseError& outcome)
{
    std::ostringstream results;
    std::ostringstream faults;
    const int status = app.exit(outcome, results, faults);
    write_result(results.str());
    std::istringstream lines(faults.str());
    for (std::string line; std::getline(lines, line);) {
        tell(line);
    }
    return status == 0 ? status_yes : status_unusable;
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

    try {
        app.parse(argc, argv);
        if (!chosen) {
            throw CLI::RequiredError::Subcommand(1);
        }
    } catch (const CLI::ParseError& outcome) {
        return report_call(app, outcome);
    }
    return run(chosen, given.common);
}

}  // namespace

}  // namespace dirbase_tool

int main(int argc, char** argv)
{
    try {
        return dirbase_tool::main_of_tool(argc, argv);
    } catch (const dirbase_tool::tool_failure& failure) {
        dirbase_tool::tell(failure.message());  // the report itself couldn't be written
        return failure.status();
    } catch (const std::exception& failure) {
        dirbase_tool::tell(failure.what());
        return dirbase_tool::status_unusable;
    }
}
