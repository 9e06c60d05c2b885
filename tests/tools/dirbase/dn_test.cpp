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
         "refused    34 invalidDNSyntax at byte 2: no attribute type, \"=\" or proper value here\n"},
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
    const tool_run run = run_tool({"dn", "normalize", "--json", "sn=first", "-"}, {.input = "cn=a\n\nbad\ncn=last"});
    EXPECT_EQ(run.status, 1);
    const auto shown = nlohmann::json::parse(run.out);
    EXPECT_EQ(shown["ok"], false);
    ASSERT_EQ(shown["dns"].size(), 5u);
    EXPECT_EQ(shown["dns"][0]["upper"], "SN=FIRST");
    EXPECT_EQ(shown["dns"][2]["canonical"], "");
    EXPECT_EQ(shown["dns"][3]["error"]["result"], 34);
    EXPECT_EQ(shown["dns"][3]["error"]["offset"], 3);
    EXPECT_EQ(shown["dns"][4]["dn"], "cn=last");
}
