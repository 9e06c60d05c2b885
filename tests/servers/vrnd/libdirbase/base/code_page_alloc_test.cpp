// Translations, and the opening of them, while memory runs out.
#include <gtest/gtest.h>

#include <cerrno>
#include <cstddef>
#include <cstdlib>
#include <ctime>
#include <memory>

#include "libraries/libber/ldap_iconv.h"
#include "servers/vrnd/libdirbase/base/code_page.h"
#include "tests/support/alloc_fault.h"
#include "tests/support/message_catcher.h"

using test_support::alloc_fault_pause;
using test_support::allocation_failed;
using test_support::for_each_failing_allocation;
using test_support::message_catcher;

namespace {

// Catches messages for one run, without allocations of its own that could fail.
class quiet_messages {
public:
    quiet_messages()
    {
        const alloc_fault_pause pause;
        tzset();  // the log's first line would fill what the C library keeps of the time zone
        messages_ = std::make_unique<message_catcher>();
    }
    const message_catcher* operator->() const { return messages_.get(); }

private:
    std::unique_ptr<message_catcher> messages_;
};

void close_both()
{
    free_iconv_handle();
    ldap_iconv_close(iconv_handle_to_local);
    iconv_handle_to_local = nullptr;
}

TEST(CodePageAlloc, ConversionsAreBothOpenedOrNoneIs)
{
    const std::size_t points = for_each_failing_allocation([](std::size_t) {
        const quiet_messages messages;
        const int result = initIconvHandle();
        EXPECT_TRUE(result == 0 || allocation_failed());
        EXPECT_EQ(local_codepage != nullptr, result == 0);
        EXPECT_EQ(iconv_handle_to_utf8 != nullptr, result == 0);
        EXPECT_EQ(iconv_handle_to_local != nullptr, result == 0);
        close_both();
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
    struct translation {
        int (*function)(const char*, char**, std::size_t*);
        const char* input;
        const char* expected;
    };
    const translation table[] = {
        {xlate_localcp_to_utf8, "\xE9t\xE9", "\u00E9t\u00E9"},
        {xlate_utf8_to_localcp, "\u00E9t\u00E9", "\xE9t\xE9"},
    };
    for (const translation& row : table) {
        const std::size_t points = for_each_failing_allocation([&](std::size_t) {
            const quiet_messages messages;
            char* text = nullptr;
            std::size_t length = 99;
            const int result = row.function(row.input, &text, &length);
            EXPECT_EQ(result, allocation_failed() ? 90 : 0);
            EXPECT_EQ(messages->count(0, 7), allocation_failed() ? 1u : 0u);
            EXPECT_EQ(text == nullptr, result != 0);
            if (text != nullptr) {
                EXPECT_STREQ(text, row.expected);
            } else {
                EXPECT_EQ(length, 0u);
            }
            std::free(text);
        });
        EXPECT_GE(points, 1u);
    }
    close_both();
}

#endif

}  // namespace
