// Translations, and the opening of them, while memory runs out.
#include <gtest/gtest.h>

#include <cerrno>
#include <cstddef>
#include <cstdlib>
#include <ctime>

#include "libraries/libber/ldap_iconv.h"
#include "servers/vrnd/libdirbase/base/code_page.h"
#include "tests/support/alloc_fault.h"
#include "tests/support/message_catcher.h"

using test_support::allocation_failed;
using test_support::for_each_failing_allocation;
using test_support::message_catcher;

namespace {

void close_both()
{
    free_iconv_handle();
    ldap_iconv_close(iconv_handle_to_local);
    iconv_handle_to_local = nullptr;
}

TEST(CodePageAlloc, ConversionsAreBothOpenedOrNoneIs)
{
    tzset();  // the log's first line would fill what the C library keeps of the time zone
    message_catcher messages;
    const std::size_t points = for_each_failing_allocation([&](std::size_t) {
        const int result = initIconvHandle();
        EXPECT_TRUE(result == 0 || allocation_failed());
        EXPECT_EQ(local_codepage != nullptr, result == 0);
        EXPECT_EQ(iconv_handle_to_utf8 != nullptr, result == 0);
        EXPECT_EQ(iconv_handle_to_local != nullptr, result == 0);
        close_both();
        messages.clear();
    });
    EXPECT_GE(points, 2u);
}

TEST(LdapIconvAlloc, AConversionWithoutARecordIsNull)
{
    for_each_failing_allocation([](std::size_t point) {
        errno = 0;
        ldap_iconv_t* conversion = ldap_iconv_open("UTF-8", "UTF-8");
        EXPECT_EQ(conversion == nullptr, point == 1);  // the record is the first
        EXPECT_TRUE(conversion != nullptr || errno == ENOMEM);
        ldap_iconv_close(conversion);
    });
}

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)  // theirs is the malloc that makes the text

TEST(CodePageAlloc, ATextIsThereOrNoMemoryIsReported)
{
    iconv_handle_to_utf8 = ldap_iconv_open("UTF-8", "ISO-8859-1");
    iconv_handle_to_local = ldap_iconv_open("ISO-8859-1", "UTF-8");
    tzset();
    for (const auto function : {xlate_localcp_to_utf8, xlate_utf8_to_localcp}) {
        message_catcher messages;
        const std::size_t points = for_each_failing_allocation([&](std::size_t) {
            char* text = nullptr;
            std::size_t length = 99;
            const int result = function("text", &text, &length);
            EXPECT_EQ(result, allocation_failed() ? 90 : 0);
            EXPECT_EQ(messages.count(0, 7), allocation_failed() ? 1u : 0u);
            messages.clear();
            EXPECT_EQ(text == nullptr, allocation_failed());
            EXPECT_EQ(length, allocation_failed() ? 0u : 5u);
            std::free(text);
        });
        EXPECT_GE(points, 1u);
    }
    close_both();
}

#endif

}  // namespace
