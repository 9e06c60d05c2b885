// The portable text helpers, beside slow and obvious equivalents.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstddef>
#include <cstdlib>
#include <cwchar>
#include <string>

#include "libraries/libvrnutil/vrn_text.h"

namespace {

TEST(VrnText, CopyingAndAppendingFillAnyBufferExactlyAndTellTheWholeLength)
{
    for (const std::string first : {"", "abc"}) {
        for (const std::string more : {"", "a", "defghij"}) {
            for (std::size_t size = 0; size <= 12; ++size) {
                SCOPED_TRACE(first + " and " + more + " into " + std::to_string(size));
                std::string buffer(size + 1, '#');
                EXPECT_EQ(vrn_strlcpy(buffer.data(), more.c_str(), size), more.size());
                EXPECT_EQ(buffer[size], '#') << "written behind the buffer";
                if (size > 0) {
                    EXPECT_EQ(buffer.c_str(), more.substr(0, size - 1));
                }
                buffer = first + std::string(size + 1, '#');  // without a terminator as long as it doesn't fit
                buffer.resize(size + 1);
                if (first.size() < size) {
                    buffer[first.size()] = '\0';
                }
                const std::string before = buffer;
                EXPECT_EQ(vrn_strlcat(buffer.data(), more.c_str(), size), std::min(first.size(), size) + more.size());
                EXPECT_EQ(buffer[size], before[size]) << "written behind the buffer";
                if (first.size() < size) {
                    EXPECT_EQ(buffer.c_str(), (first + more).substr(0, size - 1));
                } else {
                    EXPECT_EQ(buffer, before);
                }
            }
        }
    }
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
        {"", "", 0}, {"", "a", -1}, {"cn;x", "CN", 1}, {nullptr, nullptr, 0}, {nullptr, "", -1}, {"", nullptr, 1},
    };
    for (const auto& entry : table) {
        EXPECT_EQ(sign(vrn_strcasecmp(entry.a, entry.b)), entry.order);
    }
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
