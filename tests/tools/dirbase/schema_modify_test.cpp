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
using testing::IsEmpty;
using tool_test::contents_of;
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

// The names of the files that differ, or stand in only one of the two.
std::vector<std::string> difference(const folder_contents& before, const folder_contents& after)
{
    std::vector<std::string> names;
    for (const auto& [name, text] : before) {
        if (after.count(name) == 0 || after.at(name) != text) {
            names.push_back(name);
        }
    }
    for (const auto& [name, text] : after) {
        if (before.count(name) == 0) {
            names.push_back(name);
        }
    }
    return names;
}

class SchemaModify : public testing::Test {
protected:
    tool_run modify(const std::string& operation, const std::string& definition)
    {
        return schema.run("modify", {operation, "-"}, {.input = definition});
    }

    // A change that must succeed, change these files and no other, and leave a schema that loads.
    void expect_change(const std::string& operation, const std::string& definition,
                       const std::vector<std::string>& files)
    {
        const folder_contents before = schema.contents();
        const tool_run run = modify(operation, definition);
        EXPECT_EQ(run.status, 0) << run.err;
        EXPECT_EQ(difference(before, schema.contents()), files);
        for (const std::string& file : files) {
            EXPECT_THAT(run.out, HasSubstr("changed: " + file + "\n"));
        }
        EXPECT_EQ(schema.run("check").status, 0);
    }

    schema_copy schema;
};

}  // namespace

TEST_F(SchemaModify, AnAddedDefinitionComesAndGoesInTheLastFile)
{
    const std::string class_line = "( 1.2.3.2 NAME 'guest' SUP person STRUCTURAL MUST badge )\n";
    const std::string type_line = "( 1.2.3.1 NAME 'badge' SUP name )\n";
    const std::string extended_line = "( 1.2.3.1 DBNAME ( 'badge_t' 'badge_c' ) LENGTH 9 )\n";
    expect_change("add", badge, {"V3.additions"});
    EXPECT_EQ(schema.read_schema("V3.additions"), file_of("", type_line, extended_line));
    expect_change("add", guest, {"V3.additions"});
    EXPECT_EQ(schema.read_schema("V3.additions"), file_of(class_line, type_line, extended_line));
    expect_change("delete", guest, {"V3.additions"});
    expect_change("delete", "attributeTypes: ( 1.2.3.1 )", {"V3.additions"});
    EXPECT_EQ(schema.read_schema("V3.additions"), file_of("", "", ""));
}

TEST_F(SchemaModify, SyntaxesAndMatchingRulesComeAndGoToo)
{
    const char* syntax = "ldapSyntaxes: ( 1.2.3.5 DESC 'colour' )";
    const char* rule = "matchingRules: ( 1.2.3.6 NAME 'colourMatch' SYNTAX 1.2.3.5 )";
    expect_change("add", syntax, {"V3.additions"});
    expect_change("add", rule, {"V3.additions"});
    expect_change("replace", "matchingRules: ( 1.2.3.6 NAME ( 'colourMatch' 'hueMatch' ) SYNTAX 1.2.3.5 )",
                  {"V3.additions"});
    EXPECT_EQ(schema.read_schema("V3.additions"),
              file_of("", "", "", "( 1.2.3.5 DESC 'colour' )\n",
                      "( 1.2.3.6 NAME ( 'colourMatch' 'hueMatch' ) SYNTAX 1.2.3.5 )\n"));
    expect_change("delete", rule, {"V3.additions"});
    expect_change("delete", syntax, {"V3.additions"});
}

TEST_F(SchemaModify, AReplacedDefinitionStaysInItsFile)
{
    expect_change("replace",
                  "objectClasses: ( 2.16.840.1.113730.3.2.2 NAME 'inetOrgPerson' SUP organizationalPerson MAY mail )",
                  {"V3.person.oc"});
    EXPECT_EQ(schema.read_schema("V3.person.oc"),
              file_of("( 2.16.840.1.113730.3.2.2 NAME 'inetOrgPerson' SUP organizationalPerson STRUCTURAL MAY mail )\n",
                      "", ""));
}

