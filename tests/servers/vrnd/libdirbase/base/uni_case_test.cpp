// The case maps against the C library's, which come from the Unicode data by another way. The maps are meant to differ
// from Unicode in places; each difference has to be accounted for by a rule.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <limits>
#include <set>
#include <utility>
#include <vector>

#include <locale.h>
#include <wctype.h>

#include "servers/vrnd/libdirbase/base/uni_case.h"

namespace {

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

TEST(UniCase, EveryCharacterMapsAsInUnicodeOrHasARuleToStayAsItIs)
{
    const locale_t unicode = newlocale(LC_CTYPE_MASK, "C.UTF-8", nullptr);
    ASSERT_NE(unicode, nullptr);
    const struct {
        const char* name;
        std::int32_t (*map)(std::int32_t);
        wint_t (*unicode)(wint_t, locale_t);
        const coverage& covered;
        const std::set<std::int32_t>& never;
        int too_far;  // for a signed byte
    } table[] = {
        {"upper", UniToupper, towupper_l, upper_coverage, never_upper, 0},
        {"lower", UniTolower, towlower_l, lower_coverage, never_lower, 2},  // U+0130 to i, U+1E9E to U+00DF
    };
    for (const auto& side : table) {
        int too_far = 0;
        for (std::int32_t character = 0; character < 0x10000; ++character) {
            const auto by_unicode = static_cast<std::int32_t>(side.unicode(static_cast<wint_t>(character), unicode));
            const bool covered = std::any_of(side.covered.begin(), side.covered.end(), [&](const auto& run) {
                return run.first <= character && character <= run.second;
            });
            const bool stays = !covered || side.never.count(character) != 0;
            const bool far = by_unicode - character < -128 || by_unicode - character > 127;
            too_far += !stays && far;
            EXPECT_EQ(side.map(character), stays || far ? character : by_unicode)
                << side.name << std::hex << " U+" << character;
        }
        EXPECT_EQ(too_far, side.too_far) << side.name;
    }
    freelocale(unicode);
}

TEST(UniCase, NumbersThatAreNoCharacterOfTheTablesComeBack)
{
    using limits = std::numeric_limits<std::int32_t>;
    for (const std::int32_t number : {-1, -0x61, -512, limits::min(), 0x10000, 0x10061, 0x10428, limits::max()}) {
        EXPECT_EQ(UniToupper(number), number);
        EXPECT_EQ(UniTolower(number), number);
    }
}

TEST(UniCase, TheRangeListsCoverWhatTheyShouldInRisingOrderAndEndWithZero)
{
    const auto runs = [](const UniCaseRange* range) {
        coverage found = {{0, 0x1FF}};
        for (; range->first != 0; ++range) {
            found.emplace_back(range->first, range->last);
        }
        return found;
    };
    EXPECT_EQ(runs(UniUpperRange), upper_coverage);
    EXPECT_EQ(runs(UniLowerRange), lower_coverage);
    EXPECT_EQ(UniUpperTable['a'], -32);
    EXPECT_EQ(UniLowerTable[0x178], -121);
}

TEST(UniCase, AnArrayIsMappedInPlaceUpToItsZero)
{
    using characters = std::vector<std::int32_t>;
    characters text = {'a', 0x3B1, 0x4E00, 'B', 0, 'c'};
    EXPECT_EQ(UniStrupr(text.data()), text.data());
    EXPECT_EQ(text, (characters{'A', 0x391, 0x4E00, 'B', 0, 'c'}));
    EXPECT_EQ(UniStrlwr(text.data()), text.data());
    EXPECT_EQ(text, (characters{'a', 0x3B1, 0x4E00, 'b', 0, 'c'}));
    EXPECT_EQ(UniStrupr(nullptr), nullptr);
    EXPECT_EQ(UniStrlwr(nullptr), nullptr);
}

}  // namespace
