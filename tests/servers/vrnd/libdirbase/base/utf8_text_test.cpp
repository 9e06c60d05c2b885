// Decoding, encoding and folding, also against the slow second implementation of slow_utf8.h.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <memory>
#include <random>
#include <string>
#include <utility>

#include "servers/vrnd/libdirbase/base/uni_case.h"
#include "servers/vrnd/libdirbase/base/utf8_text.h"
#include "tests/servers/vrnd/libdirbase/base/slow_utf8.h"

using test_support::slow_character;
using test_support::slow_decode;
using test_support::slow_encode;
using test_support::slow_fold;

namespace {

// Folds a copy in a block of exactly its size, at an offset, so that a sanitizer sees any step outside.
std::pair<int, std::string> fold(int (*function)(char*), const std::string& text, std::size_t offset = 0)
{
    const std::unique_ptr<char[]> block(new char[offset + text.size() + 1]);
    char* copy = block.get() + offset;
    std::memcpy(copy, text.c_str(), text.size() + 1);
    const int result = function(copy);
    return {result, std::string(copy, text.size())};
}

TEST(Utf8ToWc, EveryMixOfBytesReadsAsTheSlowWayReadsIt)
{
    // Plain bytes, continuation bytes, leads of two (overlong ones with them), three and four bytes, and no leads.
    const std::string kinds("\0z\x7F\x80\x9F\xA0\xBF\xC0\xC1\xC2\xDF\xE0\xED\xEF\xF0\xF8\xFF", 17);
    for (std::size_t mix = 0; mix < 17 * 17 * 17; ++mix) {
        const std::string text = {kinds[mix % 17], kinds[mix / 17 % 17], kinds[mix / 17 / 17]};
        const slow_character expected = slow_decode(text.c_str(), 0);
        std::int32_t character = -7;
        ASSERT_EQ(utf8towc(&character, text.c_str()), expected.length) << testing::PrintToString(text);
        ASSERT_EQ(character, expected.length < 0 ? -7 : expected.value) << testing::PrintToString(text);
        ASSERT_EQ(utf8towc(nullptr, text.c_str()), expected.length);
    }
    std::int32_t character = -7;
    EXPECT_EQ(utf8towc(&character, nullptr), 0);
    EXPECT_EQ(utf8towc(&character, "\xE0\x83\xA9"), 3);  // overlong forms pass
    EXPECT_EQ(character, 0xE9);
    EXPECT_EQ(utf8towc(&character, "\xED\xA0\x80"), 3);  // and so do surrogates
    EXPECT_EQ(character, 0xD800);
    EXPECT_EQ(utf8towc(&character, "\xF0\x9F\x98\x80"), -1);
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

TEST(UtfToCase, TextsAndWhereTheyStop)
{
    const struct {
        int (*function)(char*);
        const char* before;
        int result;
        std::string folded;
    } table[] = {
        {utfToUpper, "@`[{az\x7FZ stra\u00DFe \u00FF", 0, "@`[{AZ\x7FZ STRA\u00DFE \u0178"},
        {utfToLower, "CN=\u00C9\u0178 \u0391\u03A3 \uFF21 @[Z", 0, "cn=\u00E9\u00FF \u03B1\u03C3 \uFF41 @[z"},
        {utfToUpper, "ab\U0001F600cd", -1, "AB\U0001F600cd"},
        {utfToLower, "ABCDEFGHIJ\xF0KL", -1, "abcdefghij\xF0KL"},
        {utfToUpper, "abcdefgh\xE2\x82", -1, "ABCDEFGH\xE2\x82"},
        {utfToUpper, "a\xE0\x83\xA9z", 0, "A\xC3\x89\xA9Z"},  // an overlong form gets the proper one in front
        {utfToUpper, "a\xC0\x80z", 0, {'A', '\0', '\x80', 'Z'}},
    };
    for (const auto& row : table) {
        EXPECT_EQ(fold(row.function, row.before), std::pair(row.result, row.folded)) << row.before;
    }
    EXPECT_EQ(utfToUpper(nullptr), 0);
    EXPECT_EQ(utfToLower(nullptr), 0);
}

TEST(UtfToCase, EveryCharacterFoldsAsItsMapSays)
{
    for (std::int32_t character = 1; character < 0x10000; ++character) {
        const std::string text = slow_encode(character);
        ASSERT_EQ(fold(utfToUpper, text).second, slow_encode(UniToupper(character))) << std::hex << character;
        ASSERT_EQ(fold(utfToLower, text).second, slow_encode(UniTolower(character))) << std::hex << character;
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
            for (std::int32_t run = below(20); run > 0; --run) {
                text += static_cast<char>(1 + below(0x7F));
            }
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
        ASSERT_EQ(fold(utfToUpper, text, offset), std::pair(upper_result, upper)) << testing::PrintToString(text);
        ASSERT_EQ(fold(utfToLower, text, offset), std::pair(lower_result, lower)) << testing::PrintToString(text);
        stopped += upper_result == -1;
    }
    EXPECT_GT(stopped, 300) << "both kinds of text have to come up";
    EXPECT_LT(stopped, 5000);
}

}  // namespace
