// The command line of `dirbase`: groups, commands, options, and what becomes of a failure.
#include <CLI/CLI.hpp>
#include <functional>
#include <new>
#include <sstream>

#include "tools/dirbase/data_commands.h"
#include "tools/dirbase/ldif_commands.h"

namespace dirbase_tool {

namespace {

// Help is wrapped by hand, since the parser's library doesn't wrap.
constexpr char exit_statuses[] = R"(
Exit status: 0 for yes, 1 for findings (the message says what, and where), 2 for a wrong call or input that
can't be read.)";

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

constexpr char ldif_check_details[] =
    R"(Each entry is checked as an addition would: the lines, the DN, the names of the attributes, the values by
their syntax, and the whole against the schema. A fault is told as FILE:LINE: DN: ATTRIBUTE OR CLASS: REASON;
the last lines count the faults by kind (docs/ldif.md explains them all). Naming attributes that an entry
lacks are no fault: a server adds them.

Modes of the schema check:
  1  each object class by itself, without what it inherits
  2  one structural object class and all its superiors, but for top (default)
  3  any number of structural object classes; superiors may be missing
  4  no schema check

An entry of more than 16 MiB, or with more than 10,000 attributes, is told and not looked at any further; the
others are. Memory doesn't grow with the file.
)";

constexpr char ldif_print_details[] =
    R"(Entries are parted by an empty line. An entry with lines that can't be read, or a bad DN, is told and left
out. Nothing else is checked.

Forms:
  ldif        all attributes, a line for each value (default)
  no-members  the same with one line CN=NULL in the place of all values of member and of uniqueMember
  ber         the encoding in which the entry goes to clients, in hexadecimal
)";

constexpr char ldif_diff_details[] =
    R"(Entries are the same when their DNs are in normal form, and values when their syntax says so. The changes
come in an order in which a server takes them: entries that go, leaves first; entries that change; new
entries, parents first. Attributes that only the server sets are left out. Exit status 1 says that there are
differences. Both files are held in memory.
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
    ldif_check_call ldif_check;
    std::string file;
};

template <typename Value>
struct word {
    const char* text;
    Value value;
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

constexpr word<ldif_form> ldif_forms[] = {
    {"ldif", ldif_form::text},
    {"no-members", ldif_form::without_members},
    {"ber", ldif_form::ber},
};

// Accepts the words of a table, in any case.
template <typename Value, std::size_t count>
CLI::IsMember one_of(const word<Value> (&words)[count])
{
    std::vector<std::string> texts;
    for (const word<Value>& candidate : words) {
        texts.emplace_back(candidate.text);
    }
    return CLI::IsMember(texts, CLI::ignore_case);
}

template <typename Value, std::size_t count>
Value value_of(const std::string& text, const word<Value> (&words)[count], Value otherwise)
{
    for (const word<Value>& candidate : words) {
        if (text == candidate.text) {
            return candidate.value;
        }
    }
    return otherwise;
}

using command = std::function<int(message_collector&)>;

void add_flags_of_all(CLI::App& app)
{
    app.set_version_flag("--version", "dirbase " DIRBASE_VERSION, "Print the version and exit");
    app.set_help_flag("-h,--help", "Print this help and exit");
}

// A word that is followed by another. That one comes is looked at later: the parser would tell a wrong word as a
// missing one.
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

// A command that works on one schema directory.
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

void add_ldif_check(CLI::App& group, options& given, command& chosen)
{
    ldif_check_call& call = given.ldif_check;
    CLI::App* app = add_command(group, "check", "Tell which entries a server would refuse, and why", ldif_check_details,
                                given.common);
    app->add_option("FILE", call.file, "The LDIF file, - for standard input")->type_name("")->required();
    app->add_option("--mode", call.checks.mode, "How strictly entries are checked against the schema")
        ->check(CLI::Range(1, 4).description(""))
        ->type_name("1|2|3|4");
    app->add_flag("--policy", call.checks.policy,
                  "Permit the attributes of the password policy and those that servers set,\nas in a copy of another "
                  "server");
    app->add_option("--rejects", call.rejects, "Write the refused entries, as they stood, to this file")
        ->type_name("FILE");
    app->add_option("--threads", call.threads,
                    "How many threads check (default: one a processor, at most " + std::to_string(ldif_most_threads) +
                        ")")
        ->check(CLI::Range(1, 64).description(""))
        ->type_name("N");
    app->callback([&] { chosen = [&](message_collector&) { return check_ldif(given.common, given.ldif_check); }; });
}

void add_ldif_group(CLI::App& app, options& given, command& chosen)
{
    CLI::App* group = app.add_subcommand("ldif", "Check, print and compare entries in LDIF files");
    add_flags_of_all(*group);
    expect_subcommand(*group);
    add_ldif_check(*group, given, chosen);

    CLI::App* print =
        add_command(*group, "print", "Print entries as the server writes them", ldif_print_details, given.common);
    print->add_option("FILE", given.file, "The LDIF file, - for standard input")->type_name("")->required();
    print->add_option("--form", given.form, "How to print each entry")
        ->transform(one_of(ldif_forms))
        ->type_name("FORM");
    print->callback([&] {
        chosen = [&](message_collector&) {
            return print_ldif(given.common, given.file, value_of(given.form, ldif_forms, ldif_form::text));
        };
    });

    CLI::App* diff = add_command(*group, "diff", "Print the changes that turn one LDIF file into another",
                                 ldif_diff_details, given.common);
    diff->add_option("BEFORE", given.before, "The file to compare with, - for standard input")
        ->type_name("")
        ->required();
    diff->add_option("AFTER", given.after, "The file that may differ, - for standard input")->type_name("")->required();
    diff->callback(
        [&] { chosen = [&](message_collector&) { return diff_ldif(given.common, given.before, given.after); }; });
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
    add_ldif_group(app, given, chosen);

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
