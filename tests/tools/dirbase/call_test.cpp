// The command line as a whole: help, wrong calls, where the schema comes from, and what happens to the output.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <nlohmann/json.hpp>
#include <thread>

#include "tests/support/temp_dir.h"
#include "tests/tools/dirbase/run_tool.h"

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;
using tool_test::run_tool;
using tool_test::schema_copy;
using tool_test::single_file_schema;
using tool_test::tool_run;
using tool_test::words;

namespace {

// What the tool writes to a terminal.
std::string seen_on_terminal(const words& call, const std::string& input)
{
    const int terminal = posix_openpt(O_RDWR | O_NOCTTY);
    EXPECT_EQ(grantpt(terminal), 0);
    EXPECT_EQ(unlockpt(terminal), 0);
    const std::string name = ptsname(terminal);
    const int other_end = open(name.c_str(), O_RDWR | O_NOCTTY);  // until it is closed, reading goes on
    std::string seen;
    std::thread reader([&] {
        char chunk[1024];
        for (ssize_t got = 0; (got = read(terminal, chunk, sizeof(chunk))) > 0;) {
            seen.append(chunk, static_cast<std::size_t>(got));
        }
    });
    const tool_run run = run_tool(call, {.input = input, .output_path = name});
    close(other_end);
    reader.join();
    close(terminal);
    EXPECT_EQ(run.status, 0) << run.err;
    return seen;
}

}  // namespace

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
        {"dn", "check"},
        {"dn", "parent"},
        {"dn", "compare"},
        {"value"},
        {"value", "normalize"},
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
        // What a variable that isn't set leaves of a name.
        {{"schema", "check", "--schema", ""}, "--schema: the name is empty"},
        {{"schema", "check", "--schema=", "V3.additions"}, "--schema: the name is empty"},
        {{"schema", "check", ""}, "FILE: the name is empty"},
        {{"schema", "modify", "add", ""}, "FILE: the name is empty"},
        {{"schema", "diff", "", "x"}, "BEFORE: the name is empty"},
        {{"schema", "diff", "x", ""}, "AFTER: the name is empty"},
        {{"ldif", "check", "--rejects", "", "-"}, "--rejects: the name is empty"},
        {{"ldif", "print", ""}, "FILE: the name is empty"},
        {{"ldif", "diff", "", "-"}, "BEFORE: the name is empty"},
        {{"ldif", "diff", "-", ""}, "AFTER: the name is empty"},
        {{"ldif", "search", "", "cn=a"}, "FILE: the name is empty"},
        {{"dn", "check", "--schema", "x", "cn=a"}, "--schema"},
        // Names that look like something else to a parser.
        {{"schema", "show", "[a,b]", "++", "[]"},
         "[a,b]: no definition of the schema has this name or oid\n"
         "++: no definition of the schema has this name or oid\n"
         "[]: no definition of the schema has this name or oid\n",
         1},
        {{"schema", "check", "[a,b]"}, "[a,b]: No such file or directory"},
        {{"schema", "list", "[a,b]"}, "PROPERTY: [a,b] not in {"},
        {{"schema", "check", "--schema", "[a,b]"}, "[a,b]/schema.list: No such file"},
        {{"schema", "check", "--schema=[a,b]"}, "[a,b]/schema.list: No such file"},
        {{"ldif", "search", "[a,b]", "cn=a"}, "[a,b]: No such file or directory"},
        {{"ldif", "search", "-", "cn=a", "[a,b]"}, "no attribute \"[a,b]\"", 1},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::PrintToString(c.call));
        const tool_run run = run_tool(c.call);
        EXPECT_EQ(run.status, c.status);
        EXPECT_THAT(run.err, AllOf(HasSubstr(c.message), Not(HasSubstr("\x1b"))));
        EXPECT_EQ(run.out, "");
    }
}

TEST(ToolCall, AnAnswerIsGivenToWhatWasWritten)
{
    const struct {
        words call;
        words input;  // what JSON gives back
        const char* list;
        const char* member;
    } cases[] = {
        {{"value", "normalize", "cn"},
         {"[a,b]", "[]", "[", "]", "[[a],[b]]", "++", "{}", "%%", "a,b", ""},
         "values",
         "value"},
        {{"dn", "normalize"}, {"[cn=a,cn=a]", "[]", "++", ""}, "dns", "dn"},
        {{"dn", "check", "--"}, {"[cn=a,cn=a]", "--x="}, "dns", "dn"},
        {{"filter", "parse"}, {"[cn=a,cn=b]", "[]", "++"}, "filters", "filter"},
    };
    for (const auto& c : cases) {
        words call = tool_test::joined(c.call, c.input);
        call.insert(call.begin() + 2, "--json");
        SCOPED_TRACE(testing::PrintToString(call));
        const auto shown = nlohmann::json::parse(run_tool(call).out);
        words given;
        for (const auto& answer : shown[c.list]) {
            given.push_back(answer[c.member]);
        }
        EXPECT_EQ(given, c.input);
    }
    EXPECT_EQ(run_tool({"dn", "compare", "[cn=a,cn=a]"}).status, 2);
    EXPECT_EQ(run_tool({"dn", "compare", "cn=a", "cn=a", "cn=a"}).status, 2);
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
    const words calls[] = {
        {"schema", "check"},
        {"schema", "print"},
        {"schema", "check", "--schema", "/nonexistent"},
        {"dn", "normalize", "cn=a"},
        {"dn", "check", "-"},
        {"value", "normalize", "cn", "a"},
        {"filter", "parse", "cn=a"},
        {"schema", "list", "zz"},
        {"dn", "compare", "cn=a", "cn=b"},
        {"ldif", "search", "-", "cn=a"},
        {"ldif", "check", "-"},
    };
    const std::string full = "standard output: No space left on device\n";
    for (words call : calls) {
        for (const bool as_json : {false, true}) {
            SCOPED_TRACE(testing::PrintToString(call));
            const tool_run run = run_tool(call, {.input = "dn: cn=a\ncn: a\n\n", .output_path = "/dev/full"});
            EXPECT_EQ(run.status, 2);
            const std::size_t at = run.err.find(full);
            EXPECT_EQ(run.err.find(full, at + 1), std::string::npos) << run.err;  // told once
            EXPECT_TRUE(at != std::string::npos || !as_json) << run.err;
            call.insert(call.begin() + 2, "--json");
        }
    }
}

