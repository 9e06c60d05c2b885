// dirbase value: what values are held as, by the OID of a syntax or by an attribute type.
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

#include "tests/tools/dirbase/run_tool.h"

using tool_test::run_tool;
using tool_test::tool_run;

TEST(ToolValue, EachValueHasItsAnswer)
{
    const std::string arc = "1.3.6.1.4.1.1466.115.121.1.";
    const struct {
        std::vector<std::string> call;
        int status;
        const char* out;
    } cases[] = {
        {{"commonName", "M\u00FCller  x", ""}, 0, "M\u00DCLLER  X\n\n"},
        {{"member", "CN=a , O=b", "foo=x"},
         1,
         "CN=A,O=B\nrefused    17 undefinedAttributeType at byte 0: the schema has no such attribute type\n"},
        {{arc + "24", "20240101003000+0100", "2024"},
         1,
         "2023-12-31T23:30:00.000000000Z\n"
         "refused    21 invalidAttributeSyntax: the value is no time of the form "
         "YYYYMMDDHHMMSS[.F](Z|+HHMM|-HHMM)\n"},
        {{arc + "27", "007", "-5"}, 0, "7\n-5\n"},
        {{arc + "7", "true"}, 0, "TRUE\n"},
        {{arc + "6", "'01'B", "'2'B"},
         1,
         "01\nrefused    21 invalidAttributeSyntax: the value is no bit string of the form '0101'B\n"},
        {{arc + "40", "as it is"}, 0, "as it is\n"},
        {{"nonesuch", "x"}, 2, ""},
    };
    for (const auto& c : cases) {
        std::vector<std::string> call = {"value", "normalize", "--"};
        call.insert(call.end(), c.call.begin(), c.call.end());
        const tool_run run = run_tool(call);
        EXPECT_EQ(run.status, c.status) << testing::PrintToString(call) << run.err;
        EXPECT_EQ(run.out, c.out);
    }
    const auto shown = nlohmann::json::parse(run_tool({"value", "normalize", "--json", "cn", "a"}).out);
    EXPECT_EQ(shown["values"][0]["normal"], "A");
    const auto refused = nlohmann::json::parse(run_tool({"value", "normalize", "--json", "member", "cn=\xff"}).out);
    EXPECT_EQ(refused["values"][0],
              nlohmann::json::parse(R"({"value": {"base64": "Y249/w=="}, "ok": false, "result": 34,
                                        "name": "invalidDNSyntax", "reason": "a value isn't UTF-8"})"));
}
