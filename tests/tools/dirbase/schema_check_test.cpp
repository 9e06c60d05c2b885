// dirbase schema check: what it accepts, what it says about faults, and input of any size and kind.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <functional>
#include <nlohmann/json.hpp>

#include "tests/tools/dirbase/run_tool.h"

using testing::HasSubstr;
using testing::MatchesRegex;
using testing::StartsWith;
using tool_test::run_tool;
using tool_test::schema_copy;
using tool_test::single_file_schema;
using tool_test::tool_run;

namespace {

constexpr char text_syntax[] = "SYNTAX 1.3.6.1.4.1.1466.115.121.1.15 ";

// Definitions that each have the one before as their superior.
std::string chain(const std::string& section, const std::string& first, std::size_t count)
{
    std::string text = section + " {\n( 1.2.3.0 NAME 'c0' " + first + ")\n";
    for (std::size_t i = 1; i < count; ++i) {
        const std::string number = std::to_string(i);
        text += "( 1.2.3." + number + " NAME 'c" + number + "' SUP c" + std::to_string(i - 1) + " )\n";
    }
    return text + "}\n";
}

}  // namespace

TEST(SchemaCheck, FilesBehindTheSchemaAreLoadedAndCounted)
{
    const schema_copy schema;
    const auto counts = [](const tool_run& run) { return nlohmann::json::parse(run.out); };
    const auto before = counts(schema.run("check", {"--json"}));
    const std::string types = schema.write("types", std::string("attributeTypes { ( 1.2.3.1 NAME 'a' ") + text_syntax +
                                                        ") ( 1.2.3.2 NAME 'b' SUP a ) }");
    const tool_run run =
        schema.run("check", {"--json", types, "-"}, {.input = "objectclasses=( 1.2.3.3 NAME 'c' MAY b )"});
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(run.err, "");
    const auto after = counts(run);
    EXPECT_EQ(after["ok"], true);
    EXPECT_EQ(after["syntaxes"], before["syntaxes"]);
    EXPECT_EQ(after["matchingRules"], before["matchingRules"]);
    EXPECT_EQ(after["attributeTypes"], before["attributeTypes"].get<int>() + 2);
    EXPECT_EQ(after["objectClasses"], before["objectClasses"].get<int>() + 1);
    EXPECT_THAT(run_tool({"schema", "check"}).out,
                MatchesRegex("ok: [0-9]+ syntaxes, [0-9]+ matching rules, [0-9]+ attribute types, [0-9]+ object "
                             "classes\n"));
}

// The only line on standard error, exactly; @ stands for the file's path.
TEST(SchemaCheck, AFaultIsOneLineWithItsPlace)
{
    const schema_copy schema;
    const struct {
        const char* text;
        const char* message;  // empty: no fault
    } cases[] = {
        {" \n\t\r\n", ""},
        {"# empty\nattributeTypes { }", ""},
        {"# nothing behind", "@:1: unexpected end of input"},
        {"\n\nattributeTypes {\n( 1.2.3 NAME 'x' %s", "@:4: invalid token '%s'"},
        {"objectClasses {\n\n( 1.2.3 NAME 'top' ) }", "@:3: duplicate definition of object class 'top'"},
        {"ldapSyntaxes {\n\x1b[31m }", "@:2: invalid token '\\x1b[31m }'"},
        {"objectClasses { ( 1.2.3 NAME 'x' MAY nowhere ) }",
         "MAY attribute type 'nowhere' not found when processing object class 'x'"},
        {"XANattributeTypes { ( 1.2.3 LENGTH 5 ) }", "missing LDAPv3 spec for attribute 1.2.3"},
        {"attributeTypes { ( 1.2.3 NAME 'x' SUP y ) ( 1.2.4 NAME 'y' SUP x ) }",
         "There is a cycle in the supertype specification: 'x <= y <= x'"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.text);
        const std::string file = schema.write("file", c.text);
        std::string expected = c.message;
        if (!expected.empty() && expected.front() == '@') {
            expected.replace(0, 1, file);
        }
        const tool_run run = schema.run("check", {file});
        EXPECT_EQ(run.status, expected.empty() ? 0 : 1);
        EXPECT_EQ(run.err, expected.empty() ? "" : expected + "\n");
        EXPECT_EQ(run.out.empty(), !expected.empty());
    }
    schema.write_schema("V3.additions", "attributeTypes\n( 1.2.3 )");
    EXPECT_THAT(schema.run("check").err, StartsWith(schema.folder() + "/V3.additions:2: expected ':' '=' '{'"));
}

