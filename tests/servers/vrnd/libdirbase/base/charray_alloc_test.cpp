// Arrays of texts and lists while memory runs out: 90, one line in the debug log, and nothing has changed.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <optional>
#include <string>
#include <utility>
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
        std::vector<int*> expected;
        std::size_t at = 0;
        for (int& value : values) {
            const bool refused = ++at == point;
            EXPECT_EQ(list.add(&value), refused ? 90 : 0);
            const alloc_fault_pause pause;
            if (!refused)
                expected.push_back(&value);
            std::vector<int*> there;
            for (const auto* entry = list.getHead(); entry != nullptr; entry = entry->next)
                there.push_back(entry->value);
            EXPECT_EQ(there, expected);
        }
    });
    EXPECT_EQ(points, 3u);
}

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

using texts = std::vector<const char*>;

char** make(const texts& from)
{
    char** array = nullptr;
    for (const char* text : from)
        EXPECT_EQ(charray_add(&array, strdup(text)), 0);
    return array;
}

// The elements by address: a failed call must leave the very same texts.
std::vector<char*> elements(char** array)
{
    std::vector<char*> result;
    for (; array != nullptr && *array != nullptr; ++array)
        result.push_back(*array);
    return result;
}

// One call on an array that is filled or null; `text` and `other` are for it to take.
struct addition {
    const char* name;
    std::function<int(char*** array, char* text, char** other)> call;
    std::vector<std::string> lines;            // of each failing allocation on a filled array
    std::vector<std::string> lines_from_null;  // and on a null one
    bool takes_text;
    bool takes_other;
};

std::string line(const char* function, const char* call)
{
    return std::string("Error - ") + function + ": " + call + " failed. Out of memory\n";
}

// clang-format off
const addition additions[] = {
    {"add",
     [](char*** a, char* text, char**) { return charray_add(a, text); },
     {line("charray_add", "realloc")},
     {line("charray_add", "malloc")},
     true, false},
    {"add sorted",
     [](char*** a, char* text, char**) { return charray_add_sorted_by_len(a, text); },
     {line("charray_add_sorted_by_len", "realloc")},
     {line("charray_add_sorted_by_len", "malloc")},
     true, false},
    {"merge",
     [](char*** a, char*, char** other) { return charray_merge(a, other); },
     {line("charray_merge", "realloc")},
     {line("charray_merge", "malloc")},
     false, true},
    {"merge a copy",  // the copies' array, two copies, the array's growth
     [](char*** a, char*, char** other) { return charray_merge_copy(a, other); },
     {line("charray_merge", "malloc"), line("charray_merge", "malloc"), line("charray_merge", "malloc"),
      line("charray_merge", "realloc")},
     {line("charray_merge", "malloc"), line("charray_merge", "malloc"), line("charray_merge", "malloc"),
      line("charray_merge", "malloc")},
     false, false},
};
// clang-format on

TEST(CharrayAlloc, AnAdditionWithoutMemoryGives90AndALineAndChangesNothing)
{
    {
        const debug_catcher debug;
        debug_error("the C library reads the time zone once\n");
    }
    for (const addition& a : additions) {
        for (const bool from_null : {false, true}) {
            SCOPED_TRACE(std::string(a.name) + (from_null ? " to null" : ""));
            const std::vector<std::string>& lines = from_null ? a.lines_from_null : a.lines;
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
                EXPECT_EQ(rc, allocation_failed() ? 90 : 0);
                if (allocation_failed()) {
                    EXPECT_EQ(elements(array), before);
                    EXPECT_EQ(array == nullptr, from_null);
                    EXPECT_EQ(elements(other), others);
                    EXPECT_EQ(debug.texts(), std::vector<std::string>{lines.at(point - 1)});
                } else {
                    EXPECT_EQ(debug.count(), 0u);
                    EXPECT_EQ(elements(array).size(), before.size() + (a.takes_text ? 1 : 2));
                }
                if (allocation_failed() || !a.takes_text)
                    std::free(text);
                if (!allocation_failed() && a.takes_other)
                    std::free(other);
                else
                    charray_free(other);
                charray_free(array);
            });
            EXPECT_EQ(points, lines.size());
        }
    }
}

TEST(CharrayAlloc, ACopyAndASplitWithoutMemoryAreNullWithoutALine)
{
    char** array = make({"m", "nn"});
    const debug_catcher debug;
    EXPECT_EQ(for_each_failing_allocation([&](std::size_t) {
                  char** copy = charray_dup(array);
                  EXPECT_EQ(copy == nullptr, allocation_failed());
                  charray_free(copy);
              }),
              3u);
    EXPECT_EQ(for_each_failing_allocation([&](std::size_t) {
                  char text[] = "a b";
                  char** parts = str2charray(text, " ");
                  EXPECT_EQ(parts == nullptr, allocation_failed());
                  charray_free(parts);
              }),
              3u);
    EXPECT_EQ(debug.count(), 0u);
    charray_free(array);
}

#endif

}  // namespace
