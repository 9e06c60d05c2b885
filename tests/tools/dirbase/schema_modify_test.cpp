// dirbase schema modify: which bytes change, and that none does when a change is refused.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <nlohmann/json.hpp>
#include <thread>

#include "tests/tools/dirbase/run_tool.h"

using testing::HasSubstr;
using tool_test::folder_contents;
using tool_test::run_tool;
using tool_test::schema_copy;
using tool_test::tool_run;

namespace fs = std::filesystem;

namespace {

constexpr char badge[] = "attributeTypes = ( 1.2.3.1 NAME 'badge' SUP name )\n"
                         "XANattributeTypes = ( 1.2.3.1 DBNAME ( 'badge_t' 'badge_c' ) LENGTH 9 )";
constexpr char guest[] = "objectClasses: ( 1.2.3.2 NAME 'guest' SUP person MUST badge )";

// A schema file as a change writes it.
std::string file_of(const std::string& classes, const std::string& types, const std::string& extended,
                    const std::string& syntaxes = "", const std::string& rules = "")
{
    return "objectClasses {\n" + classes + "}\n\nattributeTypes {\n" + types + "}\n\nXANattributeTypes {\n" + extended +
           "}\n\nldapSyntaxes {\n" + syntaxes + "}\n\nmatchingRules {\n" + rules + "}\n\n";
}

class SchemaModify : public testing::Test {
protected:
    tool_run modify(const std::string& operation, const std::string& definition)
    {
        return schema.run("modify", {operation, "-"}, {.input = definition});
    }

    // A change that must fail and leave every byte as it was; returns what was written to standard error.
    std::string refused(const std::string& operation, int status, const tool_test::run_settings& settings)
    {
        const folder_contents before = schema.contents();
        const tool_run run = schema.run("modify", {operation, "-"}, settings);
        EXPECT_EQ(run.status, status);
        EXPECT_EQ(run.out, "");
        EXPECT_TRUE(before == schema.contents()) << "something has changed";
        return run.err;
    }

    schema_copy schema;
};

}  // namespace

TEST_F(SchemaModify, ADefinitionComesAndGoesInTheLastFileAndIsReplacedInItsOwn)
{
    const std::string guest_line = "( 1.2.3.2 NAME 'guest' SUP person STRUCTURAL MUST badge )\n";
    const std::string badge_line = "( 1.2.3.1 NAME 'badge' SUP name )\n";
    const std::string extended_line = "( 1.2.3.1 DBNAME ( 'badge_t' 'badge_c' ) LENGTH 9 )\n";
    const std::string colour = "( 1.2.3.5 DESC 'colour' )";
    const std::string match = "( 1.2.3.6 NAME 'colourMatch' SYNTAX 1.2.3.5 )";
    const std::string hue_match = "( 1.2.3.6 NAME ( 'colourMatch' 'hueMatch' ) SYNTAX 1.2.3.5 )";
    const std::string person = "( 2.16.840.1.113730.3.2.2 NAME 'inetOrgPerson' SUP organizationalPerson ";
    const struct {
        const char* operation;
        std::string definition;
        std::string text;  // of the changed file
        const char* file = "V3.additions";
    } changes[] = {
        {"add", badge, file_of("", badge_line, extended_line)},
        {"add", guest, file_of(guest_line, badge_line, extended_line)},
        {"delete", guest, file_of("", badge_line, extended_line)},
        {"delete", "attributeTypes: ( 1.2.3.1 )", file_of("", "", "")},
        {"add", "ldapSyntaxes: " + colour, file_of("", "", "", colour + "\n")},
        {"add", "matchingRules: " + match, file_of("", "", "", colour + "\n", match + "\n")},
        {"replace", "matchingRules: " + hue_match, file_of("", "", "", colour + "\n", hue_match + "\n")},
        {"delete", "matchingRules: " + match, file_of("", "", "", colour + "\n")},
        {"delete", "ldapSyntaxes: " + colour, file_of("", "", "")},
        {"replace", "objectClasses: " + person + "MAY mail )", file_of(person + "STRUCTURAL MAY mail )\n", "", ""),
         "V3.person.oc"},
    };
    folder_contents expected = schema.contents();
    for (const auto& c : changes) {
        SCOPED_TRACE(c.operation + (" " + c.definition));
        const tool_run run = modify(c.operation, c.definition);
        EXPECT_EQ(run.status, 0) << run.err;
        EXPECT_THAT(run.out, HasSubstr(std::string("changed: ") + c.file + "\n"));
        expected[c.file] = c.text;
        EXPECT_EQ(schema.contents(), expected);
        EXPECT_EQ(schema.run("check").status, 0);
    }
}

