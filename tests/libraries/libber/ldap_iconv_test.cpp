// Conversions of the client library: what is told of one that isn't there, and where a failed one stops.
#include <gtest/gtest.h>

#include <cerrno>
#include <clocale>
#include <cstddef>
#include <string>

#include "libraries/libber/ldap_iconv.h"

namespace {

TEST(LdapIconv, AConversionThatIsNotKnownHasADescriptorThatTellsSo)
{
    const char* const pairs[][2] = {{"UTF-8", "NO-SUCH-PAGE"}, {"UTF-8", nullptr}, {nullptr, "UTF-8"}};
    for (const auto& [to, from] : pairs) {
        errno = 0;
        ldap_iconv_t* conversion = ldap_iconv_open(to, from);
        EXPECT_EQ(errno, EINVAL);
        ASSERT_NE(conversion, nullptr);
        EXPECT_EQ(conversion->descriptor, reinterpret_cast<iconv_t>(-1));
        EXPECT_EQ(ldap_iconv(conversion, nullptr, nullptr, nullptr, nullptr), -1);
        EXPECT_EQ(errno, EBADF);
        EXPECT_EQ(ldap_iconv_close(conversion), 0);
    }
    EXPECT_EQ(ldap_iconv(nullptr, nullptr, nullptr, nullptr, nullptr), -1);
    EXPECT_EQ(ldap_iconv_close(nullptr), 0);
}

TEST(LdapIconv, AFailureLeavesThePositionsAtThePlace)
{
    const struct {
        const char* input;
        int error;
        std::size_t in_left;
        const char* output;
    } table[] = {
        {"a\xFFz", EILSEQ, 2, "a"},      // no UTF-8
        {"ab\u20ACz", EILSEQ, 4, "ab"},  // not in the target
        {"abc\xC3", EINVAL, 1, "abc"},   // cut
        {"abcd", E2BIG, 1, "abc"},       // no room
    };
    for (const auto& row : table) {
        ldap_iconv_t* conversion = ldap_iconv_open("ISO-8859-1", "UTF-8");
        std::string input = row.input;
        std::string output(3, '\0');
        char* in = input.data();
        char* out = output.data();
        std::size_t in_left = input.size();
        std::size_t out_left = output.size();
        EXPECT_EQ(ldap_iconv(conversion, &in, &in_left, &out, &out_left), -1) << row.input;
        EXPECT_EQ(errno, row.error) << row.input;
        EXPECT_EQ(in_left, row.in_left) << row.input;
        EXPECT_EQ(output.substr(0, 3 - out_left), row.output) << row.input;
        EXPECT_EQ(ldap_iconv_close(conversion), 0);
    }
}

TEST(LdapNlLanginfo, TellsTheCharacterSetOfTheLocaleAndNothingElse)
{
    EXPECT_STREQ(ldap_nl_langinfo(0x3D), "ANSI_X3.4-1968");  // the locale at start
    ASSERT_NE(std::setlocale(LC_CTYPE, "C.UTF-8"), nullptr);
    EXPECT_STREQ(ldap_nl_langinfo(0x3D), "UTF-8");
    std::setlocale(LC_CTYPE, "C");
    EXPECT_EQ(ldap_nl_langinfo(0x3C), nullptr);
    EXPECT_EQ(ldap_nl_langinfo(0), nullptr);
}

}  // namespace
