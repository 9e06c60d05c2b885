// Strings against std::string, their storage against the rules of its sizes, their orders against std::sort.
#include "servers/vrnd/libcsgl/csgl_string.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <climits>
#include <cstring>
#include <random>
#include <string>
#include <vector>

namespace {

using string_body = csgl_refcounted_pointer_to<csgl_string_>;

unsigned size_of(const std::string& text)
{
    return static_cast<unsigned>(text.size());
}

// The size of the block for so many bytes, by the steps one by one.
unsigned block_for(unsigned needed)
{
    const unsigned steps[][2] = {{32, 0}, {64, 64}, {128, 128}, {256, 256}, {512, 512}, {1024, 1024}};
    for (const auto& [limit, size] : steps) {
        if (needed <= limit) {
            return size;
        }
    }
    return (needed / 1024 + 1) * 1024;
}

void expect_sound(const csgl_string& actual, const std::string& expected)
{
    const csgl_string_& body = *actual;
    EXPECT_EQ(actual.c_str(), expected);
    EXPECT_EQ(body.length(), expected.size());
    EXPECT_EQ(actual.empty(), expected.empty());
    EXPECT_TRUE(body.capacity() == 0 || body.capacity() >= 64) << body.capacity();
    EXPECT_LE(body.length() + 1, body.capacity() == 0 ? 32 : body.capacity());
}

}  // namespace

TEST(String, BlocksGrowBySteps)
{
    for (unsigned needed = 0; needed <= 5000; ++needed) {
        ASSERT_EQ(csgl_string_::allocation_size(needed), block_for(needed)) << needed;
    }
    EXPECT_EQ(csgl_string(std::string(31, 'x').c_str())->capacity(), 0u);
    EXPECT_EQ(csgl_string(std::string(32, 'x').c_str())->capacity(), 64u);
    EXPECT_EQ(csgl_string(std::string(2047, 'x').c_str())->capacity(), 3072u);
}

TEST(String, ReplacingKeepsFreesOrGrowsTheBlock)
{
    const struct {
        unsigned before, stated, capacity;
    } cases[] = {
        {10, 31, 0},        {10, 32, 64}, {1000, 40, 1024}, {1000, 31, 0},      {1000, 32, 1024},   {1000, 1023, 1024},
        {1000, 1024, 2048}, {40, 63, 64}, {40, 64, 128},    {2000, 2047, 2048}, {2000, 2048, 3072}, {2000, 0, 0},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(std::to_string(c.before) + " to " + std::to_string(c.stated));
        csgl_string string(std::string(c.before, 'a').c_str());
        const csgl_string_* body = string.get();
        const std::string text(c.stated, 'b');
        string.assign(text.c_str(), c.stated);
        expect_sound(string, text);
        EXPECT_EQ(string->capacity(), c.capacity);
        EXPECT_EQ(string.get(), body);
    }
}

TEST(String, StatedLengthsAreUpperBounds)
{
    const string_body body(new csgl_string_);
    body->init("abc", 10);
    EXPECT_EQ(body->length(), 3u);
    body->append("de\0f", 100);  // the room is made for what was stated
    EXPECT_STREQ(body->text(), "abcde");
    EXPECT_EQ(body->capacity(), 128u);
    body->assign("xyz", 2);
    EXPECT_STREQ(body->text(), "xy");

    const string_body two(new csgl_string_);
    two->init("ab\0c", 4, "defg", 3);
    EXPECT_STREQ(two->text(), "abdef");
    const string_body none(new csgl_string_);
    none->init(nullptr, 0, nullptr, 0);
    EXPECT_STREQ(none->text(), "");
}

TEST(String, NullTextsAreEmptyAndEmptyStringsShareABody)
{
    const char* null = nullptr;
    const csgl_string a("a");
    EXPECT_STREQ((a + null).c_str(), "a");
    EXPECT_STREQ((null + a).c_str(), "a");
    expect_sound(csgl_string(null), "");

    csgl_string first;
    const csgl_string second;
    EXPECT_EQ(first.get(), second.get());
    first.append("x");
    expect_sound(first, "x");
    expect_sound(second, "");
    expect_sound(csgl_string(), "");
}

