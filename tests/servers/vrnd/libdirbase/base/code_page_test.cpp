// Translations. The client library's functions are met on their way from the library, so that the local code page can
// be any, and every conversion opened is counted until it is closed.
#include <gtest/gtest.h>

#include <atomic>
#include <cstddef>
#include <cstdio>
#include <memory>
#include <optional>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include <dlfcn.h>

#include "libraries/libber/ldap_iconv.h"
#include "servers/vrnd/libdirbase/base/code_page.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "tests/support/message_catcher.h"
#include "tests/support/temp_dir.h"

using test_support::debug_catcher;
using test_support::message_catcher;
using test_support::temp_dir;
using texts = std::vector<std::string>;

namespace {

bool replace_codepage = false;
const char* platform_codepage = nullptr;  // what the platform tells while replace_codepage is on
std::atomic<int> open_conversions = 0;

template <typename Function>
Function* real(const char* name)
{
    return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, name));
}

}  // namespace

extern "C" {

const char* ldap_nl_langinfo(int item)
{
    static const auto next = real<decltype(ldap_nl_langinfo)>("ldap_nl_langinfo");
    if (replace_codepage && item == 0x3D) {
        return platform_codepage;
    }
    return next(item);
}

ldap_iconv_t* ldap_iconv_open(const char* to, const char* from)
{
    static const auto next = real<decltype(ldap_iconv_open)>("ldap_iconv_open");
    ++open_conversions;
    return next(to, from);
}

int ldap_iconv_close(ldap_iconv_t* conversion)
{
    static const auto next = real<decltype(ldap_iconv_close)>("ldap_iconv_close");
    open_conversions -= conversion != nullptr;
    return next(conversion);
}

}  // extern "C"

namespace {

using outcome = std::pair<int, std::optional<std::string>>;  // the result and the text, terminator included

outcome translate(int (*function)(const char*, char**, std::size_t*), const std::string& input)
{
    char* output = const_cast<char*>("not yet");
    std::size_t length = 99;
    const int result = function(input.c_str(), &output, &length);
    const heap_text owner(output);
    return {result, output == nullptr ? std::nullopt : std::optional(std::string(output, length))};
}

std::string with_end(const char* text)
{
    return std::string(text, std::char_traits<char>::length(text) + 1);
}

class CodePage : public testing::Test {
protected:
    CodePage() { platform_says("ISO-8859-1"); }

    ~CodePage() override
    {
        forget();
        replace_codepage = false;
        cfg_xlate = 0;
    }

    static void platform_says(const char* codepage)
    {
        replace_codepage = true;
        platform_codepage = codepage;
    }

