// The logs while memory runs out: short lines need none, long lines are cut and still come.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstddef>
#include <new>
#include <string>

#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"
#include "tests/support/alloc_fault.h"
#include "tests/support/temp_dir.h"

using test_support::alloc_fault_pause;
using test_support::allocation_failed;
using test_support::for_each_failing_allocation;
using test_support::temp_dir;

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the logs call

namespace {

struct sinks_restorer {
    ~sinks_restorer()
    {
        set_message_sink(nullptr, nullptr);
        set_debug_sink(nullptr, nullptr);
        write_ldap_debug(0);
    }
};

TEST(MessageLogAlloc, OutOfMemoryIsReportedWithoutMemory)
{
    const sinks_restorer restore;
    const temp_dir folder;
    ASSERT_EQ(set_message_file(folder.path("log").c_str()), 0);
    message_no_memory();  // the C library reads the time zone once

    std::size_t runs = 0;
    const std::size_t points = for_each_failing_allocation([&](std::size_t) {
        message_no_memory();
        ++runs;
        ::operator delete(::operator new(1));  // the only allocation of the run
    });
    EXPECT_EQ(points, 1u);
    const std::string log = folder.read("log");
    EXPECT_EQ(static_cast<std::size_t>(std::count(log.begin(), log.end(), '\n')), runs + 1);
}

TEST(MessageLogAlloc, ALongLineIsCutAndStillWritten)
{
    const sinks_restorer restore;
    const temp_dir folder;
    ASSERT_EQ(set_message_file(folder.path("messages").c_str()), 0);
    ASSERT_EQ(set_debug_file(folder.path("debug").c_str()), 0);
    write_ldap_debug(LDAP_DEBUG_ERROR);
    const std::string text(5000, 'x');

    std::size_t lines = 0;
    const std::size_t points = for_each_failing_allocation([&](std::size_t) {
        PrintMessage(MSG_COMPONENT_SCHEMA, MSG_SEVERE, 33, text.c_str());
        debug_error("Error - %s\n", text.c_str());
        ++lines;

        const alloc_fault_pause pause;
        for (const char* name : {"messages", "debug"}) {
            const std::string log = folder.read(name);
            EXPECT_EQ(static_cast<std::size_t>(std::count(log.begin(), log.end(), '\n')), lines);
            EXPECT_EQ(log.back(), '\n');
            EXPECT_EQ(log.substr(log.size() - 500, 499), std::string(499, 'x'));
        }
        const bool whole =
            folder.read("messages").ends_with(text + "\n") && folder.read("debug").ends_with(text + "\n");
        EXPECT_EQ(whole, !allocation_failed());
    });
    EXPECT_EQ(points, 4u);  // a text and a line for each of the two logs
}

}  // namespace

#endif
