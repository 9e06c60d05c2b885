// Translations with the platform's iconv as the judge. The client library's functions are met on their way from the
// library, so that the local code page can be any, and every conversion opened is counted until it is closed.
#include <gtest/gtest.h>

#include <atomic>
#include <cstddef>
#include <cstdio>
#include <memory>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include <dlfcn.h>
#include <iconv.h>

#include "libraries/libber/ldap_iconv.h"
#include "servers/vrnd/libdirbase/base/code_page.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "tests/support/message_catcher.h"
#include "tests/support/temp_dir.h"

using test_support::debug_catcher;
using test_support::message_catcher;
using test_support::temp_dir;

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
    if (replace_codepage && item == 0x3D)
        return platform_codepage;
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
    if (conversion != nullptr)
        --open_conversions;
    return next(conversion);
}

}  // extern "C"

namespace {

struct translated {
    int result;
    bool null;
    std::string text;  // terminator included
};

translated translate(int (*function)(const char*, char**, std::size_t*), const char* input)
{
    char* output = const_cast<char*>("not yet");
    std::size_t length = 99;
    const int result = function(input, &output, &length);
    const heap_text owner(output);
    return {result, output == nullptr, output == nullptr ? std::string() : std::string(output, length)};
}

// A text with its terminator, converted by the platform in one step.
std::string by_platform(const char* to, const char* from, std::string_view text)
{
    const iconv_t conversion = iconv_open(to, from);
    EXPECT_NE(conversion, reinterpret_cast<iconv_t>(-1));
    std::string in(text.data(), text.size() + 1);
    std::string out(in.size() * 4, '\0');
    char* in_at = in.data();
    char* out_at = out.data();
    std::size_t in_left = in.size();
    std::size_t out_left = out.size();
    EXPECT_EQ(iconv(conversion, &in_at, &in_left, &out_at, &out_left), 0u);
    iconv_close(conversion);
    out.resize(out.size() - out_left);
    return out;
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

TEST_F(CodePage, TextsTranslateBothWaysAsThePlatformTranslatesThem)
{
    struct text {
        const char* codepage;
        const char* utf8;
    };
    const text table[] = {
        {"ISO-8859-1", ""},
        {"ISO-8859-1", "plain"},
        {"ISO-8859-1", "\u00C9lan fran\u00E7ais \u00FF"},
        {"ISO-8859-7", "\u0391\u03B8\u03AE\u03BD\u03B1"},
        {"KOI8-R", "\u041C\u043E\u0441\u043A\u0432\u0430"},
        {"ISO-8859-15", "\u20AC"},                 // one byte becomes three
        {"ISO-2022-JP", "a\u65E5\u672Cb\u8A9Ec"},  // has a state
        {"UTF-8", "\u00E9\u20AC\U0001F600"},
    };
    for (const text& row : table) {
        platform_says(row.codepage);
        ASSERT_EQ(initIconvHandle(), 0) << row.codepage;
        EXPECT_STREQ(local_codepage, row.codepage);
        EXPECT_EQ(open_conversions, 2);

        const std::string local = by_platform(row.codepage, "UTF-8", row.utf8);
        const translated to_local = translate(xlate_utf8_to_localcp, row.utf8);
        EXPECT_EQ(to_local.result, 0) << row.utf8;
        EXPECT_EQ(to_local.text, local) << row.utf8;
        const translated to_utf8 = translate(xlate_localcp_to_utf8, local.c_str());
        EXPECT_EQ(to_utf8.result, 0) << row.utf8;
        EXPECT_EQ(to_utf8.text, std::string_view(row.utf8, std::char_traits<char>::length(row.utf8) + 1));
        forget();
    }
}

TEST_F(CodePage, WhatCantBeTranslatedIsReportedAndLeavesNoText)
{
    struct text {
        const char* codepage;
        int (*function)(const char*, char**, std::size_t*);
        const char* input;
    };
    const std::string to_utf8_failed = "Error - xlate_localcp_to_utf8(): ldap_iconv() rc=-1\n";
    const std::string to_local_failed = "Error - xlate_utf8_to_localcp_imp: ldap_iconv() failed rc=-1\n";
    const text table[] = {
        {"ISO-8859-1", xlate_utf8_to_localcp, "the euro \u20AC isn't there"},
        {"ISO-8859-1", xlate_utf8_to_localcp, "not UTF-8 \x80"},
        {"ISO-8859-1", xlate_utf8_to_localcp, "cut \xC3"},
        {"UTF-8", xlate_localcp_to_utf8, "not UTF-8 \xFF"},
        {"ISO-2022-JP", xlate_localcp_to_utf8, "\x1B$BF|\x80"},  // within a run of two-byte characters
        {"ANSI_X3.4-1968", xlate_localcp_to_utf8, "\xE9"},
    };
    for (const text& row : table) {
        platform_says(row.codepage);
        ASSERT_EQ(initIconvHandle(), 0) << row.codepage;
        const message_catcher messages;
        const debug_catcher debug;
        const translated found = translate(row.function, row.input);
        EXPECT_EQ(found.result, -1) << row.input;
        EXPECT_TRUE(found.null) << row.input;
        EXPECT_EQ(debug.texts(),
                  std::vector<std::string>{row.function == xlate_localcp_to_utf8 ? to_utf8_failed : to_local_failed});
        EXPECT_EQ(messages.count(), 1u);
        EXPECT_EQ(messages.count(7, 29), 1u);
        EXPECT_EQ(messages.messages().at(0).severity, 8);

        const translated next = translate(row.function, "next");
        EXPECT_EQ(next.text, std::string("next", 5)) << "a failed text doesn't reach into the next one";
        forget();
    }
}

TEST_F(CodePage, NullIsNoTextAndATextWithoutAConversionFails)
{
    const message_catcher messages;
    for (const auto function : {xlate_localcp_to_utf8, xlate_utf8_to_localcp}) {
        EXPECT_EQ(translate(function, nullptr).result, 0);
        EXPECT_TRUE(translate(function, nullptr).null);
        EXPECT_EQ(translate(function, "text").result, -1);
    }
    EXPECT_EQ(messages.count(7, 29), 2u);
}

TEST_F(CodePage, OpeningIsDoneOnceAndAgainAfterRelease)
{
    ASSERT_EQ(initIconvHandle(), 0);
    ldap_iconv_t* const to_utf8 = iconv_handle_to_utf8;
    platform_says("KOI8-R");
    EXPECT_EQ(initIconvHandle(), 0);
    EXPECT_EQ(iconv_handle_to_utf8, to_utf8);
    EXPECT_STREQ(local_codepage, "ISO-8859-1");

    for (int round = 0; round < 3; ++round) {
        free_iconv_handle();
        EXPECT_EQ(local_codepage, nullptr);
        EXPECT_EQ(iconv_handle_to_utf8, nullptr);
        EXPECT_EQ(initIconvHandle(), 0);
        EXPECT_STREQ(local_codepage, "KOI8-R");
        EXPECT_EQ(open_conversions, 2);
    }
    EXPECT_EQ(translate(xlate_localcp_to_utf8, "\xC1").text, std::string("\u0430", 3));
}

TEST_F(CodePage, ACodePageThatIsNotKnownIsReportedAndTriedAgain)
{
    struct failure {
        const char* codepage;
        const char* debug;
        std::vector<std::string> arguments;  // of message 28; empty: no message
    };
    const std::string too_long(500, 'x');
    const failure table[] = {
        {nullptr, "Error - initIconvHandle: ldap_nl_langinfo() failed\n", {}},
        {"NO-SUCH-PAGE", "Error - initIconvHandle: ldap_iconv_open() failed, errno=22\n", {"NO-SUCH-PAGE"}},
        {too_long.c_str(), "Error - initIconvHandle: ldap_iconv_open() failed, errno=22\n", {too_long.substr(0, 127)}},
    };
    for (const failure& row : table) {
        platform_says(row.codepage);
        const message_catcher messages;
        const debug_catcher debug;
        EXPECT_EQ(initIconvHandle(), -1);
        EXPECT_EQ(debug.texts(), std::vector<std::string>{row.debug});
        EXPECT_EQ(messages.count(), row.arguments.size());
        if (!row.arguments.empty()) {
            EXPECT_EQ(messages.count(7, 28), 1u);
            EXPECT_EQ(messages.messages().at(0).severity, 8);
            EXPECT_EQ(messages.messages().at(0).arguments, row.arguments);
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
        std::vector<std::string> lines;
        while (getline_and_xlate(line.get(), file.get()) == 0) {
            lines.emplace_back(line.get());
        }
        return lines;
    };
    const std::vector<std::string> all = {"first \xE9\n", "\n", long_line.substr(0, 1023),
                                          long_line.substr(1023) + "\n", "no line feed"};
    EXPECT_EQ(lines_of_file(), all);
    EXPECT_EQ(open_conversions, 0);

    set_cfg_xlate_on();
    const message_catcher messages;
    const debug_catcher debug;
    for (const char* codepage : {static_cast<const char*>(nullptr), "NO-SUCH-PAGE"}) {
        platform_says(codepage);
        EXPECT_EQ(lines_of_file(), std::vector<std::string>());
    }
    EXPECT_EQ(messages.count(7, 28), 1u);
    EXPECT_EQ(debug.texts(),
              (std::vector<std::string>{"Error - getline_and_xlate: ldap_nl_langinfo() failed\n",
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
    const char* const utf8 = "a\u65E5\u672Cb";
    const std::string local = by_platform("ISO-2022-JP", "UTF-8", utf8);
    const message_catcher messages;

    std::vector<std::thread> threads;
    std::atomic<int> wrong = 0;
    for (int number = 0; number < 4; ++number) {
        threads.emplace_back([&, number] {
            for (int round = 0; round < 300; ++round) {
                if (number == 0)  // leaves the conversion within a run of two-byte characters
                    wrong += translate(xlate_utf8_to_localcp, "\u65E5\xFF").result != -1;
                else
                    wrong += translate(xlate_utf8_to_localcp, utf8).text != local;
                wrong += translate(xlate_localcp_to_utf8, local.c_str()).text != std::string(utf8, 9);
            }
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_EQ(wrong, 0);
}

}  // namespace
