// Words of the configuration, and the decision that is made once for a process.
#include <gtest/gtest.h>

#include <cstdlib>

#include "servers/vrnd/libdirbase/identity/password_encoding.h"

namespace {

TEST(PasswordEncoding, WordsInAnyCaseGiveMethods)
{
    const struct {
        const char* word;
        int method;
    } table[] = {{"AES256", 133}, {"aes192", 134}, {"Aes128", 135}, {"CRYPT", 4}, {"md5", 3},     {"sha", 2},
                 {"SSHA", 9},     {"None", 1},     {"aes", 133},    {"", 133},    {nullptr, 133}, {"sha ", 133}};
    for (const auto& [word, method] : table) {
        int out = -1;
        EXPECT_EQ(convertPWEncryptionMethod(word, &out), 0);
        EXPECT_EQ(out, method) << (word == nullptr ? "null" : word);
    }
}

TEST(PasswordEncodingDeathTest, TheFirstLookAtTheEnvironmentDecides)
{
    const struct {
        const char* value;
        int form;
    } table[] = {{nullptr, 0}, {"yes", 1}, {"YES", 1}, {"", 2}, {"no", 2}};
    for (const auto& [value, form] : table) {
        EXPECT_EXIT(
            {
                if (value == nullptr)
                    unsetenv("USE_OPENLDAP_PWDPOLICY_CONTROL");
                else
                    setenv("USE_OPENLDAP_PWDPOLICY_CONTROL", value, 1);
                const int first = using_openldap_pwdpolicy_response();
                setenv("USE_OPENLDAP_PWDPOLICY_CONTROL", first == 1 ? "NO" : "YES", 1);
                std::_Exit(10 + first + 10 * (using_openldap_pwdpolicy_response() != first));
            },
            testing::ExitedWithCode(10 + form), "");
    }
}

}  // namespace
