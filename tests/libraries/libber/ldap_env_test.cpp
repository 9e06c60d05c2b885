// Environment look-up: what it finds, and whose the answer is.
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdlib>
#include <memory>

#include "libraries/libber/ldap_env.h"

namespace {

struct free_text {
    void operator()(char* text) const { std::free(text); }
};
using heap_text = std::unique_ptr<char, free_text>;

TEST(LdapGetenv, TellsUnsetFromEmptyAndGivesACopy)
{
    setenv("DIRBASE_TEST_VALUE", "YES", 1);
    setenv("DIRBASE_TEST_EMPTY", "", 1);
    unsetenv("DIRBASE_TEST_UNSET");

    const heap_text value(ldap_getenv("DIRBASE_TEST_VALUE"));
    const heap_text empty(ldap_getenv("DIRBASE_TEST_EMPTY"));
    setenv("DIRBASE_TEST_VALUE", "no", 1);
    EXPECT_STREQ(value.get(), "YES");
    EXPECT_STREQ(empty.get(), "");
    errno = ENOMEM + 1;
    EXPECT_EQ(ldap_getenv("DIRBASE_TEST_UNSET"), nullptr);
    EXPECT_EQ(ldap_getenv("DIRBASE_TEST_VALUE=YES"), nullptr);
    EXPECT_EQ(ldap_getenv(nullptr), nullptr);
    EXPECT_EQ(errno, ENOMEM + 1);
}

}  // namespace
