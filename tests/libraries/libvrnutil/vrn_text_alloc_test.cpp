// Texts that the sibling libraries make, while memory runs out.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdlib>
#include <cstring>

#include "libraries/libber/ldap_env.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "tests/support/alloc_fault.h"

using test_support::allocation_failed;
using test_support::for_each_failing_allocation;

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that the libraries call

namespace {

TEST(VrnTextAlloc, AFormattedTextIsThereOrNull)
{
    const std::size_t points = for_each_failing_allocation([](std::size_t) {
        char* text = nullptr;
        const int length = vrn_asprintf(&text, "%0500d", 7);
        EXPECT_TRUE(length == 500 || (allocation_failed() && length == -1)) << length;
        EXPECT_EQ(text == nullptr, length == -1);
        if (text != nullptr) {
            EXPECT_EQ(std::strlen(text), 500u);
        }
        std::free(text);
    });
    EXPECT_GE(points, 1u);
}

TEST(LdapGetenvAlloc, ACopyIsThereOrNull)
{
    setenv("DIRBASE_TEST_VALUE", "YES", 1);
    const std::size_t points = for_each_failing_allocation([](std::size_t) {
        char* value = ldap_getenv("DIRBASE_TEST_VALUE");
        EXPECT_EQ(value == nullptr, allocation_failed());
        std::free(value);
    });
    EXPECT_EQ(points, 1u);
}

}  // namespace

#endif
