// The command line of the groups `dirbase filter` and `dirbase ldif`.
#include "tools/dirbase/command_line.h"
#include "tools/dirbase/filter_commands.h"
#include "tools/dirbase/ldif_pool.h"

namespace dirbase_tool {

namespace {

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

constexpr char ldif_search_details[] =
    R"(The entries for which the filter is true are printed in LDIF, in the order of the file. A base is compared in
normal form. Values count as they stand in the file: naming attributes that an entry lacks aren't added.

ATTR is any name or OID of an attribute; without a language tag it stands for all versions. * stands for all
attributes and 1.1 for none of them: the DN alone.

What an undefined filter says, and what can't be evaluated, is told in docs/filters.md. Entries with lines that
can't be read are told and passed over. Memory doesn't grow with the file. Exit status 1 says that nothing
matches, 2 that the filter is none or is refused.

  dirbase ldif search people.ldif '(&(objectClass=person)(!(mail=*)))' cn telephoneNumber
  dirbase ldif search --count --base ou=People,o=Acme --scope one people.ldif '(sn=smi*)'
)";

constexpr char filter_parse_details[] =
    R"(A filter goes the way from a client to a server: it is parsed, encoded and read by the rules of the schema.
What is printed is the canonical text, as a server logs it, and the elements below each other, values in normal
form. An element that is undefined (the schema lacks its attribute, its value is longer than the attribute's
column, or it is an extensible match) is left out of an OR and makes an AND or a NOT undefined; a search by an
undefined filter finds nothing. An element that is refused makes the whole filter refused. An integer, a boolean
or a time that is none is remarked on.

A FILTER that is - stands for those on standard input, one a line of at most 1 MiB. Exit status 1 says that one isn't defined.

  dirbase filter parse '(&(objectClass=person)(|(cn=a*b)(sn~=smith)))'
)";

constexpr word<ldif_form> ldif_forms[] = {
    {"ldif", ldif_form::text},
    {"no-members", ldif_form::without_members},
    {"ber", ldif_form::ber},
};

constexpr word<search_scope> scopes[] = {
    {"base", search_scope::base},
    {"one", search_scope::one},
    {"sub", search_scope::sub},
};

void add_file(CLI::App& app, std::string& file)
{
    app.add_option("FILE", file, "The LDIF file, - for standard input")->check(not_empty())->type_name("")->required();
}

void add_threads(CLI::App& app, unsigned& threads)
{
    app.add_option("--threads", threads,
                   "How many threads work (default: one a processor, at most " + std::to_string(ldif_most_threads) +
                       ")")
        ->check(CLI::Range(1, 64).description(""))
        ->type_name("N");
}

void add_ldif_check(CLI::App& group, common_options& common, entry_options& given, command& chosen)
{
    ldif_check_call& call = given.check;
    CLI::App* app =
        add_command(group, "check", "Tell which entries a server would refuse, and why", ldif_check_details, common);
    add_file(*app, call.file);
    app->add_option("--mode", call.checks.mode, "How strictly entries are checked against the schema")
        ->check(CLI::Range(1, 4).description(""))
        ->type_name("1|2|3|4");
    app->add_flag("--policy", call.checks.policy,
                  "Permit the attributes of the password policy and those that servers set,\nas in a copy of another "
                  "server");
    app->add_option("--rejects", call.rejects, "Write the refused entries, as they stood, to this file")
        ->check(not_empty())
        ->type_name("FILE");
    add_threads(*app, call.threads);
    app->callback([&] { chosen = [&](message_collector&) { return check_ldif(common, given.check); }; });
}

void add_ldif_print(CLI::App& group, common_options& common, entry_options& given, command& chosen)
{
    CLI::App* app = add_command(group, "print", "Print entries as the server writes them", ldif_print_details, common);
    add_file(*app, given.file);
    app->add_option("--form", given.form, "How to print each entry")->transform(one_of(ldif_forms))->type_name("FORM");
    app->callback([&] {
        chosen = [&](message_collector&) {
            return print_ldif(common, given.file, value_of(given.form, ldif_forms, ldif_form::text));
        };
    });
}

void add_ldif_diff(CLI::App& group, common_options& common, entry_options& given, command& chosen)
{
    CLI::App* app =
        add_command(group, "diff", "Print the changes that turn one LDIF file into another", ldif_diff_details, common);
    app->add_option("BEFORE", given.before, "The file to compare with, - for standard input")
        ->check(not_empty())
        ->type_name("")
        ->required();
    app->add_option("AFTER", given.after, "The file that may differ, - for standard input")
        ->check(not_empty())
        ->type_name("")
        ->required();
    app->callback([&] { chosen = [&](message_collector&) { return diff_ldif(common, given.before, given.after); }; });
}

void add_ldif_search(CLI::App& group, common_options& common, entry_options& given, command& chosen)
{
    ldif_search_call& call = given.search;
    CLI::App* app =
        add_command(group, "search", "Print the entries that a filter selects", ldif_search_details, common);
    add_file(*app, call.file);
    app->add_option("FILTER", call.filter, "The filter (RFC 4515)")->type_name("")->required();
    app->add_option("ATTR", call.attributes, "Attributes to print (default: all)")->type_name("");
    CLI::Option* base =
        app->add_option("--base", call.base, "Search only this entry and those below it")->type_name("DN");
    app->add_option("--scope", given.scope, "The entry alone, its children, or all of it (default)")
        ->transform(one_of(scopes))
        ->needs(base)
        ->type_name("SCOPE");
    app->add_option("--limit", call.limit, "Stop after so many entries")
        ->check(CLI::Range(std::size_t{1}, std::size_t{1} << 62).description(""))
        ->type_name("N");
    app->add_flag("--count", call.count_only, "Print the number of the entries alone");
    add_threads(*app, call.threads);
    app->callback([&] {
        chosen = [&](message_collector&) {
            given.search.scope = value_of(given.scope, scopes, search_scope::sub);
            return search_ldif(common, given.search);
        };
    });
}

}  // namespace

void add_filter_group(CLI::App& app, common_options& common, entry_options& given, command& chosen)
{
    CLI::App* group = app.add_subcommand("filter", "Explain search filters");
    add_flags_of_all(*group);
    expect_subcommand(*group);
    CLI::App* parse = add_command(*group, "parse", "Tell what a server makes of filters", filter_parse_details, common);
    parse->add_option("FILTER", given.filters, "Filters (RFC 4515), - for standard input")->type_name("")->required();
    parse->callback([&] { chosen = [&](message_collector&) { return parse_filters(common, given.filters); }; });
}

void add_ldif_group(CLI::App& app, common_options& common, entry_options& given, command& chosen)
{
    CLI::App* group = app.add_subcommand("ldif", "Check, print, compare and search entries in LDIF files");
    add_flags_of_all(*group);
    expect_subcommand(*group);
    add_ldif_check(*group, common, given, chosen);
    add_ldif_print(*group, common, given, chosen);
    add_ldif_diff(*group, common, given, chosen);
    add_ldif_search(*group, common, given, chosen);
}

}  // namespace dirbase_tool