TEST(SchemaCheck, WhatTheServerOnlyRemarksOnIsAWarning)
{
    const schema_copy schema;
    const std::string file = schema.write(
        "file", std::string("attributeTypes { ( 1.2.3.1 NAME 'aNameThatTheStoreWillCut' EQUALITY booleanMatch ") +
                    text_syntax + ") }");
    const std::string rule =
        "The EQUALITY matching rule booleanMatch of attribute aNameThatTheStoreWillCut is not valid "
        "for its syntax 1.3.6.1.4.1.1466.115.121.1.15.";
    const std::string cut =
        "The column name aNameThatTheStoreWillCut is too long for the store and has been cut to aNameThatTheStor.";
    const tool_run quiet = schema.run("check", {file});
    EXPECT_EQ(quiet.status, 0);
    EXPECT_EQ(quiet.err, "warning: " + rule + "\nwarning: " + cut + "\n");

    const tool_run verbose = schema.run("check", {"-v", "--json", file});
    EXPECT_EQ(verbose.status, 0);
    EXPECT_EQ(nlohmann::json::parse(verbose.out)["warnings"], (std::vector<std::string>{rule, cut}));
    EXPECT_THAT(verbose.err, MatchesRegex("(.|\n)*[0-9]{4}-[0-9-]+T[0-9:.]+[+-][0-9]{4} [^\n]*" + rule + "(.|\n)*"));
}

TEST(SchemaCheck, WhatCannotBeReadGivesTwo)
{
    const schema_copy schema;
    schema.write("list-only/schema.list", "# nothing\n\n");
    schema.write("missing-file/schema.list", "  gone \r\n");
    schema.write("binary-list/schema.list", std::string("a\0b", 3));
    schema.write("pipe/schema.list", "pipe\n");
    ASSERT_EQ(mkfifo(schema.path("pipe/pipe").c_str(), 0600), 0);
    ASSERT_EQ(mkdir(schema.path("empty").c_str(), 0700), 0);
    const std::pair<std::vector<std::string>, const char*> cases[] = {
        {{"schema", "absent"}, "absent: No such file or directory"},
        {{"schema", "empty"}, "empty: a directory, where a file is expected"},
        {{"schema", "binary-list/schema.list"}, "schema.list: a binary file: byte 2 is NUL"},
        {{"schema", "schema/V3.core.at/x"}, "x: Not a directory"},
        {{"list-only"}, "schema.list: names no schema file"},
        {{"missing-file"}, "/missing-file/gone: No such file or directory"},
        {{"binary-list"}, "schema.list: a binary file: byte 2 is NUL"},
        {{"pipe"}, "/pipe/pipe: not a regular file"},
        {{"empty"}, "/empty/schema.list: No such file or directory"},
    };
    for (const auto& [names, message] : cases) {
        SCOPED_TRACE(message);
        std::vector<std::string> call = {"schema", "check", "--schema"};
        for (const std::string& name : names) {
            call.push_back(schema.path(name));
        }
        const tool_run run = run_tool(call);
        EXPECT_EQ(run.status, 2);
        EXPECT_THAT(run.err, HasSubstr(message));
        EXPECT_EQ(run.out, "");
    }
}

TEST(SchemaCheck, InputOfAnySizeGetsAnAnswer)
{
#if defined(__SANITIZE_THREAD__)
    GTEST_SKIP() << "one thread, and a million locks that ThreadSanitizer would follow one by one for minutes";
#endif
    constexpr std::size_t huge = 100'000'000;
    constexpr std::size_t links = 100'000;
    const schema_copy schema;
    const struct {
        std::function<std::string()> text;
        int status;
        const char* message;
    } cases[] = {
        {[] { return std::string(huge, '('); }, 1, "huge:1: expected 'ldapSyntaxes'"},
        {[] { return "attributeTypes {\n" + std::string(huge, '('); }, 1, "huge:2: expected object ID"},
        {[] { return "ldapSyntaxes {\n\n( 1.2.3 DESC '" + std::string(huge, 'x'); }, 1, "huge:3: non-terminated"},
        {[] { return "objectClasses { ( top" + std::string(huge, 'x'); }, 1, "huge:1: unexpected end of input"},
        {[] { return std::string(huge, '\n'); }, 0, ""},
        {[] { return chain("attributeTypes", text_syntax, links); }, 0, ""},
        {[] { return chain("attributeTypes", "SUP c99999 ", links); }, 1, "There is a cycle in the supertype"},
        {[] { return chain("objectClasses", "SUP top ", links); }, 1, "has more than 1000 superclasses"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.message);
        const tool_run run = schema.run("check", {schema.write("huge", c.text())});
        EXPECT_EQ(run.status, c.status);
        EXPECT_THAT(run.err, HasSubstr(c.message));
        EXPECT_LT(run.err.size(), 20'000u) << "nobody reads that";
    }
}
