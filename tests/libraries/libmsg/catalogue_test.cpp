// Messages that the catalogue lacks, and the printing of places. That a fault of the schema reads in the log as it does
// in its exception is asserted wherever the tests of the schema engine raise one.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstring>
#include <limits>
#include <string>
#include <string_view>
#include <vector>

#include "libraries/libmsg/message_format.h"
#include "libraries/libmsg/message_log.h"

namespace {

std::string rendered(int component, int id, const std::vector<message_argument>& arguments)
{
    char buffer[2000];
    getPrintedMessageArguments(buffer, sizeof buffer, component, MSG_SEVERE, id, arguments.data(), arguments.size());
    return buffer;
}

TEST(Catalogue, AMessageItDoesNotKnowShowsItsNumbersAndArguments)
{
    EXPECT_EQ(rendered(5, 143, {"cn", 12, static_cast<const char*>(nullptr)}),
              "component 5, severity 8, id 143: 'cn' 12 ''");
    EXPECT_EQ(rendered(MSG_COMPONENT_SCHEMA, 50, {}), "component 4, severity 8, id 50");
    EXPECT_EQ(rendered(MSG_COMPONENT_SCHEMA, -25, {}), "component 4, severity 8, id -25");
}

std::string patterned(std::string_view pattern, const std::vector<message_argument>& arguments)
{
    char buffer[200];
    bounded_text out(buffer, sizeof buffer);
    put_pattern(out, pattern, arguments.data(), arguments.size());
    out.finish();
    return buffer;
}

TEST(MessagePattern, PlacesPrintTheirArgumentByItsOwnTypeAndNeverReadWhatIsNotThere)
{
    const std::vector<message_argument> arguments = {"A", 7, reinterpret_cast<const void*>(0xbeef),
                                                     std::numeric_limits<long>::min(), -1};
    const struct {
        const char* pattern;
        const char* text;
    } table[] = {
        {"%2$s then %1$s", "7 then A"},
        {"%1$d %2$d %3$d", "A 7 0xbeef"},
        {"%4$s %5$s", "-9223372036854775808 -1"},
        {"%1$s%1$s%1$s", "AAA"},
        {"[%6$s][%99$s]", "[][]"},
        {"100%% of %1$s%%", "100% of A%"},
        {"%%1$s", "%1$s"},
        {"%", "%"},
        {"%1", "%1"},
        {"%1$", "%1$"},
        {"%0$s", "%0$s"},
        {"%1$n %s %d", "%1$n %s %d"},
        {"%99999999999999999999$s", "%99999999999999999999$s"},
        {"", ""},
    };
    for (const auto& entry : table)
        EXPECT_EQ(patterned(entry.pattern, arguments), entry.text) << entry.pattern;
    EXPECT_EQ(patterned("%1$s", {"%2$s %n"}), "%2$s %n") << "an argument is no pattern";
}

}  // namespace
