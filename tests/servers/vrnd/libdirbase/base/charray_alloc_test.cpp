// Arrays of texts and lists while memory runs out: 90, one line in the debug log, and nothing has changed.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <optional>
#include <string>
#include <vector>

#include "servers/vrnd/libdirbase/base/charray.h"
#include "servers/vrnd/libdirbase/base/list.h"
#include "tests/support/alloc_fault.h"
#include "tests/support/message_catcher.h"

using test_support::alloc_fault_pause;
using test_support::allocation_failed;
using test_support::debug_catcher;
using test_support::for_each_failing_allocation;

namespace {

TEST(ListAlloc, AnAdditionWithoutMemoryLeavesTheListAlone)
{
    int values[3] = {};
    const std::size_t points = for_each_failing_allocation([&](std::size_t point) {
        List<int*> list(1, false);
        ListEntry<int*>* last = nullptr;
        std::size_t at = 0;
        for (int& value : values) {
            const bool refused = ++at == point;
            EXPECT_EQ(list.add(&value), refused ? 90 : 0);
            EXPECT_EQ(list.tail == last, refused);
            EXPECT_EQ(last == nullptr ? list.head : last->next, refused ? nullptr : list.tail);
            last = list.tail;
        }
    });
    EXPECT_EQ(points, 3u);
}

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

char** make(const std::vector<const char*>& from)
{
    char** array = nullptr;
    for (const char* text : from) {
        EXPECT_EQ(charray_add(&array, strdup(text)), 0);
    }
    return array;
}

// The elements by address: a failed call must leave the very same texts.
std::vector<char*> elements(char** array)
{
    std::vector<char*> result;
    for (; array != nullptr && *array != nullptr; ++array) {
        result.push_back(*array);
    }
    return result;
}

TEST(CharrayAlloc, AnAdditionWithoutMemoryGives90AndALineAndChangesNothing)
{
    enum class takes { text, other, nothing };
    const struct {
        int (*call)(char*** array, char* text, char** other);
        const char* name;    // as the debug line has it
        std::size_t points;  // allocations, the array's own growth last
        takes taken;         // when the call succeeds
    } additions[] = {
        {[](char*** a, char* text, char**) { return charray_add(a, text); }, "charray_add", 1, takes::text},
        {[](char*** a, char* text, char**) { return charray_add_sorted_by_len(a, text); }, "charray_add_sorted_by_len",
         1, takes::text},
        {[](char*** a, char*, char** other) { return charray_merge(a, other); }, "charray_merge", 1, takes::other},
        {[](char*** a, char*, char** other) { return charray_merge_copy(a, other); }, "charray_merge", 4,
         takes::nothing},
    };
    tzset();  // the C library reads the time zone once
    for (const bool from_null : {false, true}) {
        for (const auto& a : additions) {
            const std::size_t points = for_each_failing_allocation([&](std::size_t point) {
                std::optional<alloc_fault_pause> setting_up(std::in_place);
                debug_catcher debug;
                char** array = from_null ? nullptr : make({"m", "nn"});
                char** other = make({"x", "yyy"});
                char* text = strdup("n");
                const std::vector<char*> before = elements(array);
                const std::vector<char*> others = elements(other);
                setting_up.reset();
                const int rc = a.call(&array, text, other);

                const alloc_fault_pause pause;
                const takes taken = rc == 0 ? a.taken : takes::nothing;
                EXPECT_EQ(rc, allocation_failed() ? 90 : 0);
                if (allocation_failed()) {
                    EXPECT_EQ(elements(array), before);
                    EXPECT_EQ(array == nullptr, from_null);
                    EXPECT_EQ(elements(other), others);
                    const char* call = point == a.points && !from_null ? "realloc" : "malloc";
                    EXPECT_EQ(debug.texts(), std::vector<std::string>{std::string("Error - ") + a.name + ": " + call +
                                                                      " failed. Out of memory\n"});
                }
                if (taken != takes::text) {
                    std::free(text);
                }
                if (taken == takes::other) {
                    std::free(other);
                } else {
                    charray_free(other);
                }
                charray_free(array);
            });
            EXPECT_EQ(points, a.points) << a.name;
        }
    }
}

TEST(CharrayAlloc, ACopyAndASplitWithoutMemoryAreNullWithoutALine)
{
    char** array = make({"m", "nn"});
    const debug_catcher debug;
    const std::size_t points = for_each_failing_allocation([&](std::size_t) {
        char text[] = "a b";
        char** copy = charray_dup(array);
        char** parts = str2charray(text, " ");
        EXPECT_EQ(copy == nullptr || parts == nullptr, allocation_failed());
        charray_free(copy);
        charray_free(parts);
    });
    EXPECT_EQ(points, 6u);
    EXPECT_EQ(debug.count(), 0u);
    charray_free(array);
}

#endif

}  // namespace
