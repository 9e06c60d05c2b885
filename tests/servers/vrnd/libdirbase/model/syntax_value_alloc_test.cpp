// Typed values while memory runs out: 90, no value, and one line in the debug log.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the library calls

#include <gtest/gtest.h>

#include <cstddef>
#include <cstdlib>
#include <string>
#include <tuple>

#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/syntax_value.h"
#include "tests/support/alloc_fault.h"
#include "tests/support/message_catcher.h"

using test_support::allocation_failed;

namespace {

TEST(SyntaxValueAlloc, AValueWithoutMemoryIsNullWithALine)
{
    for (const auto& [syntax, text, function] :
         {std::tuple(SC_INT, "1", "str2int"), std::tuple(SC_BOOL, "TRUE", "str2bool"),
          std::tuple(SC_GT, "20240101000000Z", "str2timestamp")}) {
        const std::string line = std::string("Error - ") + function + ": malloc failed. Out of memory\n";
        test_support::debug_catcher debug;
        debug_error("the C library reads the time zone once, and the catcher takes its room\n");
        const std::size_t points = test_support::for_each_failing_allocation([&](std::size_t) {
            int result = -7;
            void* value = str2syntaxvalue(text, syntax, &result);
            EXPECT_EQ(value == nullptr, allocation_failed());
            EXPECT_EQ(result, allocation_failed() ? 90 : 0);
            std::free(value);
            const test_support::alloc_fault_pause pause;
            EXPECT_EQ(debug.has(line), allocation_failed());
            debug.clear();
        });
        EXPECT_EQ(points, 1u);
    }
}

}  // namespace

#endif
