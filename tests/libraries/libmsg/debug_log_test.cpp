// The debug log: what passes the level, and how texts become lines.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "libraries/libmsg/debug_log.h"
#include "tests/support/log_lines.h"
#include "tests/support/message_catcher.h"
#include "tests/support/temp_dir.h"

using test_support::debug_catcher;
using test_support::temp_dir;
using texts = std::vector<std::string>;

namespace {

TEST(DebugLog, ATextPassesWhenItsClassMeetsTheLevel)
{
    const struct {
        unsigned level;
        unsigned text_class;
        bool passes;
    } table[] = {
        {0, LDAP_DEBUG_ERROR, false},
        {LDAP_DEBUG_TRACE, LDAP_DEBUG_TRACE, true},
        {LDAP_DEBUG_TRACE, LDAP_DEBUG_ERROR, false},
        {LDAP_DEBUG_TRACE | LDAP_DEBUG_ERROR, LDAP_DEBUG_ERROR, true},
        {0x00010000, LDAP_DEBUG_ERROR, true},  // one bit in common is enough
        {0xFFFFFFFF, 0, false},
    };
    for (const auto& entry : table) {
        const debug_catcher caught(entry.level);
        PrintDebug(entry.text_class, "text %d\n", 1);
        EXPECT_EQ(caught.texts(), entry.passes ? texts{"text 1\n"} : texts()) << entry.level << entry.text_class;
    }
    EXPECT_EQ(read_ldap_debug(), 0u) << "the catcher gives the level back";
}

TEST(DebugLog, HelpersEvaluateNothingWhileTheirClassIsOff)
{
    const debug_catcher caught(LDAP_DEBUG_TRACE);
    int asked = 0;
    debug_error("Error - %d\n", ++asked);
    debug_trace("step %d\n", ++asked);
    EXPECT_EQ(caught.texts(), texts{"step 1\n"});
}

TEST(DebugLog, AFileHoldsOneLineForEachText)
{
    const temp_dir folder;
    write_ldap_debug(LDAP_DEBUG_ERROR);
    ASSERT_EQ(set_debug_file(folder.path("log").c_str()), 0);
    const std::string text(5000, 'x');
    debug_error("Error - with a line feed\n");
    debug_error("Error - without");
    debug_error("Error - %s\n", "forged\nError - b\x1b");
    debug_error("%s\n", text.c_str());
    debug_error("\n");
    set_debug_sink(nullptr, nullptr);
    write_ldap_debug(0);
    const texts expected = {"DEBUG Error - with a line feed", "DEBUG Error - without",
                            "DEBUG Error - forged\\nError - b\\x1b", "DEBUG " + text, "DEBUG "};
    EXPECT_EQ(test_support::lines_without_time(folder.read("log")), expected);
}

}  // namespace
