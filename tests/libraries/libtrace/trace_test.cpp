// The trace runtime: its start value, its mask and its output. Writing it shares with the message log, whose tests have
// the threads.
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <vector>

#include "libraries/libtrace/trace.h"
#include "tests/support/log_lines.h"
#include "tests/support/temp_dir.h"

namespace {

TEST(Trace, InitTakesTheMaskFromTheEnvironment)
{
    const struct {
        const char* value;
        std::uint64_t mask;
    } table[] = {
        {"3", 3},
        {"0x10", 16},
        {"010", 8},
        {"0", 0},
        {"18446744073709551615", UINT64_MAX},
        {"18446744073709551616", LDTR_ERROR},
        {"", LDTR_ERROR},
        {"3 ", LDTR_ERROR},
        {" 3", LDTR_ERROR},
        {"-1", LDTR_ERROR},
    };
    EXPECT_EQ(trcEvents.load(), 0u);
    for (const auto& entry : table) {
        setenv("LDTR_EVENTS", entry.value, 1);
        EXPECT_EQ(ldtr_init(), entry.mask) << entry.value;
        EXPECT_EQ(trcEvents.load(), entry.mask);
    }
    unsetenv("LDTR_EVENTS");
    EXPECT_EQ(ldtr_init(), LDTR_ERROR);
    trcEvents = 0;
}

TEST(Trace, OnlyActiveClassesAreWrittenAndAFileThatCannotBeOpenedChangesNothing)
{
    const test_support::temp_dir folder;
    ASSERT_EQ(ldtr_set_file(folder.path("trace").c_str()), 0);
    trcEvents = LDTR_FLOW | LDTR_ERROR;
    ldtr_write(LDTR_FLOW, "enter %s\n", "search");
    ldtr_write(LDTR_DATA, "never\n");
    EXPECT_EQ(ldtr_set_file(folder.path("missing/trace").c_str()), ENOENT);
    ldtr_write(LDTR_DATA | LDTR_ERROR, "failed\n");
    trcEvents = 0;
    ldtr_write(LDTR_ERROR, "never\n");
    ldtr_set_file(nullptr);
    EXPECT_EQ(test_support::lines_without_time(folder.read("trace")),
              (std::vector<std::string>{"TRACE enter search", "TRACE failed"}));
}

}  // namespace