TEST_F(SchemaModify, ReplacingWithoutTheExtendedDefinitionTakesItAwayAndSaysSo)
{
    expect_change("add", badge, {"V3.additions"});
    const tool_run run = modify("replace", "attributeTypes: ( 1.2.3.1 NAME 'badge' SUP name SINGLE-VALUE )");
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_THAT(run.err, HasSubstr("warning: The extended definition of attribute type 'badge' is gone"));
    EXPECT_EQ(schema.run("print", {"--form", "xan"}).out.find("( 1.2.3.1 "), std::string::npos);
    EXPECT_EQ(schema.run("check").status, 0);
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
        {"add", "", 2, "standard input: holds no definition"},
        {"add", "attributeTypes { }", 2, "holds no definition"},
        {"add", "ldapSyntaxes { ( 1.2.9.1 ) ( 1.2.9.2 ) }", 2, "holds 2 definitions"},
        {"add", "ldapSyntaxes: ( 1.2.9.1 ) objectClasses: ( 1.2.9.1 )", 2, "holds 2 definitions"},
        {"add", "\n\nldapSyntaxes ( 1.2.9.1 )", 1, "standard input:3: expected ':' '=' '{'"},
        // An extended definition alone.
        {"add", "XANattributeTypes: ( 1.2.9.1 LENGTH 1 )", 1, "extended definition of attribute type '1.2.9.1' alone"},
        {"replace", "XANattributeTypes: ( 2.5.4.3 LENGTH 1 )", 1,
         "extended definition of attribute type '2.5.4.3' alone"},
        {"delete", "XANattributeTypes: ( 1.2.3.1 LENGTH 1 )", 1,
         "extended definition of attribute type '1.2.3.1' alone"},
        // What is there, and what isn't.
        {"add", badge, 1, "attribute type '1.2.3.1' already exists"},
        {"add", "attributeTypes: ( 1.2.9.1 NAME 'CN' SUP name )", 1, "attribute type 'CN' already exists"},
        {"delete", "objectClasses: ( 1.2.9.1 )", 1, "object class '1.2.9.1' does not exist"},
        {"delete", "attributeTypes: ( 1.2.3.1 NAME 'cn' )", 1, "do not refer to the same attribute type"},
        {"replace", "objectClasses: ( 1.2.9.1 )", 1, "object class '1.2.9.1' does not exist"},
        {"replace", "attributeTypes: ( 1.2.3.1 NAME ( 'badge' 'cn' ) SUP name )", 1, "do not refer to the same"},
        // References that lead nowhere, or in a circle.
        {"add", "attributeTypes: ( 1.2.9.1 NAME 'x' SUP nowhere )", 1, "SUP attribute type 'nowhere' not found"},
        {"add", "objectClasses: ( 1.2.9.1 NAME 'x' MAY nowhere )", 1, "MAY attribute type 'nowhere' not found"},
        {"add", "matchingRules: ( 1.2.9.1 NAME 'x' SYNTAX 1.2.9.2 )", 1, "syntax '1.2.9.2' not found"},
        {"add", "attributeTypes: ( 1.2.9.1 NAME 'x' SUP name ) XANattributeTypes: ( 1.2.9.1 DBNAME 'a-b' )", 1,
         "Hyphen is not allowed"},
        {"replace", "attributeTypes: ( 2.5.4.41 NAME 'name' SUP cn )", 1, "There is a cycle"},
        // What others still use; the note names them.
        {"delete", badge, 1, "note: still used by object class 'guest'\n"},
        {"delete", "attributeTypes: ( 2.5.4.41 )", 1, "can not be deleted; its refcount is"},
        {"delete", "objectClasses: ( 2.5.6.6 )", 1, "object class 'guest'"},
        {"delete", "ldapSyntaxes: ( 1.3.6.1.1.15.1 )", 1, "note: still used by matching rule"},
        // The vote itself lets a matching rule go that others name.
        {"delete", "matchingRules: ( 1.2.3.3 SYNTAX 1.2 )", 1, "'m' not found when processing attribute type 'user'"},
        {"delete", "matchingRules: ( 1.2.3.3 SYNTAX 1.2 )", 1, "note: still used by attribute type 'user'\n"},
        // What the server can't do without.
        {"delete", "ldapSyntaxes: ( 1.3.6.1.4.1.1466.115.121.1.11 )", 1, ""},
        {"replace", "matchingRules: ( 2.5.13.2 NAME 'caseIgnoreMatch' SYNTAX 1.3.6.1.4.1.1466.115.121.1.26 )", 1,
         "must be provided as"},
        // Attribute types of the configuration are never encrypted. The vote doesn't know their home file.
        {"replace",
         "attributeTypes: ( 1.3.77.0.2.4.1402 NAME 'xan-vrndSchemaAdditions' SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 )"
         "XANattributeTypes: ( 1.3.77.0.2.4.1402 DBNAME 'add' ENCRYPT AES-256 )",
         1, "Special attributes are not allowed to be encrypted"},
    };
    const folder_contents before = schema.contents();
    for (const auto& c : cases) {
        SCOPED_TRACE(std::string(c.operation) + " " + c.definition);
        const tool_run run = modify(c.operation, c.definition);
        EXPECT_EQ(run.status, c.status);
        EXPECT_THAT(run.err, HasSubstr(c.message));
        EXPECT_EQ(run.out, "");
        EXPECT_THAT(difference(before, schema.contents()), IsEmpty());
    }
}

