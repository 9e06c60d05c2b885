// The case maps against the C library's, which come from the Unicode data by another way. The maps are meant to differ
// from Unicode in places; each difference has to be accounted for by a rule.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <limits>
#include <map>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include <locale.h>
#include <wctype.h>

#include "servers/vrnd/libdirbase/base/uni_case.h"
#include "tests/servers/vrnd/libdirbase/base/slow_utf8.h"

using test_support::slow_encode;

namespace {

constexpr std::int32_t end_of_range = 0x10000;

// Where mappings may be.
using coverage = std::vector<std::pair<std::int32_t, std::int32_t>>;
const coverage upper_coverage = {{0x0000, 0x01FF}, {0x03A0, 0x03CE}, {0x0430, 0x045F},
                                 {0x0490, 0x04CC}, {0x1E00, 0x1FFC}, {0xFF40, 0xFF5A}};
const coverage lower_coverage = {{0x0000, 0x01FF}, {0x0380, 0x03AB}, {0x0400, 0x042F},
                                 {0x0490, 0x04CB}, {0x1E00, 0x1FF7}, {0xFF20, 0xFF3A}};

// Characters that Unicode has come to map since, or maps to where the tables don't lead.
const std::set<std::int32_t> never_upper = {0x00B5, 0x0131, 0x017F, 0x0180, 0x0195, 0x019A, 0x019B,
                                            0x019E, 0x01BF, 0x0450, 0x045D, 0x04C6, 0x04CA, 0x1EFB,
                                            0x1EFD, 0x1EFF, 0x1F78, 0x1F79, 0x1FBE};
const std::set<std::int32_t> never_lower = {0x0181, 0x0186, 0x0189, 0x018A, 0x018F, 0x0190, 0x0193, 0x0194,
                                            0x0196, 0x0197, 0x019C, 0x019D, 0x019F, 0x01A6, 0x01A9, 0x01AE,
                                            0x01B1, 0x01B2, 0x01B7, 0x01F6, 0x01F7, 0x0400, 0x040D, 0x04C0,
                                            0x04C5, 0x04C9, 0x1EFA, 0x1EFC, 0x1EFE};

struct direction {
    const char* name;
    std::int32_t (*map)(std::int32_t);
    wint_t (*unicode)(wint_t, locale_t);
    const coverage& covered;
    const std::set<std::int32_t>& never;
    int on_the_list;  // how many differences there are at least: Unicode maps U+019B since its version 16 only
    int too_far;
};

std::string rule_for(const direction& side, std::int32_t character, std::int32_t by_unicode)
{
    const bool covered = std::any_of(side.covered.begin(), side.covered.end(), [&](const auto& run) {
        return run.first <= character && character <= run.second;
    });
    if (!covered)
        return "not covered";
    if (side.never.count(character) != 0)
        return "on the list";
    if (by_unicode - character < -128 || by_unicode - character > 127)
        return "too far for a signed byte";
    return "none";
}

TEST(UniCase, EveryDifferenceFromUnicodeHasARuleAndLeavesTheCharacterAlone)
{
    const locale_t unicode = newlocale(LC_CTYPE_MASK, "C.UTF-8", nullptr);
    ASSERT_NE(unicode, nullptr);
    const direction table[] = {
        {"upper", UniToupper, towupper_l, upper_coverage, never_upper, 18, 0},
        {"lower", UniTolower, towlower_l, lower_coverage, never_lower, 29, 2},  // U+0130 to i, U+1E9E to U+00DF
    };
    for (const direction& side : table) {
        std::map<std::string, int> differences;
        for (std::int32_t character = 0; character < end_of_range; ++character) {
            const auto by_unicode = static_cast<std::int32_t>(side.unicode(static_cast<wint_t>(character), unicode));
            const std::int32_t mapped = side.map(character);
            if (mapped == by_unicode)
                continue;
            const std::string rule = rule_for(side, character, by_unicode);
            EXPECT_NE(rule, "none") << side.name << std::hex << " U+" << character << " maps to U+" << mapped
                                    << ", in Unicode to U+" << by_unicode;
            EXPECT_EQ(mapped, character) << side.name << std::hex << " U+" << character << ", " << rule;
            ++differences[rule];
        }
        EXPECT_GT(differences["not covered"], 500) << side.name;
        EXPECT_GE(differences["on the list"], side.on_the_list) << side.name;
        EXPECT_EQ(differences["too far for a signed byte"], side.too_far) << side.name;
    }
    freelocale(unicode);
}

TEST(UniCase, TheCharactersOnTheListsStayAsTheyAre)
{
    for (const std::int32_t character : never_upper)
        EXPECT_EQ(UniToupper(character), character);
    for (const std::int32_t character : never_lower)
        EXPECT_EQ(UniTolower(character), character);
}

TEST(UniCase, NotedMappings)
{
    struct mapping {
        std::int32_t from;
        std::int32_t upper;
        std::int32_t lower;
    };
    const mapping table[] = {
        {0x00E9, 0x00C9, 0x00E9},                            // Latin-1
        {0x00FF, 0x0178, 0x00FF},                            // the small letter is in Latin-1, the capital isn't
        {0x0178, 0x0178, 0x00FF}, {0x018E, 0x018E, 0x01DD},  // the farthest to lower case but one
        {0x01C5, 0x01C4, 0x01C6},                            // a title case letter has both
        {0x03B1, 0x0391, 0x03B1}, {0x03C2, 0x03A3, 0x03C2},  // final sigma
        {0x03A3, 0x03A3, 0x03C3}, {0x0430, 0x0410, 0x0430},
        {0xFF41, 0xFF21, 0xFF41}, {0x1F80, 0x1F88, 0x1F80},  // with iota subscript: title case stands for upper case
        {0x1F97, 0x1F9F, 0x1F97}, {0x1FA7, 0x1FAF, 0x1FA7},
        {0x1FB3, 0x1FBC, 0x1FB3}, {0x1FC3, 0x1FCC, 0x1FC3},
        {0x1FF3, 0x1FFC, 0x1FF3}, {0x1FFC, 0x1FFC, 0x1FFC},  // the list to lower case ends in front of it
        {0x0531, 0x0531, 0x0531},                            // Armenian
        {0x10D0, 0x10D0, 0x10D0},                            // Georgian
        {0x0250, 0x0250, 0x0250},                            // from here to Greek nothing is covered
    };
    for (const mapping& row : table) {
        EXPECT_EQ(UniToupper(row.from), row.upper) << std::hex << row.from;
        EXPECT_EQ(UniTolower(row.from), row.lower) << std::hex << row.from;
    }
}

TEST(UniCase, NoMappingChangesTheLengthInUtf8)
{
    for (std::int32_t character = 1; character < end_of_range; ++character) {
        const std::size_t length = slow_encode(character).size();
        ASSERT_EQ(slow_encode(UniToupper(character)).size(), length) << std::hex << character;
        ASSERT_EQ(slow_encode(UniTolower(character)).size(), length) << std::hex << character;
    }
}

TEST(UniCase, NumbersThatAreNoCharacterOfTheTablesComeBack)
{
    const std::int32_t table[] = {-1,      -0x61,   -512,    std::numeric_limits<std::int32_t>::min(), 0x10000,
                                  0x10061, 0x10428, 0x1E921, std::numeric_limits<std::int32_t>::max()};
    for (const std::int32_t number : table) {
        EXPECT_EQ(UniToupper(number), number);
        EXPECT_EQ(UniTolower(number), number);
    }
}

TEST(UniCase, TheRangeListsCoverWhatTheyShouldInRisingOrderAndEndWithZero)
{
    const auto runs = [](const UniCaseRange* range) {
        coverage found = {{0, 0x1FF}};
        for (; range->first != 0; ++range)
            found.emplace_back(range->first, range->last);
        return found;
    };
    EXPECT_EQ(runs(UniUpperRange), upper_coverage);
    EXPECT_EQ(runs(UniLowerRange), lower_coverage);
    EXPECT_EQ(UniUpperTable['a'], -32);
    EXPECT_EQ(UniLowerTable[0x178], -121);
}

TEST(UniCase, AnArrayIsMappedInPlaceUpToItsZero)
{
    std::int32_t text[] = {'a', 0x3B1, 0x4E00, 'B', 0, 'c'};
    EXPECT_EQ(UniStrupr(text), text);
    EXPECT_EQ(std::vector<std::int32_t>(text, text + 6), (std::vector<std::int32_t>{'A', 0x391, 0x4E00, 'B', 0, 'c'}));
    EXPECT_EQ(UniStrlwr(text), text);
    EXPECT_EQ(std::vector<std::int32_t>(text, text + 6), (std::vector<std::int32_t>{'a', 0x3B1, 0x4E00, 'b', 0, 'c'}));
    EXPECT_EQ(UniStrupr(nullptr), nullptr);
    EXPECT_EQ(UniStrlwr(nullptr), nullptr);
}

}  // namespace
