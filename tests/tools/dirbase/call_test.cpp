// The command line as a whole: help, wrong calls, where the schema comes from, and what happens to the output.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <nlohmann/json.hpp>
#include <thread>

#include "tests/tools/dirbase/run_tool.h"

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;
using tool_test::run_tool;
using tool_test::schema_copy;
using tool_test::single_file_schema;
using tool_test::tool_run;

using words = std::vector<std::string>;

TEST(ToolCall, HelpAndVersionAreEverywhere)
{
    const words calls[] = {
        {},
        {"schema"},
        {"schema", "check"},
        {"schema", "print"},
        {"schema", "show"},
        {"schema", "modify"},
        {"schema", "list"},
        {"schema", "diff"},
        {"dn"},
        {"dn", "normalize"},
        {"dn", "compare"},
        {"ldif"},
        {"ldif", "check"},
        {"ldif", "print"},
        {"ldif", "diff"},
        {"ldif", "search"},
        {"filter"},
        {"filter", "parse"},
    };
    for (words call : calls) {
        SCOPED_TRACE(testing::PrintToString(call));
        for (const auto& [option, output] : {std::pair("--help", "Usage: dirbase"), {"--version", "dirbase "}}) {
            call.emplace_back(option);
            const tool_run run = run_tool(call);
            call.pop_back();
            EXPECT_EQ(run.status, 0);
            EXPECT_THAT(run.out, HasSubstr(output));
            EXPECT_EQ(run.err, "");
        }
    }
}

TEST(ToolCall, AWrongCallGivesTwoAndNamesTheFault)
{
    const struct {
        words call;
        const char* message;
        int status = 2;
    } cases[] = {
        {{"schema"}, "subcommand"},
        {{"schema", "chekc"}, "chekc"},
        {{"schema", "check", "--colour"}, "--colour"},
        {{"schema", "check", "--schema", "/nonexistent"}, "/nonexistent/schema.list: No such file or directory"},
        {{"schema", "print", "--form", "v4"}, "v4"},
        {{"schema", "print", "--kind", "rules"}, "rules"},
        {{"schema", "show"}, "NAME"},
        {{"schema", "modify", "add"}, "FILE"},
        {{"schema", "modify", "remove", "-"}, "remove"},
        {{"schema", "modify", "add", "/nonexistent"}, "/nonexistent: No such file or directory"},
        {{"schema", "check", "\x1b[31m--\n"}, "\\x1b[31m--\\n"},
        {{"schema", "show", "check", "show"}, "show: no definition", 1},  // behind a command they are names like others
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::PrintToString(c.call));
        const tool_run run = run_tool(c.call);
        EXPECT_EQ(run.status, c.status);
        EXPECT_THAT(run.err, AllOf(HasSubstr(c.message), Not(HasSubstr("\x1b"))));
        EXPECT_EQ(run.out, "");
    }
}

TEST(ToolCall, TheOptionOutranksTheEnvironmentAndThatTheShippedSchema)
{
    const schema_copy good;
    const single_file_schema faulty("oops");
    EXPECT_EQ(run_tool({"schema", "check"}).status, 0);
    EXPECT_EQ(run_tool({"schema", "check"}, {.schema_variable = faulty.folder()}).status, 1);
    EXPECT_EQ(good.run("check", {}, {.schema_variable = faulty.folder()}).status, 0);
}

TEST(ToolCall, OutputThatCannotBeWrittenIsAFailure)
{
    for (const char* command : {"check", "print"}) {
        const tool_run run = run_tool({"schema", command}, {.output_path = "/dev/full"});
        EXPECT_EQ(run.status, 2) << command;
        EXPECT_THAT(run.err, HasSubstr("standard output: ")) << command;
    }
}

TEST(ToolCall, AFailureIsAJsonObjectTooWhenJsonIsAskedFor)
{
    const single_file_schema faulty("\n\nattributeTypes { ( 1.2.3 NAM 'x' ) }");
    for (const words& call : {words{"check"}, words{"print"}, words{"show", "cn"}}) {
        words arguments = {"schema", "--json", "--schema", faulty.folder()};
        arguments.insert(arguments.begin() + 1, call.begin(), call.end());
        const tool_run run = run_tool(arguments);
        EXPECT_EQ(run.status, 1);
        const auto parsed = nlohmann::json::parse(run.out);
        EXPECT_EQ(parsed["ok"], false);
        EXPECT_EQ(parsed["error"]["file"], faulty.folder() + "/all");
        EXPECT_EQ(parsed["error"]["line"], 3);
        EXPECT_EQ(run.err, faulty.folder() + "/all:3: " + parsed["error"]["text"].get<std::string>() + "\n");
    }
}

// A definition may hold control bytes. They go into a file as they are, and to a terminal escaped.
TEST(ToolCall, ATerminalGetsNoControlBytes)
{
    const schema_copy schema;
    schema.write_schema("V3.additions", "ldapSyntaxes { ( 1.2.3.4 DESC 'red \x1b[31m' ) }");
    const words call = {"schema", "print", "--kind", "syntaxes", "--schema", schema.folder()};
    EXPECT_THAT(run_tool(call).out, HasSubstr("'red \x1b[31m'"));
    EXPECT_THAT(schema.run("show", {"1.2.3.4"}).out, HasSubstr("red \\x1b[31m"));

    const int terminal = posix_openpt(O_RDWR | O_NOCTTY);
    ASSERT_EQ(grantpt(terminal), 0);
    ASSERT_EQ(unlockpt(terminal), 0);
    const std::string name = ptsname(terminal);
    const int other_end = open(name.c_str(), O_RDWR | O_NOCTTY);  // until it is closed, reading goes on
    std::string seen;
    std::thread reader([&] {
        char chunk[1024];
        for (ssize_t got = 0; (got = read(terminal, chunk, sizeof(chunk))) > 0;) {
            seen.append(chunk, static_cast<std::size_t>(got));
        }
    });
    const tool_run run = run_tool(call, {.output_path = name});
    close(other_end);
    reader.join();
    close(terminal);
    EXPECT_EQ(run.status, 0);
    EXPECT_THAT(seen, HasSubstr("( 1.2.3.4 DESC 'red \\x1b[31m' )"));
    EXPECT_THAT(seen, Not(HasSubstr("\x1b")));
}
