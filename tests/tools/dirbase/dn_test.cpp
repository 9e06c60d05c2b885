// dirbase dn: an answer for each DN, with the place of the fault in one that is refused.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

#include "tests/tools/dirbase/run_tool.h"

using testing::HasSubstr;
using tool_test::run_tool;
using tool_test::tool_run;

TEST(ToolDn, EachDnHasItsAnswer)
{
    const struct {
        std::vector<std::string> call;
        int status;
        const char* out;
    } cases[] = {
        {{"normalize", "CN = Bob , O=\"A, B\" ; c=us"},
         0,
         "canonical  cn=Bob,o=A\\, B,c=us\nupper      CN=BOB,O=A\\, B,C=US\n"},
        {{"normalize", "--light", "foo=b+BAR=a"}, 0, "canonical  BAR=a+foo=b\nupper      BAR=A+FOO=B\n"},
        {{"normalize", ""}, 0, "canonical  \nupper      \n"},
        {{"normalize", "cn=a,foo=b", "sn=c"},
         1,
         "refused    17 undefinedAttributeType at byte 5: the schema has no such attribute type\n"
         "canonical  sn=c\nupper      SN=C\n"},
        {{"normalize", "sn=b,cn=a=b"},
         1,
         "refused    34 invalidDNSyntax at byte 9: this character has to be escaped\n"},
        {{"normalize", "cn=\xff"}, 1, "refused    34 invalidDNSyntax: a value isn't UTF-8\n"},
        {{"normalize", "cn=" + std::string(1998, 'x')}, 1, "refused    34 invalidDNSyntax: longer than 2000 bytes\n"},
        {{"check", "cn=a+sn=b,o=x", "cn=a,"}, 1, "ok\nrefused    34 invalidDNSyntax at byte 5\n"},
        {{"parent", "cn=a, O=b ,c=us", "c=us", ""}, 0, "o=b,c=us\nnone\nnone\n"},
        {{"compare", "cn=a,o=b", "commonName=A , 2.5.4.10=B"}, 0, "same\n"},
        {{"compare", "cn=a", "sn=a"}, 1, "different\n"},
        {{"compare", "cn=a", "cn"},
         1,
         "second DN  refused    34 invalidDNSyntax at byte 2: no attribute type, \"=\" or proper value here\n"},
        {{"compare", "cn=a,foo=b", "cn=\xff"},
         1,
         "first DN   refused    17 undefinedAttributeType at byte 5: the schema has no such attribute type\n"
         "second DN  refused    34 invalidDNSyntax: a value isn't UTF-8\n"},
        {{"compare", "cn=a"}, 2, ""},
    };
    for (const auto& c : cases) {
        std::vector<std::string> call = c.call;
        call.insert(call.begin(), "dn");
        const tool_run run = run_tool(call);
        EXPECT_EQ(run.status, c.status) << testing::PrintToString(call) << run.err;
        EXPECT_EQ(run.out, c.out);
    }
}

TEST(ToolDn, StandardInputHoldsADnALineAndJsonTellsAll)
{
    const tool_run run = run_tool({"dn", "normalize", "--json", "sn=first", "-"}, {.input = "cn=a\r\n\nbad\ncn=last"});
    EXPECT_EQ(run.status, 1);
    const auto shown = nlohmann::json::parse(run.out);
    EXPECT_EQ(shown["ok"], false);
    ASSERT_EQ(shown["dns"].size(), 5u);
    EXPECT_EQ(shown["dns"][0]["upper"], "SN=FIRST");
    EXPECT_EQ(shown["dns"][1]["dn"], "cn=a");
    EXPECT_EQ(shown["dns"][2]["canonical"], "");
    EXPECT_EQ(shown["dns"][3]["error"]["result"], 34);
    EXPECT_EQ(shown["dns"][3]["error"]["offset"], 3);
    EXPECT_EQ(shown["dns"][3]["error"]["name"], "invalidDNSyntax");
    EXPECT_EQ(shown["dns"][4]["dn"], "cn=last");
    const auto bytes = nlohmann::json::parse(run_tool({"dn", "check", "--json", "cn=\xff"}).out);
    EXPECT_EQ(bytes["dns"][0]["dn"]["base64"], "Y249/w==");
}

TEST(ToolDn, OkOfAComparisonIsItsExitStatus)
{
    for (const auto& [second, status] : {std::pair("CN=A", 0), {"cn=b", 1}, {"cn", 1}}) {
        const tool_run run = run_tool({"dn", "compare", "--json", "cn=a", second});
        const auto shown = nlohmann::json::parse(run.out);
        EXPECT_EQ(run.status, status);
        EXPECT_EQ(shown["ok"], status == 0) << run.out;
        EXPECT_EQ(shown["dns"].size(), 2u);
    }
}

// Answers are written as the lines come, so those ahead of a line that can't be read are there.
TEST(ToolDn, LinesThatCannotBeReadEndTheAnswers)
{
    std::string many;  // more than is read at a time, and lines across the borders
    std::string answers;
    for (int i = 0; i < 20'000; ++i) {
        many += "cn=" + std::to_string(i) + (i % 2 == 0 ? "\r\n" : "\n");
        answers += "none\n";
    }
    const std::string megabyte(std::size_t{1} << 20, 'x');
    const struct {
        std::string input;
        std::string out;
        const char* err;
    } cases[] = {
        {many, answers, ""},
        {many + std::string("cn=\0a\n", 6), answers, "standard input:20001: holds a byte 0\n"},
        {many + megabyte + "x\nc=a\n", answers, "standard input:20001: longer than 1 MiB\n"},
        {many + megabyte + megabyte, answers, "standard input:20001: longer than 1 MiB\n"},
        {megabyte + "\nc=a", "refused    34 invalidDNSyntax: longer than 2000 bytes\nnone\n", ""},
    };
    for (const auto& c : cases) {
        const std::string fault = c.err;
        const tool_run run = run_tool({"dn", "parent", "--light", "-"}, {.input = c.input});
        EXPECT_EQ(run.status, !fault.empty() ? 2 : c.out == answers ? 0 : 1);
        EXPECT_EQ(run.out.substr(0, c.out.size()), c.out);
        EXPECT_EQ(run.err, fault);
        const auto shown =
            nlohmann::json::parse(run_tool({"dn", "parent", "--light", "--json", "-"}, {.input = c.input}).out);
        EXPECT_EQ(shown["ok"], fault.empty() && c.out == answers);
        EXPECT_EQ(shown.contains("error"), !fault.empty());
        EXPECT_EQ(shown["dns"][0]["ok"], c.out.starts_with("none"));
    }
}