// A few handles, often on common bodies, change at random; the others must never notice.
TEST(String, RandomOperationsMatchStdString)
{
    std::mt19937 random(2);
    std::array<csgl_string, 6> actual;
    std::array<std::string, 6> expected;
    for (int round = 0; round < 30000; ++round) {
        const std::size_t i = random() % 6;
        const std::size_t j = random() % 6;
        std::string text(random() % (random() % 8 == 0 ? 1500 : 40), '.');
        std::generate(text.begin(), text.end(),
                      [&] { return static_cast<char>(random() % 60 == 0 ? 0 : random() % 256); });
        const std::string counted = text.c_str();  // what the strings make of it
        csgl_string& a = actual[i];
        std::string& e = expected[i];
        switch (random() % 9) {
        case 0: a = csgl_string(text.data(), size_of(text)), e = counted; break;
        case 1: a = actual[j], e = expected[j]; break;
        case 2: a.append(text.data(), size_of(text)), e += counted; break;
        case 3: a.append(actual[j]), e += std::string(expected[j]); break;
        case 4: a = a + actual[j], e = e + expected[j]; break;
        case 5: a = text.c_str() + a, e = counted + e; break;
        case 6: a.assign(text.data(), size_of(text)), e = counted; break;
        case 7: {  // a piece of the text itself
            const auto from = static_cast<unsigned>(random() % (e.size() + 1));
            a.assign(a.c_str() + from, size_of(e) - from), e = e.substr(from);
            break;
        }
        default: {
            const char c = e.empty() ? 'x' : e[random() % e.size()];
            const auto start = static_cast<unsigned>(random() % (e.size() + 3));
            EXPECT_EQ(a.find(c, start), static_cast<int>(e.find(c, start)));
            EXPECT_EQ(a.rfind(c, start), static_cast<int>(e.rfind(c, start)));
            EXPECT_EQ(a == actual[j], e == expected[j]);
        }
        }
        if (e.size() > 5000) {
            a = csgl_string(), e.clear();
        }
        for (std::size_t k = 0; k < 6; ++k) {
            ASSERT_NO_FATAL_FAILURE(expect_sound(actual[k], expected[k]));
        }
        ASSERT_FALSE(HasFailure()) << "round " << round;
    }
}

TEST(String, SearchesReachTheTerminator)
{
    const csgl_string text("abca");
    EXPECT_EQ(text.find('\0'), 4);
    EXPECT_EQ(text.find('\0', 4), 4);
    EXPECT_EQ(text.find('a', 1), 3);
    EXPECT_EQ(text.find('a', 5), -1);
    EXPECT_EQ(text.find('\0', 0xffffffff), -1);
    EXPECT_EQ(text.rfind('\0'), 4);
    EXPECT_EQ(text.rfind('\0', 3), -1);
    EXPECT_EQ(text.rfind('a', 0xffffffff), 3);
    EXPECT_EQ(text.rfind('a', 2), 0);
    EXPECT_EQ(text.rfind('x'), -1);
    EXPECT_EQ(csgl_string().rfind('x', 0), -1);
}

// Signed bytes put everything above 0x7f below the end of the text, so the terminator takes part.
TEST(String, OrdersTakeBytesAsSigned)
{
    std::mt19937 random(3);
    std::vector<std::string> texts = {"", "a", "A", "\x80", "a\xff", "ab", "\xc3\xa4", "AB"};
    for (int i = 0; i < 400; ++i) {
        std::string text(random() % 6, '.');
        std::generate(text.begin(), text.end(), [&] { return "aAbB\x80\xc3\xff\x7f\x01_"[random() % 10]; });
        texts.push_back(text);
    }
    const auto signed_bytes = [](const std::string& text) {
        std::vector<signed char> bytes(text.begin(), text.end());
        bytes.push_back(0);
        return bytes;
    };
    const auto lowered = [](std::string text) {
        std::transform(text.begin(), text.end(), text.begin(),
                       [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; });
        return text;
    };
    for (const std::string& a : texts) {
        for (const std::string& b : texts) {
            const auto x = signed_bytes(a);
            const auto y = signed_bytes(b);
            const int expected = x < y ? -1 : y < x ? 1 : 0;
            ASSERT_EQ(csgl_string::compare(a.c_str(), b.c_str()), expected);
            ASSERT_EQ(std::less<csgl_string>()(a.c_str(), b.c_str()), expected < 0);

            const auto lx = signed_bytes(lowered(a));
            const auto ly = signed_bytes(lowered(b));
            const auto at = std::mismatch(lx.begin(), lx.end(), ly.begin(), ly.end());
            const int difference = lx == ly ? 0 : *at.first - *at.second;
            ASSERT_EQ(csgl_str_ci_compare(a.c_str(), b.c_str()), difference);
            ASSERT_EQ(csgl_str_ci_less()(a.c_str(), b.c_str()), difference < 0);
        }
    }
    EXPECT_EQ(csgl_str_ci_compare("a", ""), 'a');
    EXPECT_EQ(csgl_str_ci_compare("\x80", "\x7f"), -255);
}

TEST(String, ZeroFillsJustTheStatedBytes)
{
    char bytes[] = "abcdef";
    csgl_str_zero(bytes + 1, 3);
    EXPECT_EQ(std::string(bytes, 6), std::string("a\0\0\0ef", 6));
}