// A file that is opened next would get the number of the stream.
TEST(ToolCall, AClosedStandardStreamIsNoFile)
{
    const test_support::temp_dir dir;
    const std::string rejects = dir.path("rejects");
    const struct {
        const char* closing;
        int status;
        const char* err;
        bool has_rejects;
    } cases[] = {
        {">&-", 2, "standard output: Bad file descriptor\n", true},
        {"2>&-", 1, "", true},
        {"<&-", 2, "standard input: Bad file descriptor\n", false},
        {"<&- >&- 2>&-", 2, "", false},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.closing);
        dir.write("rejects", "");
        const tool_run run = run_tool(
            {"ldif", "check", "-", "--rejects", rejects},
            {.input = "dn: cn=a\ncn: a\n", .in_front = {"sh", "-c", std::string("exec \"$0\" \"$@\" ") + c.closing}});
        EXPECT_EQ(run.status, c.status);
        EXPECT_EQ(run.err, c.err);
        const std::string written = dir.read("rejects");
        EXPECT_EQ(written.find("dn: cn=a\ncn: a\n") != std::string::npos, c.has_rejects) << written;
        EXPECT_THAT(written, Not(HasSubstr("entries")));
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
    const std::pair<words, const char*> wrong[] = {
        {{"schema", "list", "--json", "zz"}, "zz"},
        {{"schema", "chekc", "--json"}, "chekc"},
        {{"dn", "normalize", "--json"}, "DN is required"},
        {{"schema", "check", "--json", "--schema", ""}, "--schema"},
    };
    for (const auto& [call, fault] : wrong) {
        const tool_run run = run_tool(call);
        EXPECT_EQ(run.status, 2);
        const auto parsed = nlohmann::json::parse(run.out);
        EXPECT_EQ(parsed["ok"], false);
        EXPECT_THAT(parsed["error"]["text"].get<std::string>(), HasSubstr(fault));
    }
    EXPECT_EQ(run_tool({"schema", "list", "zz", "--", "--json"}).out, "");
}

// Definitions and values may hold control bytes. They go into a file as they are, and to a terminal escaped.
TEST(ToolCall, ATerminalGetsNoControlBytes)
{
    const schema_copy schema;
    schema.write_schema("V3.additions", "ldapSyntaxes { ( 1.2.3.4 DESC 'red \x1b[31m' ) }");
    EXPECT_THAT(schema.run("show", {"1.2.3.4"}).out, HasSubstr("red \\x1b[31m"));
    const std::string entry = "dn: cn=a\nobjectClass: person\ncn: a\nsn: a\x1b[31m\n";
    const struct {
        words call;
        const char* to_file;
        const char* to_terminal;
    } cases[] = {
        {{"schema", "print", "--kind", "syntaxes", "--schema", schema.folder()},
         "DESC 'red \x1b[31m' )\n",
         "DESC 'red \\x1b[31m' )\r\n"},
        {{"dn", "normalize", "cn=a\x1b[31m\nb"},
         "canonical  cn=a\x1b[31m\nb\nupper      CN=A\x1b[31M\nB\n",
         "canonical  cn=a\\x1b[31m\\nb\r\nupper      CN=A\\x1b[31M\\nB\r\n"},
        {{"dn", "parent", "cn=c,cn=a\x1b[31m"}, "cn=a\x1b[31m\n", "cn=a\\x1b[31m\r\n"},
        {{"value", "normalize", "cn", "a\x1b[31m\nb", "c\u009b"},
         "A\x1b[31M\nB\nC\u009b\n",
         "A\\x1b[31M\\nB\r\nC\\xc2\\x9b\r\n"},
        {{"filter", "parse", "(cn=c\u009b)"}, "(cn=C\u009b)\n", "(cn=C\\xc2\\x9b)\r\n"},
        {{"ldif", "print", "-"}, "sn: a\x1b[31m\n", "sn: a\\x1b[31m\r\n"},
        {{"ldif", "search", "-", "cn=a"}, "sn: a\x1b[31m\n", "sn: a\\x1b[31m\r\n"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::PrintToString(c.call));
        EXPECT_THAT(run_tool(c.call, {.input = entry}).out, HasSubstr(c.to_file));
        EXPECT_THAT(seen_on_terminal(c.call, entry), AllOf(HasSubstr(c.to_terminal), Not(HasSubstr("\x1b"))));
    }
}
