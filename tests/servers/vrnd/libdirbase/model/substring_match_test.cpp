// Pieces of texts: every short text and pattern, as trying all ways of cutting has it.
#include "servers/vrnd/libdirbase/model/substring_match.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "servers/vrnd/libdirbase/model/filter_evaluation.h"
#include "tests/support/slow_filter.h"

namespace {

TEST(SubstringMatch, IsWhatTryingAllWaysOfCuttingFinds)
{
    std::vector<std::string> texts = {""};
    for (std::size_t i = 0; texts[i].size() < 5; ++i) {
        texts.push_back(texts[i] + "a");
        texts.push_back(texts[i] + "b");
    }
    const std::vector<std::string> pieces(texts.begin(), texts.begin() + 7);  // of up to two letters
    std::size_t matches = 0;
    const auto compare = [&](const std::string& initial, std::vector<const char*> any, const std::string& final) {
        any.push_back(nullptr);
        const auto array = const_cast<char* const*>(any.data());
        const test_support::slow_pattern pattern(initial.c_str(), array, final.c_str());
        for (const std::string& text : texts) {
            const bool found = substring_match(text, initial, any.data(), final);
            matches += found ? 1 : 0;
            EXPECT_EQ(found, pattern.matches(text)) << text << " " << initial << " " << final;
        }
    };
    for (const std::string& initial : pieces) {
        for (const std::string& final : pieces) {
            compare(initial, {}, final);
            for (const std::string& first : pieces) {
                compare(initial, {first.c_str()}, final);
                for (const std::string& second : pieces) {
                    compare(initial, {first.c_str(), second.c_str()}, final);
                }
            }
        }
    }
    EXPECT_GT(matches, 5'000u);
    EXPECT_TRUE(substring_match({}, {}, nullptr, {}));
}

TEST(SubstringMatch, PatternSignsAreEscaped)
{
    char target[64];
    strcpy_special(target, "a$*+.[\\]^b?(){}|-\xc3\xbc");
    EXPECT_STREQ(target, "a\\$\\*\\+\\.\\[\\\\\\]\\^b?(){}|-\xc3\xbc");
    strcpy_special(target, "");
    EXPECT_STREQ(target, "");
    InitRegex();
}

}  // namespace