TEST_F(SchemaModify, ASchemaThatDoesNotLoadIsNotChanged)
{
    schema.write_schema("V3.additions", "oops");
    const folder_contents before = schema.contents();
    const tool_run run = modify("add", badge);
    EXPECT_EQ(run.status, 1);
    EXPECT_THAT(run.err, HasSubstr("V3.additions:1: "));
    EXPECT_THAT(difference(before, schema.contents()), IsEmpty());
}

TEST_F(SchemaModify, AChangedFileKeepsItsPermissions)
{
    const std::string file = schema.folder() + "/V3.additions";
    for (const mode_t mode : {0644u, 0600u, 0664u}) {
        ASSERT_EQ(chmod(file.c_str(), mode), 0);
        ASSERT_EQ(modify("add", guest).status, 1);
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
    const folder_contents before = schema.contents();
    const tool_run run = schema.run("modify", {"add", "-"}, settings);
    fs::permissions(schema.folder(), fs::perms(0755));
    EXPECT_EQ(run.status, 1);
    EXPECT_EQ(run.err, schema.folder() + ": permission_denied (EACCES)\n");
    EXPECT_THAT(difference(before, schema.contents()), IsEmpty());
}

TEST_F(SchemaModify, RunsAtTheSameTimeLoseNothing)
{
    constexpr int runs = 6;
    std::vector<std::thread> threads;
    std::vector<int> statuses(runs, -1);
    for (int i = 0; i < runs; ++i) {
        threads.emplace_back([&, i] {
            const std::string number = std::to_string(i);
            statuses[static_cast<std::size_t>(i)] =
                modify("add", "attributeTypes: ( 1.2.3." + number + " NAME 'number" + number + "' SUP name )").status;
        });
    }
    std::string types;
    for (int i = 0; i < runs; ++i) {
        threads[static_cast<std::size_t>(i)].join();
        const std::string number = std::to_string(i);
        types += "( 1.2.3." + number + " NAME 'number" + number + "' SUP name )\n";
    }
    EXPECT_EQ(statuses, std::vector<int>(runs, 0));
    EXPECT_EQ(schema.read_schema("V3.additions"), file_of("", types, ""));
}

TEST_F(SchemaModify, AChangeWaitsForWhoeverHasTheFolder)
{
    const int list = open((schema.folder() + "/schema.list").c_str(), O_RDONLY | O_CLOEXEC);
    ASSERT_GE(list, 0);
    ASSERT_EQ(flock(list, LOCK_SH), 0);
    EXPECT_EQ(schema.run("check").status, 0);  // readers share
    const folder_contents before = schema.contents();
    tool_run run;
    std::thread waiting([&] { run = modify("add", badge); });
    std::this_thread::sleep_for(std::chrono::milliseconds(300));
    EXPECT_THAT(difference(before, schema.contents()), IsEmpty());
    ASSERT_EQ(close(list), 0);
    waiting.join();
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(run.err, HasSubstr("waiting for another run"));
}

TEST_F(SchemaModify, JsonTellsWhatWasDoneOrWhyNot)
{
    const std::string file = schema.write("badge", badge);
    const auto done = nlohmann::json::parse(schema.run("modify", {"--json", "add", file}).out);
    EXPECT_EQ(done["ok"], true);
    EXPECT_EQ(done["done"], "added");
    EXPECT_EQ(done["kind"], "attribute type");
    EXPECT_EQ(done["oid"], "1.2.3.1");
    EXPECT_EQ(done["name"], "badge");
    EXPECT_EQ(done["changedFiles"], std::vector<std::string>{"V3.additions"});

    const auto refused = nlohmann::json::parse(schema.run("modify", {"--json", "add", file}).out);
    EXPECT_EQ(refused["ok"], false);
    EXPECT_EQ(refused["error"]["text"], "attribute type '1.2.3.1' already exists");
}
