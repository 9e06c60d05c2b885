// The debug log: what passes the level, and how texts become lines.
#include <gtest/gtest.h>

#include <string>
#include <thread>
#include <vector>

#include "libraries/libmsg/debug_log.h"
#include "tests/support/log_lines.h"
#include "tests/support/message_catcher.h"
#include "tests/support/temp_dir.h"

using test_support::debug_catcher;
using test_support::lines_of;
using test_support::temp_dir;
using test_support::without_time;

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
        EXPECT_EQ(caught.has("text 1\n"), entry.passes) << entry.level << " " << entry.text_class;
        EXPECT_EQ(caught.count(), entry.passes ? 1u : 0u);
    }
}

TEST(DebugLog, HelpersEvaluateNothingWhileTheirClassIsOff)
{
    const debug_catcher caught(LDAP_DEBUG_TRACE);
    int asked = 0;
    const auto ask = [&] { return ++asked; };
    debug_error("Error - %d\n", ask());
    EXPECT_EQ(asked, 0);
    debug_trace("step %d\n", ask());
    EXPECT_EQ(asked, 1);
    EXPECT_EQ(caught.texts(), std::vector<std::string>{"step 1\n"});
}

TEST(DebugLog, TheCatcherGivesTheLevelBack)
{
    const unsigned before = read_ldap_debug();
    {
        const debug_catcher outer(0x11);
        EXPECT_EQ(read_ldap_debug(), 0x11u);
    }
    EXPECT_EQ(read_ldap_debug(), before);
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

    const std::vector<std::string> expected = {
        "DEBUG Error - with a line feed",
        "DEBUG Error - without",
        "DEBUG Error - forged\\nError - b\\x1b",
        "DEBUG " + text,
        "DEBUG ",
    };
    const std::vector<std::string> lines = lines_of(folder.read("log"));
    ASSERT_EQ(lines.size(), expected.size());
    for (std::size_t i = 0; i < lines.size(); ++i)
        EXPECT_EQ(without_time(lines[i]), expected[i]);
}

TEST(DebugLog, ThreadsLogWhileTheLevelChanges)
{
    constexpr int per_thread = 500;
    const debug_catcher caught(LDAP_DEBUG_ERROR);
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([i] {
            for (int n = 0; n < per_thread; ++n) {
                debug_error("Error - %d of %d\n", n, i);
                debug_trace("never %d\n", n);
            }
        });
    }
    for (int n = 0; n < per_thread; ++n)
        write_ldap_debug(LDAP_DEBUG_ERROR | (n % 2 == 0 ? 0x02u : 0u));
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_EQ(caught.count(), 4u * per_thread);
    for (int i = 0; i < 4; ++i)
        EXPECT_TRUE(caught.has("Error - " + std::to_string(per_thread - 1) + " of " + std::to_string(i) + "\n"));
}

}  // namespace
