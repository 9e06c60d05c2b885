// Decoding, encoding and folding, also against the slow second implementation of slow_utf8.h.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <memory>
#include <random>
#include <string>
#include <string_view>

#include "servers/vrnd/libdirbase/base/uni_case.h"
#include "servers/vrnd/libdirbase/base/utf8_text.h"
#include "tests/servers/vrnd/libdirbase/base/slow_utf8.h"

using test_support::slow_character;
using test_support::slow_decode;
using test_support::slow_encode;
using test_support::slow_fold;

namespace {

// Folds a copy in a block of exactly its size, at an offset, so that a sanitizer sees any step outside.
struct folded {
    int result;
    std::string text;
};

folded fold(int (*function)(char*), std::string_view text, std::size_t offset = 0)
{
    const std::unique_ptr<char[]> block(new char[offset + text.size() + 1]);
    char* copy = block.get() + offset;
    std::memcpy(copy, text.data(), text.size());
    copy[text.size()] = '\0';
    const int result = function(copy);
    return {result, std::string(copy, text.size())};
}

TEST(Utf8ToWc, Forms)
{
    struct form {
        const char* text;
        int length;
        std::int32_t character;
    };
    constexpr std::int32_t untouched = -7;
    const form table[] = {
        {"", 1, 0},
        {"A", 1, 'A'},
        {"\x7F", 1, 0x7F},
        {"\xC2\x80", 2, 0x80},
        {"\xDF\xBF", 2, 0x7FF},
        {"\xE0\xA0\x80", 3, 0x800},
        {"\xEF\xBF\xBF", 3, 0xFFFF},
        {"\xED\xA0\x80", 3, 0xD800},  // a surrogate
        {"\xC0\x80", 2, 0},           // overlong forms pass
        {"\xC1\xA1", 2, 'a'},
        {"\xE0\x83\xA9", 3, 0xE9},
        {"\x80", -1, untouched},  // stray continuation bytes
        {"\xBFz", -1, untouched},
        {"\xC3", -1, untouched},  // missing ones
        {"\xC3z", -1, untouched},
        {"\xC3\xC3", -1, untouched},
        {"\xE2", -1, untouched},
        {"\xE2\x82", -1, untouched},
        {"\xE2\x82z", -1, untouched},
        {"\xE2z\x82", -1, untouched},
        {"\xF0\x9F\x98\x80", -1, untouched},  // four bytes
        {"\xF8\x88\x80\x80\x80", -1, untouched},
        {"\xFE", -1, untouched},
        {"\xFF", -1, untouched},
    };
    for (const form& row : table) {
        std::int32_t character = untouched;
        EXPECT_EQ(utf8towc(&character, row.text), row.length) << row.text;
        EXPECT_EQ(character, row.character) << row.text;
        EXPECT_EQ(utf8towc(nullptr, row.text), row.length) << row.text;
    }
    std::int32_t character = untouched;
    EXPECT_EQ(utf8towc(&character, nullptr), 0);
    EXPECT_EQ(character, untouched);
}

TEST(WcToUtf8, EveryCharacterIsWrittenAndReadBack)
{
    for (std::int32_t character = 1; character < 0x10000; ++character) {
        char text[4] = {};
        const int length = wctoutf8(text, character);
        ASSERT_EQ(std::string(text), slow_encode(character)) << std::hex << character;
        ASSERT_EQ(length, static_cast<int>(std::strlen(text))) << std::hex << character;
        std::int32_t read = 0;
        ASSERT_EQ(utf8towc(&read, text), length) << std::hex << character;
        ASSERT_EQ(read, character);
    }
}

TEST(WcToUtf8, ZeroIsWrittenButNotCountedAndNothingGoesToNowhere)
{
    char text[] = "xyz";
    EXPECT_EQ(wctoutf8(text, 0), 0);
    EXPECT_EQ(std::memcmp(text, "\0yz", 4), 0);
    EXPECT_EQ(wctoutf8(nullptr, 'a'), 0);
}

TEST(UtfToUpper, TextsAndWhereTheyStop)
{
    struct text {
        std::string_view before;
        int result;
        std::string_view upper;
    };
    using namespace std::string_view_literals;
    const text table[] = {
        {"", 0, ""},
        {"cn=John Smith,o=Acme {1}", 0, "CN=JOHN SMITH,O=ACME {1}"},
        {"@`[{az\x7FZ", 0, "@`[{AZ\x7FZ"},
        {"stra\u00DFe \u00E9\u00FF", 0, "STRA\u00DFE \u00C9\u0178"},
        {"\u0131\u017F\u00B5", 0, "\u0131\u017F\u00B5"},
        {"\u03B1\u03C3\u03C2 \u0430\u044F\u0451", 0, "\u0391\u03A3\u03A3 \u0410\u042F\u0401"},
        {"\u1E01\u1F80\u4E2D\uFF41", 0, "\u1E00\u1F88\u4E2D\uFF21"},
        {"ab\U0001F600cd", -1, "AB\U0001F600cd"},
        {"abcdefghijkl\x80mn", -1, "ABCDEFGHIJKL\x80mn"},
        {"\u00E9\xC3", -1, "\u00C9\xC3"},
        {"abcdefgh\xE2\x82", -1, "ABCDEFGH\xE2\x82"},
        {"a\xC1\xA1z", 0, "AA\xA1Z"},  // an overlong form gets the proper one in front
        {"a\xE0\x83\xA9z", 0, "A\xC3\x89\xA9Z"},
        {"a\xC0\x80z", 0, "A\0\x80Z"sv},
    };
    for (const text& row : table) {
        const folded found = fold(utfToUpper, row.before);
        EXPECT_EQ(found.result, row.result) << row.before;
        EXPECT_EQ(found.text, row.upper) << row.before;
    }
    EXPECT_EQ(utfToUpper(nullptr), 0);
    EXPECT_EQ(utfToLower(nullptr), 0);
}

TEST(UtfToLower, TextsAndWhereTheyStop)
{
    const folded whole = fold(utfToLower, "CN=\u00C9\u0178 \u0391\u03A3 \u0401\u042F \u1E00\u1F88\uFF21 @[Z");
    EXPECT_EQ(whole.result, 0);
    EXPECT_EQ(whole.text, "cn=\u00E9\u00FF \u03B1\u03C3 \u0451\u044F \u1E01\u1F80\uFF41 @[z");
    const folded stopped = fold(utfToLower, "ABCDEFGHIJ\xF0KL");
    EXPECT_EQ(stopped.result, -1);
    EXPECT_EQ(stopped.text, "abcdefghij\xF0KL");
}

TEST(UtfToCase, EveryCharacterFoldsAsItsMapSays)
{
    for (std::int32_t character = 1; character < 0x10000; ++character) {
        const std::string text = slow_encode(character);
        ASSERT_EQ(fold(utfToUpper, text).text, slow_encode(UniToupper(character))) << std::hex << character;
        ASSERT_EQ(fold(utfToLower, text).text, slow_encode(UniTolower(character))) << std::hex << character;
    }
}

// Text of everything there is: runs of ASCII of all lengths, letters of two and three bytes, overlong forms, and now
// and then bytes at random.
std::string random_text(std::mt19937& random)
{
    const auto below = [&](unsigned limit) { return static_cast<std::int32_t>(random() % limit); };
    std::string text;
    for (std::int32_t pieces = below(12); pieces > 0; --pieces) {
        switch (below(16)) {
        case 0: text += slow_encode(0x800 + below(0xF800)); break;
        case 1: text += {static_cast<char>(0xC0 + below(2)), static_cast<char>(0x80 + below(0x40))}; break;
        case 2: text += {'\xE0', static_cast<char>(0x80 + below(0x20)), static_cast<char>(0x80 + below(0x40))}; break;
        case 3: text += static_cast<char>(1 + below(0xFF)); break;
        case 4: text += slow_encode(0x1E00 + below(0x200)); break;
        case 5:
        case 6:
        case 7: text += slow_encode(0x80 + below(0x780)); break;
        default:
            for (std::int32_t run = below(20); run > 0; --run)
                text += static_cast<char>(1 + below(0x7F));
        }
    }
    return text;
}

TEST(UtfToCase, RandomTextFoldsAsTheSlowWayFoldsIt)
{
    std::mt19937 random(20080527);
    int stopped = 0;
    for (int round = 0; round < 6000; ++round) {
        const std::string text = random_text(random);
        std::string upper = text;
        std::string lower = text;
        const int upper_result = slow_fold(upper, UniToupper);
        const int lower_result = slow_fold(lower, UniTolower);
        const std::size_t offset = random() % 8;
        const folded fast_upper = fold(utfToUpper, text, offset);
        const folded fast_lower = fold(utfToLower, text, offset);
        ASSERT_EQ(fast_upper.result, upper_result) << testing::PrintToString(text);
        ASSERT_EQ(fast_lower.result, lower_result) << testing::PrintToString(text);
        ASSERT_EQ(fast_upper.text, upper) << testing::PrintToString(text);
        ASSERT_EQ(fast_lower.text, lower) << testing::PrintToString(text);
        stopped += upper_result == -1;
    }
    EXPECT_GT(stopped, 300) << "both kinds of text have to come up";
    EXPECT_LT(stopped, 5000);
}

}  // namespace
