// Completion in bash: what it offers is what the tool's help tells, in both directions, and what stands in the schema.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <iterator>
#include <regex>
#include <set>
#include <sstream>

#include "tests/tools/dirbase/run_tool.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::IsSupersetOf;
using testing::Not;
using tool_test::lines_of;
using tool_test::run_settings;
using tool_test::run_tool;
using tool_test::schema_copy;
using tool_test::tool_run;
using tool_test::words;

using word_set = std::set<std::string>;

// Sources the completion, and calls the function that it registered on the words behind the path of the tool, with the
// cursor at the end of the last one.
constexpr char completing[] = R"(
    source "$0" || exit 1
    function=$(complete -p dirbase) && [[ $function == *' -F '* ]] || exit 1
    function=${function#* -F }
    COMP_WORDS=("$@") COMP_CWORD=$(($# - 1))
    "${function%% *}" dirbase "${COMP_WORDS[COMP_CWORD]}" "${COMP_WORDS[COMP_CWORD - 1]}"
    ((${#COMPREPLY[@]} == 0)) || printf '%s\n' "${COMPREPLY[@]}"
)";

class Completion : public testing::Test {
protected:
    void SetUp() override
    {
        if (std::system("bash -c : 2>/dev/null") != 0) {
            GTEST_SKIP() << "there is no bash";
        }
    }

    static word_set complete(const words& line, const std::string& schema_variable = {})
    {
        const std::string script = DIRBASE_SOURCE_SCHEMA_DIR "/../../tools/dirbase/dirbase.bash-completion";
        const tool_run run =
            run_tool(line, {.schema_variable = schema_variable, .in_front = {"bash", "-c", completing, script}});
        EXPECT_EQ(run.status, 0);
        EXPECT_EQ(run.err, "");
        const words found = lines_of(run.out);
        word_set distinct(found.begin(), found.end());
        EXPECT_EQ(distinct.size(), found.size()) << "a word is offered twice";
        return distinct;
    }

    static std::string help(words call)
    {
        call.emplace_back("--help");
        return run_tool(call).out;
    }

    // The first words of the lines below a heading, parted at commas.
    static word_set listed(const std::string& help, const std::string& heading)
    {
        word_set result;
        bool below = false;
        for (const std::string& line : lines_of(help)) {
            if (line.empty() || line.front() != ' ') {
                below = line == heading;
            } else if (std::smatch match;
                       below && std::regex_search(line, match, std::regex("^  ([^ ,]+)(,(\\S+))?"))) {
                result.insert(match[1]);
                if (match[3].matched) {
                    result.insert(match[3]);
                }
            }
        }
        return result;
    }

    // All commands, as the help tells them.
    static std::vector<words> commands()
    {
        std::vector<words> result;
        for (const std::string& group : listed(help({}), "Subcommands:")) {
            for (const std::string& command : listed(help({group}), "Subcommands:")) {
                result.push_back({group, command});
            }
        }
        EXPECT_GE(result.size(), 16U);
        return result;
    }

    static word_set joined(word_set a, const word_set& b)
    {
        a.insert(b.begin(), b.end());
        return a;
    }
};

TEST_F(Completion, GroupsAndCommandsAreThoseOfTheHelp)
{
    EXPECT_EQ(complete({""}), joined(listed(help({}), "Subcommands:"), listed(help({}), "Options:")));
    for (const std::string& group : listed(help({}), "Subcommands:")) {
        SCOPED_TRACE(group);
        EXPECT_EQ(complete({group, ""}),
                  joined(listed(help({group}), "Subcommands:"), listed(help({group}), "Options:")));
    }
}

TEST_F(Completion, OptionsAreThoseOfTheHelp)
{
    for (words line : commands()) {
        SCOPED_TRACE(testing::PrintToString(line));
        const word_set options = listed(help(line), "Options:");
        EXPECT_THAT(options, IsSupersetOf({"--json", "--help"}));
        line.emplace_back("-");
        EXPECT_EQ(complete(line), options);
    }
}

TEST_F(Completion, WordsOfOptionsAreThoseOfTheHelp)
{
    // "--scope SCOPE:{base,one,sub}", "--mode 1|2|3|4"
    const std::regex option("\n  (--\\S+) (?:[A-Z]+:\\{([^}]*)\\}|(\\d(?:\\|\\d)+))");
    int seen = 0;
    for (const words& command : commands()) {
        const std::string text = help(command);
        for (std::sregex_iterator at(text.begin(), text.end(), option), end; at != end; ++at) {
            SCOPED_TRACE(testing::PrintToString(command) + " " + at->str(1));
            std::string list = at->str(2) + at->str(3);
            std::replace_if(
                list.begin(), list.end(), [](char c) { return c == ',' || c == '|'; }, '\n');
            const words expected = lines_of(list);
            words line = command;
            line.insert(line.end(), {at->str(1), ""});
            EXPECT_EQ(complete(line), word_set(expected.begin(), expected.end()));
            line.insert(line.end() - 1, "=");  // as bash parts "--scope="
            EXPECT_EQ(complete(line), word_set(expected.begin(), expected.end()));
            line.pop_back();
            EXPECT_EQ(complete(line), word_set(expected.begin(), expected.end()));
            ++seen;
        }
    }
    EXPECT_EQ(seen, 5);
}

TEST_F(Completion, PropertiesAreThoseOfTheHelp)
{
    const std::string text = help({"schema", "list"});
    const std::size_t start = text.find("Properties:") + 11;
    std::istringstream list(text.substr(start, text.find("\n\n", start) - start));
    const word_set expected{std::istream_iterator<std::string>(list), {}};
    EXPECT_EQ(complete({"schema", "list", ""}), expected);
}

TEST_F(Completion, WordsFollowFromWhatStandsInFront)
{
    const struct {
        words line;
        word_set expected;
    } cases[] = {
        {{"sch"}, {"schema"}},
        {{"nonesuch", ""}, {}},
        {{"schema", "nonesuch", ""}, {}},
        {{"schema", "p"}, {"print"}},
        {{"schema", "print", "--f"}, {"--form"}},
        {{"schema", "print", "--form", "x"}, {"xan", "xan-default"}},
        {{"schema", "print", "--form", "=", "xan-"}, {"xan-default"}},
        {{"ldif", "print", "--form", "n"}, {"no-members"}},
        {{"schema", "modify", "--schema", "here", "d"}, {"delete"}},
        {{"schema", "modify", "--schema", "=", "here", "d"}, {"delete"}},
        {{"schema", "modify", "--json", "-v", ""}, {"add", "delete", "replace"}},
        {{"schema", "list", "config", ""}, {}},
        {{"schema", "list", "nonenc"}, {"nonencryptable", "nonencrypted"}},
        {{"ldif", "search", "--base", "schema", "--sc"}, {"--schema", "--scope"}},
        {{"ldif", "search", "--base", ""}, {}},
        {{"ldif", "search", "people.ldif", ""}, {}},
        {{"dn", "normalize", ""}, {}},
    };
    for (const auto& [line, expected] : cases) {
        SCOPED_TRACE(testing::PrintToString(line));
        EXPECT_EQ(complete(line), expected);
    }
}

TEST_F(Completion, FilesAndFolders)
{
    const test_support::temp_dir dir;
    dir.write("a file.ldif", "");
    dir.write("a folder/inside", "");
    const std::string start = dir.path("a ");
    const word_set both = {dir.path("a file.ldif"), dir.path("a folder")};
    const word_set folder = {dir.path("a folder")};
    const struct {
        words line;
        word_set expected;
    } cases[] = {
        {{"ldif", "check", start}, both},
        {{"ldif", "check", "--rejects", start}, both},
        {{"ldif", "check", "--rejects", "x", start}, both},
        {{"ldif", "check", "one", start}, {}},
        {{"ldif", "diff", "one", start}, both},
        {{"schema", "check", "one", "two", start}, both},
        {{"schema", "modify", "add", start}, both},
        {{"schema", "diff", start}, folder},
        {{"schema", "diff", "one", start}, folder},
        {{"schema", "show", "--schema", start}, folder},
        {{"schema", "show", "--schema", "=", start}, folder},
    };
    for (const auto& [line, expected] : cases) {
        SCOPED_TRACE(testing::PrintToString(line));
        EXPECT_EQ(complete(line), expected);
    }
}

TEST_F(Completion, NamesComeFromTheSchemaOfTheLine)
{
    const schema_copy schema;
    schema.write_schema("V3.additions", "attributeTypes { ( 1.2.3.4 NAME 'quillLength' SUP name ) }\n"
                                        "objectClasses { ( 1.2.3.5 NAME ( 'quillBearer' 'feathered' ) SUP top ) }\n");
    const std::string folder = schema.folder();
    EXPECT_THAT(complete({"schema", "show", "quill"}), IsEmpty());
    EXPECT_THAT(complete({"schema", "show", "--schema", folder, "QUILL"}), ElementsAre("quillBearer", "quillLength"));
    EXPECT_THAT(complete({"schema", "show", "quill"}, folder), ElementsAre("quillBearer", "quillLength"));
    EXPECT_THAT(complete({"value", "normalize", "quill"}, folder), ElementsAre("quillLength"));
    EXPECT_THAT(complete({"ldif", "search", "file", "(cn=*)", "cn", "quill"}, folder), ElementsAre("quillLength"));

    // As many as the tool has.
    EXPECT_EQ(complete({"value", "normalize", ""}, folder).size(),
              lines_of(run_tool({"schema", "print", "--schema", folder, "--kind", "attributetypes"}).out).size());
}

TEST_F(Completion, AnInterruptedChangeIsLeftAlone)
{
    const schema_copy schema;
    schema.write_schema("V3.core.at.tmp", "");
    schema.write_schema("V3.core.at.tmp.old", schema.read_schema("V3.core.at"));
    const tool_test::folder_contents before = schema.contents();
    EXPECT_THAT(complete({"schema", "show", "--schema", schema.folder(), "person"}), IsEmpty());
    EXPECT_EQ(schema.contents(), before);
    EXPECT_EQ(schema.run("show", {"person"}).status, 0);
    EXPECT_THAT(complete({"schema", "show", "--schema", schema.folder(), "person"}), Not(IsEmpty()));
}

}  // namespace
