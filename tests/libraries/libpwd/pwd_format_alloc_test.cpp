// Passwords and counted values while memory runs out: a failure that says so, never a wrong answer.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdlib>
#include <cstring>

#include "libraries/libpwd/pwd_format.h"
#include "servers/vrnd/libdirbase/base/password_values.h"
#include "tests/support/alloc_fault.h"

using test_support::allocation_failed;
using test_support::for_each_failing_allocation;

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the libraries call

namespace {

const aes_key_data key = {32, {1, 2, 3}, {4, 5, 6}};

TEST(PasswordAlloc, AStoredFormIsMadeTakenBackAndComparedOrNothingIs)
{
    for (const int method : {PWD_SHA, PWD_CRYPT, PWD_SSHA, PWD_AES256}) {
        char kept[200];
        const unsigned long kept_length = format_password(method, nullptr, &key, "secret", 6, kept, sizeof kept);
        ASSERT_NE(kept_length, 0u);
        const berval stored = {kept_length, kept};
        const berval right = {6, const_cast<char*>("secret")};
        const std::size_t points = for_each_failing_allocation([&](std::size_t) {
            char buffer[200];
            const unsigned long length = format_password(method, nullptr, &key, "secret", 6, buffer, sizeof buffer);
            EXPECT_TRUE(length == kept_length || (allocation_failed() && length == 0));

            const int result = verify_password(&right, &stored, 1, &key);
            EXPECT_TRUE(result == 0 || (allocation_failed() && result == 1));

            char* clear = nullptr;
            unsigned long clear_length = 0;
            if (unformat_password(kept, kept_length, &key, &clear, &clear_length) != 0) {
                EXPECT_EQ(method, PWD_AES256);
                EXPECT_EQ(std::memcmp(clear, "secret", 7), 0);
            }
            std::free(clear);
        });
        EXPECT_GE(points, 3u) << method;
    }
}

TEST(PasswordAlloc, WhatCanNotBeEncodedOrCheckedStaysAndIsNotPraised)
{
    const std::size_t points = for_each_failing_allocation([](std::size_t point) {
        berval value = {6, strdup("secret")};
        berval* values[] = {&value, nullptr};
        if (value.bv_val == nullptr)
            return;
        EXPECT_EQ(value_encode_values(PWD_SSHA, values, 1, nullptr), point == 2 ? 90 : 0);
        const int method = check_format(value.bv_val, value.bv_len);
        EXPECT_TRUE(method == PWD_SSHA || (allocation_failed() && std::strcmp(value.bv_val, "secret") == 0));
        std::free(value.bv_val);

        const bool failed_before = allocation_failed();
        int state = -1;
        const int rc = verify_pwd_syntax("secret", "old", 1, 6, 6, 0, 1, 2, &state);
        EXPECT_EQ(rc, allocation_failed() && !failed_before ? 90 : 0);
        EXPECT_EQ(state, 0);
    });
    EXPECT_GE(points, 4u);
}

}  // namespace

#endif
