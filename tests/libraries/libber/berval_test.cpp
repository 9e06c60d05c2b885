// Counted values and their copies.
#include <gtest/gtest.h>

#include <climits>
#include <string>

#include "libraries/libber/berval.h"

namespace {

TEST(Berval, ACopyHasItsOwnBytesAndAZeroBehindThem)
{
    char bytes[] = {'a', '\0', 'b', 'x'};
    for (unsigned long length = 0; length <= 3; ++length) {
        const berval value = {length, bytes};
        berval* copy = ber_bvdup(&value);
        ASSERT_NE(copy, nullptr);
        EXPECT_NE(copy->bv_val, bytes);
        EXPECT_EQ(std::string(copy->bv_val, copy->bv_len), std::string(bytes, length));
        EXPECT_EQ(copy->bv_val[length], '\0');
        ber_bvfree(copy);
    }
    const berval without_bytes = {5, nullptr};
    berval* copy = ber_bvdup(&without_bytes);
    EXPECT_EQ(copy->bv_len, 0u);
    EXPECT_STREQ(copy->bv_val, "");
    ber_bvfree(copy);

    const berval too_long = {ULONG_MAX, bytes};
    EXPECT_EQ(ber_bvdup(&too_long), nullptr);
    EXPECT_EQ(ber_bvdup(nullptr), nullptr);
    ber_bvfree(nullptr);
    ber_bvecfree(nullptr);
}

}  // namespace