TEST_F(SchemaModify, ReplacingWithoutTheExtendedDefinitionTakesItAwayAndSaysSo)
{
    ASSERT_EQ(modify("add", badge).status, 0);
    const tool_run run = modify("replace", "attributeTypes: ( 1.2.3.1 NAME 'badge' SUP name SINGLE-VALUE )");
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.err, HasSubstr("warning: The extended definition of attribute type 'badge' is gone"));
    EXPECT_EQ(schema.run("print", {"--form", "xan"}).out.find("( 1.2.3.1 "), std::string::npos);
}

TEST_F(SchemaModify, ARefusalLeavesEveryByteAsItWas)
{
    ASSERT_EQ(modify("add", badge).status, 0);
    ASSERT_EQ(modify("add", guest).status, 0);
    ASSERT_EQ(modify("add", "matchingRules: ( 1.2.3.3 NAME 'm' SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )").status, 0);
    ASSERT_EQ(modify("add", "attributeTypes: ( 1.2.3.4 NAME 'user' SUP name ORDERING m )").status, 0);
    const struct {
        const char* operation;
        const char* definition;
        int status;
        const char* message;
    } cases[] = {
        // No definition, or not one.
        {"add", "attributeTypes { }", 2, "standard input: holds no definition"},
        {"add", "ldapSyntaxes: ( 1.2.9.1 ) objectClasses: ( 1.2.9.1 )", 2, "holds 2 definitions"},
        {"add", "\n\nldapSyntaxes ( 1.2.9.1 )", 1, "standard input:3: expected ':' '=' '{'"},
        // An extended definition alone.
        {"add", "XANattributeTypes: ( 1.2.9.1 LENGTH 1 )", 1, "extended definition of attribute type '1.2.9.1' alone"},
        {"delete", "XANattributeTypes: ( 1.2.3.1 LENGTH 1 )", 1,
         "extended definition of attribute type '1.2.3.1' alone"},
        // What the schema itself refuses: one for each way to there.
        {"add", "objectClasses: ( 1.2.9.1 NAME 'x' MAY nowhere )", 1, "MAY attribute type 'nowhere' not found"},
        {"delete", "attributeTypes: ( 1.2.3.1 NAME 'cn' )", 1, "do not refer to the same attribute type"},
        {"replace", "attributeTypes: ( 2.5.4.41 NAME 'name' SUP cn )", 1, "There is a cycle"},
        {"delete", "ldapSyntaxes: ( 1.3.6.1.4.1.1466.115.121.1.11 )", 1, ""},
        // What others still use; the note names them.
        {"delete", badge, 1, "note: still used by object class 'guest'\n"},
        {"delete", "objectClasses: ( 2.5.6.6 )", 1, "object class 'guest'"},
        {"delete", "ldapSyntaxes: ( 1.3.6.1.1.15.1 )", 1, "note: still used by matching rule"},
        // The vote itself lets a matching rule go that others name.
        {"delete", "matchingRules: ( 1.2.3.3 SYNTAX 1.2 )", 1, "'m' not found when processing attribute type 'user'"},
        {"delete", "matchingRules: ( 1.2.3.3 SYNTAX 1.2 )", 1, "note: still used by attribute type 'user'\n"},
        // Attribute types of the configuration are never encrypted. The vote doesn't know their home file.
        {"replace",
         "attributeTypes: ( 1.3.77.0.2.4.1402 NAME 'xan-vrndSchemaAdditions' SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )"
         "XANattributeTypes: ( 1.3.77.0.2.4.1402 DBNAME 'add' ENCRYPT AES-256 )",
         1, "Special attributes are not allowed to be encrypted"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(std::string(c.operation) + " " + c.definition);
        EXPECT_THAT(refused(c.operation, c.status, {.input = c.definition}), HasSubstr(c.message));
    }
    schema.write_schema("V3.additions", "oops");
    EXPECT_THAT(refused("add", 1, {.input = badge}), HasSubstr("V3.additions:1: "));
}

TEST_F(SchemaModify, AChangedFileKeepsItsPermissions)
{
    const std::string file = schema.folder() + "/V3.additions";
    for (const mode_t mode : {0600u, 0664u}) {
        ASSERT_EQ(chmod(file.c_str(), mode), 0);
        ASSERT_EQ(modify("add", badge).status, 0);
        ASSERT_EQ(modify("delete", badge).status, 0);
        struct stat status = {};
        ASSERT_EQ(stat(file.c_str(), &status), 0);
        EXPECT_EQ(status.st_mode & 07777u, mode);
    }
}

TEST_F(SchemaModify, AFolderThatCannotBeWrittenIsLeftAlone)
{
    const tool_test::run_settings settings = {.input = badge, .in_front = tool_test::as_common_user(schema)};
    if (run_tool({"--version"}, settings).status != 0) {
        GTEST_SKIP() << "nobody but the superuser can run the tool here";
    }
    fs::permissions(schema.folder(), fs::perms(0555));
    EXPECT_EQ(refused("add", 2, settings), schema.folder() + ": Permission denied\n");
    fs::permissions(schema.folder(), fs::perms(0755));
}

TEST_F(SchemaModify, ASymbolicLinkIsNotReplaced)
{
    const std::string elsewhere = schema.write("elsewhere", "");
    const std::string file = schema.folder() + "/V3.additions";
    fs::remove(file);
    fs::create_symlink(elsewhere, file);
    EXPECT_EQ(refused("add", 2, {.input = badge}), file + ": a symbolic link; only a file itself can be changed\n");
    EXPECT_TRUE(fs::is_symlink(file));
    EXPECT_EQ(modify("replace", "attributeTypes: ( 2.5.4.41 NAME 'name' SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )").status,
              0);  // another file
}

// The status tells of the change, whoever reads the report or not.
TEST_F(SchemaModify, AReportThatNobodyReadsIsToldBehindTheChange)
{
    int ends[2] = {};
    ASSERT_EQ(pipe(ends), 0);
    ASSERT_LT(ends[1], 10);
    close(ends[0]);
    const std::string file = schema.write("badge", badge);
    for (const tool_test::words& call : {tool_test::words{"add", file}, {"delete", file, "--json"}}) {
        const folder_contents before = schema.contents();
        const std::string into_pipe = "exec \"$0\" \"$@\" >&" + std::to_string(ends[1]);
        const tool_run run = schema.run("modify", call, {.in_front = {"sh", "-c", into_pipe}});
        EXPECT_EQ(run.status, 2);
        EXPECT_EQ(run.err, "standard output: Broken pipe\nnote: the change is made all the same\n");
        EXPECT_FALSE(before == schema.contents());
    }
    close(ends[1]);
}

TEST_F(SchemaModify, RunsAtTheSameTimeLoseNothing)
{
    std::string types;
    {
        std::vector<std::jthread> threads;
        for (const char* number : {"0", "1", "2", "3", "4", "5"}) {
            const std::string type = std::string("( 1.2.3.") + number + " NAME 'number" + number + "' SUP name )";
            types += type + "\n";
            threads.emplace_back([this, type] { EXPECT_EQ(modify("add", "attributeTypes: " + type).status, 0); });
        }
    }
    EXPECT_EQ(schema.read_schema("V3.additions"), file_of("", types, ""));
}

TEST_F(SchemaModify, AChangeWaitsForWhoeverHasTheFolder)
{
    const int list = open((schema.folder() + "/schema.list").c_str(), O_RDONLY | O_CLOEXEC);
    ASSERT_EQ(flock(list, LOCK_SH), 0);
    EXPECT_EQ(schema.run("check").status, 0);  // readers share
    const folder_contents before = schema.contents();
    tool_run run;
    std::thread waiting([&] { run = modify("add", badge); });
    std::this_thread::sleep_for(std::chrono::milliseconds(300));
    EXPECT_TRUE(before == schema.contents()) << "something has changed";
    ASSERT_EQ(close(list), 0);
    waiting.join();
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, HasSubstr("waiting for another run"));
}

TEST_F(SchemaModify, JsonTellsWhatWasDoneOrWhyNot)
{
    const std::string file = schema.write("badge", badge);
    const auto done = nlohmann::json::parse(schema.run("modify", {"--json", "add", file}).out);
    EXPECT_EQ(done, nlohmann::json::parse(R"({"ok": true, "done": "added", "kind": "attribute type", "oid": "1.2.3.1",
                                              "name": "badge", "changedFiles": ["V3.additions"], "warnings": []})"));
    const auto refused = nlohmann::json::parse(schema.run("modify", {"--json", "add", file}).out);
    EXPECT_EQ(refused["ok"], false);
    EXPECT_EQ(refused["error"]["text"], "attribute type '1.2.3.1' already exists");
}
