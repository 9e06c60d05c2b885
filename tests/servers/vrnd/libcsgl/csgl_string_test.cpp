// Strings against std::string, their storage against the rules of its sizes, their orders against std::vector's.
#include "servers/vrnd/libcsgl/csgl_string.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <random>
#include <string>
#include <vector>

namespace {

void expect_sound(const csgl_string& actual, const std::string& expected)
{
    EXPECT_EQ(actual.c_str(), expected);
    EXPECT_EQ(actual.length(), expected.size());
    EXPECT_EQ(actual.empty(), expected.empty());
    EXPECT_LE(actual.length() + 1, actual->capacity() == 0 ? 32 : actual->capacity());
}

}  // namespace

TEST(String, ReplacingKeepsFreesOrGrowsTheBlock)
{
    const unsigned cases[][3] = {{10, 31, 0},      {10, 32, 64},       {10, 128, 256},     {10, 512, 1024},
                                 {1000, 31, 0},    {1000, 32, 1024},   {1000, 1023, 1024}, {1000, 1024, 2048},
                                 {10, 2047, 3072}, {2000, 2047, 2048}, {2000, 2048, 3072}, {2000, 0, 0}};
    for (const auto& [before, after, capacity] : cases) {
        csgl_string string(std::string(before, 'a').c_str());
        string.assign(std::string(after, 'b').c_str(), after);
        expect_sound(string, std::string(after, 'b'));
        EXPECT_EQ(string->capacity(), capacity) << before << " to " << after;
    }
}

TEST(String, StatedLengthsAreUpperBoundsAndNullIsEmpty)
{
    const csgl_refcounted_pointer_to<csgl_string_> body(new csgl_string_);
    body->init("ab\0c", 10, "defg", 3);
    body->append("gh\0i", 100);
    EXPECT_STREQ(body->text(), "abdefgh");
    EXPECT_EQ(body->capacity(), 128u);  // room for what was stated

    const csgl_string null(static_cast<const char*>(nullptr));
    expect_sound(csgl_string("a") + static_cast<const char*>(nullptr) + null, "a");
    csgl_string().append("x", 1);
    expect_sound(csgl_string(), "");  // the one empty body
}

// A few handles, often on common bodies, change at random; the others must never notice.
TEST(String, RandomOperationsMatchStdString)
{
    std::mt19937 random(2);
    std::array<csgl_string, 6> actual;
    std::array<std::string, 6> expected;
    for (int round = 0; round < 30000 && !HasFailure(); ++round) {
        const std::size_t j = random() % 6;
        csgl_string& a = actual[random() % 6];
        std::string& e = expected[static_cast<std::size_t>(&a - actual.data())];
        std::string text(random() % (random() % 8 == 0 ? 1500 : 40), '.');
        std::generate(text.begin(), text.end(), [&] { return static_cast<char>(random() % 60 ? random() % 256 : 0); });
        const auto length = static_cast<unsigned>(text.size());
        const std::string counted = text.c_str();
        switch (random() % 9) {
        case 0: a = csgl_string(text.data(), length), e = counted; break;
        case 1: a = actual[j], e = expected[j]; break;
        case 2: a.append(text.data(), length), e += counted; break;
        case 3: a.append(actual[j]), e += std::string(expected[j]); break;
        case 4: a = a + actual[j], e = e + expected[j]; break;
        case 5: a = text.c_str() + a, e = counted + e; break;
        case 6: a.assign(text.data(), length), e = counted; break;
        case 7: a.assign(a.c_str() + e.size() / 2, length), e = e.substr(e.size() / 2, length); break;
        default: {
            const char c = random() % 4 == 0 || e.empty() ? '\0' : e[random() % e.size()];
            const auto start = random() % 9 == 0 ? 0xffffffff : static_cast<unsigned>(random() % (e.size() + 3));
            const std::string whole = e + '\0';  // searches reach the terminator
            EXPECT_EQ(a.find(c, start), static_cast<int>(whole.find(c, start)));
            EXPECT_EQ(a.rfind(c, start), static_cast<int>(whole.rfind(c, start)));
        }
        }
        if (e.size() > 5000)
            a = csgl_string(), e.clear();
        for (std::size_t k = 0; k < 6; ++k)
            expect_sound(actual[k], expected[k]);
    }
}

// Signed bytes put everything above 0x7f below the end of the text, so the terminator takes part.
TEST(String, OrdersTakeBytesAsSigned)
{
    std::mt19937 random(3);
    std::vector<std::string> texts;
    while (texts.size() < 300) {
        std::string text(random() % 6, '.');
        for (char& c : text)
            c = "aAbB\x80\xc3\xff\x7f\x01_"[random() % 10];
        texts.push_back(text);
    }
    const auto bytes = [](std::string text, bool lowered) {
        for (char& c : text)
            c = lowered && c >= 'A' && c <= 'Z' ? static_cast<char>(c + 32) : c;
        return std::vector<signed char>(text.c_str(), text.c_str() + text.size() + 1);
    };
    for (const std::string& a : texts) {
        for (const std::string& b : texts) {
            const bool less = bytes(a, false) < bytes(b, false);
            ASSERT_EQ(csgl_string::compare(a.c_str(), b.c_str()), less ? -1 : a != b);
            ASSERT_EQ(std::less<csgl_string>()(a.c_str(), b.c_str()), less);
            const auto x = bytes(a, true);
            const auto y = bytes(b, true);
            const auto [p, q] = std::mismatch(x.begin(), x.end(), y.begin(), y.end());
            ASSERT_EQ(csgl_str_ci_compare(a.c_str(), b.c_str()), x == y ? 0 : *p - *q);
            ASSERT_EQ(csgl_str_ci_less()(a.c_str(), b.c_str()), x < y);
        }
    }
}
