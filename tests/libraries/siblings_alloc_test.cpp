// The sibling libraries while memory runs out: the logs, the tree, texts.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdlib>
#include <numeric>
#include <string>
#include <vector>

#include "libraries/libavl/avl.h"
#include "libraries/libber/ldap_env.h"
#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "tests/support/alloc_fault.h"
#include "tests/support/log_lines.h"
#include "tests/support/temp_dir.h"

using test_support::alloc_fault_pause;
using test_support::allocation_failed;
using test_support::for_each_failing_allocation;

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the libraries call

TEST(MessageLogAlloc, OutOfMemoryIsReportedWithoutMemoryAndALongLineIsCutAndStillWritten)
{
    const test_support::temp_dir folder;
    ASSERT_EQ(set_message_file(folder.path("messages").c_str()), 0);
    ASSERT_EQ(set_debug_file(folder.path("debug").c_str()), 0);
    write_ldap_debug(LDAP_DEBUG_ERROR);
    message_no_memory();  // the C library reads the time zone once
    const std::string text(5000, 'x');

    std::size_t runs = 0;
    const std::size_t points = for_each_failing_allocation([&](std::size_t) {
        message_no_memory();
        PrintMessage(MSG_COMPONENT_SCHEMA, MSG_SEVERE, 33, text.c_str());
        debug_error("Error - %s\n", text.c_str());
        ++runs;

        const alloc_fault_pause pause;
        bool whole = true;
        for (const auto& [name, lines] : {std::pair("messages", 2 * runs + 1), {"debug", runs}}) {
            const std::string log = folder.read(name);
            EXPECT_EQ(test_support::lines_of(log).size(), lines);
            EXPECT_TRUE(log.ends_with(std::string(499, 'x') + "\n"));
            whole = whole && log.ends_with(text + "\n");
        }
        EXPECT_EQ(whole, !allocation_failed());
    });
    EXPECT_EQ(points, 4u);  // a text and a line for each of the two long ones
    set_message_sink(nullptr, nullptr);
    set_debug_sink(nullptr, nullptr);
    write_ldap_debug(0);
}

TEST(AvlAlloc, AnInsertWithoutMemoryLeavesTheTreeAloneAndAWalkWithoutMemoryEndsBeforeItBegins)
{
    std::vector<int> keys(101);  // one more than the walk's first slots
    std::iota(keys.begin(), keys.end(), 0);
    const auto compare = [](const void* wanted, const void* stored, int) {
        return *static_cast<const int*>(wanted) - *static_cast<const int*>(stored);
    };
    const std::size_t points = for_each_failing_allocation([&](std::size_t point) {
        avl_node* root = nullptr;
        std::size_t at = 0;
        for (int& key : keys) {
            const bool refused = ++at == point;
            EXPECT_EQ(avl_insert(&root, &key, compare, avl_dup_error), refused ? -1 : 0);
            EXPECT_EQ(avl_find(root, &key, compare), refused ? nullptr : &key);
        }
        const int stored = point >= 1 && point <= keys.size() ? 100 : 101;
        int walked = 0;
        for (void* data = avl_getfirst(root); data != nullptr; data = avl_getnext()) {
            ++walked;
        }
        EXPECT_EQ(walked, stored == 101 && allocation_failed() ? 0 : stored);
        EXPECT_EQ(avl_free(root, nullptr), stored);
    });
    EXPECT_EQ(points, keys.size() + 2);  // the list of the walk, and its growth
}

TEST(VrnTextAlloc, AFormattedTextAndAnEnvironmentValueAreThereOrNull)
{
    const std::string long_value(500, '7');
    setenv("DIRBASE_TEST_VALUE", long_value.c_str(), 1);
    const std::size_t points = for_each_failing_allocation([&](std::size_t) {
        char* value = ldap_getenv("DIRBASE_TEST_VALUE");
        EXPECT_EQ(value == nullptr, allocation_failed());
        char* text = nullptr;
        const int length = vrn_asprintf(&text, "%s", long_value.c_str());
        EXPECT_EQ(length, text != nullptr ? 500 : -1);
        EXPECT_TRUE(text != nullptr || allocation_failed());
        EXPECT_TRUE(text == nullptr || text == long_value);
        std::free(text);
        std::free(value);
    });
    EXPECT_GE(points, 2u);
}

#endif
