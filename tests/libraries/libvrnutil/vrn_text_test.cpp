// The portable text helpers, beside slow and obvious equivalents.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <cwchar>
#include <string>
#include <vector>

#include "libraries/libvrnutil/vrn_text.h"

namespace {

TEST(VrnText, CopyingFillsAnyBufferExactlyAndTellsTheWholeLength)
{
    for (const std::string from : {"", "a", "abc", "abcdefgh"}) {
        for (std::size_t size = 0; size <= 10; ++size) {
            std::vector<char> buffer(size + 1, '#');
            EXPECT_EQ(vrn_strlcpy(buffer.data(), from.c_str(), size), from.size());
            EXPECT_EQ(buffer[size], '#') << "written behind the buffer";
            if (size > 0) {
                EXPECT_EQ(std::string(buffer.data()), from.substr(0, size - 1));
            }
        }
    }
}

TEST(VrnText, AppendingFillsAnyBufferExactlyAndTellsTheWholeLength)
{
    for (const std::string first : {"", "abc"}) {
        for (const std::string more : {"", "de", "defghij"}) {
            for (std::size_t size = first.size() + 1; size <= 12; ++size) {
                std::vector<char> buffer(size + 1, '#');
                std::strcpy(buffer.data(), first.c_str());
                EXPECT_EQ(vrn_strlcat(buffer.data(), more.c_str(), size), first.size() + more.size());
                EXPECT_EQ(buffer[size], '#') << "written behind the buffer";
                EXPECT_EQ(std::string(buffer.data()), (first + more).substr(0, size - 1));
            }
        }
    }
}

TEST(VrnText, AppendingLeavesABufferWithoutTerminatorAlone)
{
    char buffer[4] = {'a', 'b', 'c', 'd'};
    EXPECT_EQ(vrn_strlcat(buffer, "xyz", sizeof buffer), 4u + 3u);
    EXPECT_EQ(std::string(buffer, sizeof buffer), "abcd");
    EXPECT_EQ(vrn_strlcat(buffer, "xyz", 0), 3u);
}

TEST(VrnText, ComparisonFoldsTheTwentySixLettersAndNothingElse)
{
    const auto fold = [](int byte) { return byte >= 'A' && byte <= 'Z' ? byte + 32 : byte; };
    const auto sign = [](int value) { return (value > 0) - (value < 0); };
    int wrong = 0;
    for (int a = 1; a < 256; ++a) {
        for (int b = 1; b < 256; ++b) {
            const std::string left = {'x', static_cast<char>(a), '1'};
            const std::string right = {'X', static_cast<char>(b), '1'};
            wrong += sign(vrn_strcasecmp(left.c_str(), right.c_str())) != sign(fold(a) - fold(b));
        }
    }
    EXPECT_EQ(wrong, 0);

    const struct {
        const char* a;
        const char* b;
        int order;
    } table[] = {
        {"", "", 0},       {"", "a", -1},     {"objectClass", "OBJECTCLASS", 0},
        {"cn", "cnx", -1}, {"cn;x", "CN", 1}, {nullptr, nullptr, 0},
        {nullptr, "", -1}, {"", nullptr, 1},
    };
    for (const auto& entry : table)
        EXPECT_EQ(sign(vrn_strcasecmp(entry.a, entry.b)), entry.order);
}

TEST(VrnText, FormattingCutsOrGrowsAsAsked)
{
    char buffer[6];
    EXPECT_EQ(vrn_snprintf(buffer, sizeof buffer, "%s-%d", "abc", 123), 7);
    EXPECT_STREQ(buffer, "abc-1");

    const std::string name(3000, 'n');
    char* text = nullptr;
    EXPECT_EQ(vrn_asprintf(&text, "<%s>", name.c_str()), 3002);
    EXPECT_EQ(text, "<" + name + ">");
    std::free(text);

    text = buffer;
    EXPECT_EQ(vrn_asprintf(&text, "%lc", static_cast<wint_t>(0x20AC)), -1) << "the C locale has no such character";
    EXPECT_EQ(text, nullptr);
}

}  // namespace
