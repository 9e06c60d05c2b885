// The tree while memory runs out.
#include <gtest/gtest.h>

#include <cstddef>
#include <vector>

#include "libraries/libavl/avl.h"
#include "tests/support/alloc_fault.h"

using test_support::alloc_fault_pause;
using test_support::allocation_failed;
using test_support::for_each_failing_allocation;

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the tree calls

namespace {

int compare(const void* wanted, const void* stored, int)
{
    return *static_cast<const int*>(wanted) - *static_cast<const int*>(stored);
}

TEST(AvlAlloc, AnInsertWithoutMemoryLeavesTheTreeAlone)
{
    std::vector<int> keys = {1, 2, 3, 4, 5, 6};
    const std::size_t points = for_each_failing_allocation([&](std::size_t point) {
        avl_node* root = nullptr;
        std::size_t at = 0;
        for (int& key : keys) {
            const bool refused = ++at == point;
            EXPECT_EQ(avl_insert(&root, &key, compare, avl_dup_error), refused ? -1 : 0);
            EXPECT_EQ(avl_find(root, &key, compare), refused ? nullptr : &key);
        }
        EXPECT_EQ(avl_free(root, nullptr), allocation_failed() ? 5 : 6);
    });
    EXPECT_EQ(points, keys.size());
}

TEST(AvlAlloc, AWalkWithoutMemoryForItsListEndsBeforeItBegins)
{
    std::vector<int> keys(101);  // one more than the list's first slots
    avl_node* root = nullptr;
    for (std::size_t i = 0; i < keys.size(); ++i) {
        keys[i] = static_cast<int>(i);
        ASSERT_EQ(avl_insert(&root, &keys[i], compare, avl_dup_error), 0);
    }
    const std::size_t points = for_each_failing_allocation([&](std::size_t) {
        std::size_t count = 0;
        for (void* data = avl_getfirst(root); data != nullptr; data = avl_getnext())
            ++count;
        EXPECT_EQ(count, allocation_failed() ? 0 : keys.size());
    });
    EXPECT_EQ(points, 2u);  // the list, and its growth
    avl_free(root, nullptr);
}

}  // namespace

#endif
