// Messages that the catalogue lacks, and the printing of places. That a fault of the schema reads in the log as it does
// in its exception is asserted wherever the tests of the schema engine raise one.
#include <gtest/gtest.h>

#include <limits>
#include <string>
#include <vector>

#include "libraries/libmsg/message_format.h"
#include "libraries/libmsg/message_log.h"

namespace {

using arguments = std::vector<message_argument>;

TEST(Catalogue, AMessageItDoesNotKnowShowsItsNumbersAndArguments)
{
    const struct {
        int component;
        int id;
        arguments with;
        const char* text;
    } table[] = {
        {5, 143, {"cn", 12, static_cast<const char*>(nullptr)}, "component 5, severity 8, id 143: 'cn' 12 ''"},
        {MSG_COMPONENT_SCHEMA, 50, {}, "component 4, severity 8, id 50"},
        {MSG_COMPONENT_SCHEMA, -25, {}, "component 4, severity 8, id -25"},
    };
    for (const auto& c : table) {
        char text[100];
        getPrintedMessageArguments(text, sizeof text, c.component, MSG_SEVERE, c.id, c.with.data(), c.with.size());
        EXPECT_STREQ(text, c.text);
    }
}

TEST(MessagePattern, PlacesPrintTheirArgumentByItsOwnTypeAndNeverReadWhatIsNotThere)
{
    const arguments with = {"%2$s", 7, reinterpret_cast<const void*>(0xbeef), std::numeric_limits<long>::min(), -1};
    const struct {
        const char* pattern;
        const char* text;
    } table[] = {
        {"%2$s then %1$s", "7 then %2$s"},  // an argument is no pattern
        {"%1$d%1$d %2$d %3$d", "%2$s%2$s 7 0xbeef"},
        {"%4$s %5$s", "-9223372036854775808 -1"},
        {"[%6$s][%99$s]", "[][]"},
        {"100%% of %2$s%%", "100% of 7%"},
        {"%%1$s", "%1$s"},
        {"%", "%"},
        {"%1", "%1"},
        {"%1$", "%1$"},
        {"%0$s", "%0$s"},
        {"%1$n %s %d", "%1$n %s %d"},
        {"%99999999999999999999$s", "%99999999999999999999$s"},
        {"", ""},
    };
    for (const auto& entry : table) {
        char text[100];
        bounded_text out(text, sizeof text);
        put_pattern(out, entry.pattern, with.data(), with.size());
        out.finish();
        EXPECT_STREQ(text, entry.text) << entry.pattern;
    }
}

}  // namespace