    static void forget()
    {
        free_iconv_handle();
        ldap_iconv_close(iconv_handle_to_local);
        iconv_handle_to_local = nullptr;
        EXPECT_EQ(open_conversions, 0);
    }
};

constexpr char japanese[] = "a\u65E5\u672Cb\u8A9Ec";
constexpr char japanese_iso[] = "a\x1B$BF|K\\\x1B(Bb\x1B$B8l\x1B(Bc";

TEST_F(CodePage, TextsTranslateBothWays)
{
    const char* const table[][3] = {
        {"ISO-8859-1", "", ""},
        {"ISO-8859-1", "\u00C9lan \u00FF", "\xC9lan \xFF"},
        {"KOI8-R", "\u041C\u043E\u0441\u043A\u0432\u0430", "\xED\xCF\xD3\xCB\xD7\xC1"},
        {"ISO-8859-15", "\u20AC", "\xA4"},        // one byte becomes three
        {"ISO-2022-JP", japanese, japanese_iso},  // has a state
        {"UTF-8", "\u00E9\u20AC\U0001F600", "\u00E9\u20AC\U0001F600"},
    };
    for (const auto& [codepage, utf8, local] : table) {
        platform_says(codepage);
        ASSERT_EQ(initIconvHandle(), 0) << codepage;
        EXPECT_STREQ(local_codepage, codepage);
        EXPECT_EQ(open_conversions, 2);
        EXPECT_EQ(translate(xlate_utf8_to_localcp, utf8), outcome(0, with_end(local))) << utf8;
        EXPECT_EQ(translate(xlate_localcp_to_utf8, local), outcome(0, with_end(utf8))) << utf8;
        forget();
    }
}

TEST_F(CodePage, WhatCantBeTranslatedIsReportedAndLeavesNoText)
{
    const std::string to_utf8_failed = "Error - xlate_localcp_to_utf8(): ldap_iconv() rc=-1\n";
    const std::string to_local_failed = "Error - xlate_utf8_to_localcp_imp: ldap_iconv() failed rc=-1\n";
    const struct {
        const char* codepage;
        int (*function)(const char*, char**, std::size_t*);
        const char* input;
    } table[] = {
        {"ISO-8859-1", xlate_utf8_to_localcp, "the euro \u20AC isn't there"},
        {"ISO-8859-1", xlate_utf8_to_localcp, "cut \xC3"},
        {"UTF-8", xlate_localcp_to_utf8, "not UTF-8 \xFF"},
        {"ISO-2022-JP", xlate_localcp_to_utf8, "\x1B$BF|\x80"},  // within a run of two-byte characters
        {nullptr, xlate_utf8_to_localcp, "no conversion"},
        {nullptr, xlate_localcp_to_utf8, "no conversion"},
    };
    for (const auto& row : table) {
        platform_says(row.codepage);
        if (row.codepage != nullptr) {
            ASSERT_EQ(initIconvHandle(), 0) << row.codepage;
        }
        const message_catcher messages;
        const debug_catcher debug;
        EXPECT_EQ(translate(row.function, row.input), outcome(-1, std::nullopt)) << row.input;
        EXPECT_EQ(debug.texts(), texts{row.function == xlate_localcp_to_utf8 ? to_utf8_failed : to_local_failed});
        EXPECT_EQ(messages.count(), 1u);
        EXPECT_EQ(messages.count(7, 29), 1u);
        EXPECT_EQ(messages.messages().at(0).severity, 8);
        if (row.codepage != nullptr) {
            EXPECT_EQ(translate(row.function, "next"), outcome(0, with_end("next"))) << "reached by the failed text";
        }
        forget();
    }
    for (const auto function : {xlate_localcp_to_utf8, xlate_utf8_to_localcp}) {
        char* output = const_cast<char*>("not yet");
        std::size_t length = 99;
        EXPECT_EQ(function(nullptr, &output, &length), 0);
        EXPECT_EQ(output, nullptr);
    }
}

TEST_F(CodePage, OpeningIsDoneOnceAndAgainAfterRelease)
{
    ASSERT_EQ(initIconvHandle(), 0);
    ldap_iconv_t* const to_utf8 = iconv_handle_to_utf8;
    platform_says("KOI8-R");
    EXPECT_EQ(initIconvHandle(), 0);
    EXPECT_EQ(iconv_handle_to_utf8, to_utf8);
    EXPECT_STREQ(local_codepage, "ISO-8859-1");

    for (int round = 0; round < 2; ++round) {
        free_iconv_handle();
        EXPECT_EQ(local_codepage, nullptr);
        EXPECT_EQ(iconv_handle_to_utf8, nullptr);
        EXPECT_EQ(initIconvHandle(), 0);
        EXPECT_STREQ(local_codepage, "KOI8-R");
        EXPECT_EQ(open_conversions, 2);
    }
    EXPECT_EQ(translate(xlate_localcp_to_utf8, "\xC1"), outcome(0, with_end("\u0430")));
}

TEST_F(CodePage, ACodePageThatIsNotKnownIsReportedAndTriedAgain)
{
    const std::string no_open = "Error - initIconvHandle: ldap_iconv_open() failed, errno=22\n";
    const std::string too_long(500, 'x');
    const struct {
        const char* codepage;
        std::string debug;
        texts arguments;  // of message 28; empty: no message
    } table[] = {
        {nullptr, "Error - initIconvHandle: ldap_nl_langinfo() failed\n", {}},
        {"NO-SUCH-PAGE", no_open, {"NO-SUCH-PAGE"}},
        {too_long.c_str(), no_open, {too_long.substr(0, 127)}},
    };
    for (const auto& row : table) {
        platform_says(row.codepage);
        const message_catcher messages;
        const debug_catcher debug;
        EXPECT_EQ(initIconvHandle(), -1);
        EXPECT_EQ(debug.texts(), texts{row.debug});
        ASSERT_EQ(messages.count(), row.arguments.size());
        if (!row.arguments.empty()) {
            EXPECT_EQ(messages.count(7, 28), 1u);
            EXPECT_EQ(messages.messages()[0].severity, 8);
            EXPECT_EQ(messages.messages()[0].arguments, row.arguments);
        }
        EXPECT_EQ(open_conversions, 0);
        EXPECT_EQ(local_codepage, nullptr);
    }
    platform_says("ISO-8859-1");
    EXPECT_EQ(initIconvHandle(), 0);
}

TEST_F(CodePage, LinesComeAsTheyStandInPiecesOfTheBuffersSizeOrNotAtAll)
{
    const temp_dir dir;
    const std::string long_line(1500, 'x');
    const std::string path = dir.write("conf", "first \xE9\n\n" + long_line + "\nno line feed");
    const std::unique_ptr<char[]> line(new char[1024]);
    const auto lines_of_file = [&] {
        const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(std::fopen(path.c_str(), "r"), std::fclose);
        texts lines;
        while (getline_and_xlate(line.get(), file.get()) == 0) {
            lines.emplace_back(line.get());
        }
        return lines;
    };
    const texts all = {"first \xE9\n", "\n", long_line.substr(0, 1023), long_line.substr(1023) + "\n", "no line feed"};
    EXPECT_EQ(lines_of_file(), all);
    EXPECT_EQ(open_conversions, 0);

    set_cfg_xlate_on();
    const message_catcher messages;
    const debug_catcher debug;
    for (const char* codepage : {static_cast<const char*>(nullptr), "NO-SUCH-PAGE"}) {
        platform_says(codepage);
        EXPECT_EQ(lines_of_file(), texts());
    }
    EXPECT_EQ(messages.count(7, 28), 1u);
    EXPECT_EQ(debug.texts(), (texts{"Error - getline_and_xlate: ldap_nl_langinfo() failed\n",
                                    "Error - getline_and_xlate: ldap_iconv_open() failed errno=22\n"}));
    platform_says("ISO-8859-1");
    EXPECT_EQ(lines_of_file(), all);
    EXPECT_EQ(open_conversions, 1);
    ASSERT_EQ(initIconvHandle(), 0);
    EXPECT_EQ(open_conversions, 2);  // what the reader opened is closed
}

TEST_F(CodePage, ThreadsShareTheConversions)
{
    platform_says("ISO-2022-JP");
    ASSERT_EQ(initIconvHandle(), 0);
    const message_catcher messages;
    std::atomic<int> wrong = 0;
    {
        std::vector<std::jthread> threads;
        for (int number = 0; number < 4; ++number) {
            threads.emplace_back([&, number] {
                for (int round = 0; round < 300; ++round) {  // a failure ends within a run of two-byte characters
                    wrong += number == 0 ? translate(xlate_utf8_to_localcp, "\u65E5\xFF").first != -1
                                         : translate(xlate_utf8_to_localcp, japanese).second != with_end(japanese_iso);
                    wrong += translate(xlate_localcp_to_utf8, japanese_iso).second != with_end(japanese);
                }
            });
        }
    }
    EXPECT_EQ(wrong, 0);
}

}  // namespace
