// The trace runtime: its start value, its mask and its output.
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <thread>
#include <vector>

#include "libraries/libtrace/trace.h"
#include "tests/support/log_lines.h"
#include "tests/support/temp_dir.h"

using test_support::lines_of;
using test_support::temp_dir;
using test_support::without_time;

namespace {

// Traces into a file of its own and turns the trace off again.
class traced_file {
public:
    explicit traced_file(std::uint64_t events)
    {
        EXPECT_EQ(ldtr_set_file(folder_.path("trace").c_str()), 0);
        trcEvents = events;
    }
    ~traced_file()
    {
        trcEvents = 0;
        ldtr_set_file(nullptr);
    }

    // The lines without their times.
    std::vector<std::string> lines() const
    {
        std::vector<std::string> lines = lines_of(folder_.read("trace"));
        for (std::string& line : lines)
            line = without_time(line);
        return lines;
    }

    const temp_dir& folder() const { return folder_; }

private:
    temp_dir folder_;
};

TEST(Trace, InitTakesTheMaskFromTheEnvironment)
{
    const struct {
        const char* value;
        std::uint64_t mask;
    } table[] = {
        {nullptr, LDTR_ERROR},
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
        {"all", LDTR_ERROR},
    };
    EXPECT_EQ(trcEvents.load(), 0u);
    for (const auto& entry : table) {
        if (entry.value == nullptr)
            unsetenv("LDTR_EVENTS");
        else
            setenv("LDTR_EVENTS", entry.value, 1);
        EXPECT_EQ(ldtr_init(), entry.mask) << (entry.value == nullptr ? "unset" : entry.value);
        EXPECT_EQ(trcEvents.load(), entry.mask);
    }
    unsetenv("LDTR_EVENTS");
    trcEvents = 0;
}

TEST(Trace, OnlyActiveClassesAreWritten)
{
    const traced_file trace(LDTR_FLOW | LDTR_ERROR);
    ldtr_write(LDTR_FLOW, "enter %s\n", "search");
    ldtr_write(LDTR_DATA, "never\n");
    ldtr_write(LDTR_DATA | LDTR_ERROR, "failed\n");
    trcEvents = 0;
    ldtr_write(LDTR_ERROR, "never\n");
    EXPECT_EQ(trace.lines(), (std::vector<std::string>{"TRACE enter search", "TRACE failed"}));
}

TEST(Trace, AFileThatCannotBeOpenedChangesNothing)
{
    const traced_file trace(LDTR_ERROR);
    EXPECT_EQ(ldtr_set_file(trace.folder().path("missing/trace").c_str()), ENOENT);
    ldtr_write(LDTR_ERROR, "here\n");
    EXPECT_EQ(trace.lines(), std::vector<std::string>{"TRACE here"});
}

TEST(Trace, CallsOfThreadsDoNotMix)
{
    const traced_file trace(LDTR_DATA);
    std::vector<std::thread> threads;
    for (char letter : {'a', 'b', 'c'}) {
        threads.emplace_back([letter] {
            for (int i = 0; i < 200; ++i)
                ldtr_write(LDTR_DATA, "%s\n", std::string(2000, letter).c_str());
        });
    }
    for (std::thread& thread : threads)
        thread.join();

    std::size_t whole = 0;
    for (const std::string& line : trace.lines())
        whole += line == "TRACE " + std::string(2000, line.back());
    EXPECT_EQ(whole, 600u);
}

}  // namespace
