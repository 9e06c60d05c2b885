// Arrays of texts, beside vectors.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <random>
#include <string>
#include <vector>

#include "servers/vrnd/libdirbase/base/charray.h"
#include "servers/vrnd/libdirbase/base/slapi_ch.h"

namespace {

using texts = std::vector<std::string>;

texts read(char** array)
{
    texts result;
    for (char** text = array; text != nullptr && *text != nullptr; ++text) {
        result.emplace_back(*text);
    }
    return result;
}

char** make(const texts& from)
{
    char** array = nullptr;
    for (const std::string& text : from) {
        EXPECT_EQ(charray_add(&array, strdup(text.c_str())), 0);
    }
    return array;
}

char** without_elements()
{
    return static_cast<char**>(std::calloc(1, sizeof(char*)));
}

TEST(Charray, AdditionsTakeTheTextItselfAndGoByArrivalOrByLengthThenBytesThenArrival)
{
    const auto less = [](const char* a, const char* b) {
        const std::size_t lengths[] = {std::strlen(a), std::strlen(b)};
        return lengths[0] != lengths[1] ? lengths[0] < lengths[1] : std::strcmp(a, b) < 0;
    };
    std::mt19937 random(3);
    for (const bool sorted : {false, true}) {
        char** array = sorted ? without_elements() : nullptr;
        std::vector<char*> expected = {nullptr};
        for (int i = 0; i < 200; ++i) {
            std::string text(random() % 4, ' ');
            for (char& c : text) {
                c = "aAz\xc3"[random() % 4];
            }
            char* added = strdup(text.c_str());
            const auto end = expected.end() - 1;
            expected.insert(sorted ? std::upper_bound(expected.begin(), end, added, less) : end, added);
            ASSERT_EQ((sorted ? charray_add_sorted_by_len : charray_add)(&array, added), 0);
            ASSERT_TRUE(std::equal(expected.begin(), expected.end(), array)) << "at " << i;
        }
        charray_free(array);
    }
    char** array = nullptr;
    EXPECT_EQ(charray_add_sorted_by_len(&array, strdup("a")), 0);
    EXPECT_EQ(read(array), texts{"a"});
    charray_free(array);
    charray_free(nullptr);
}

TEST(Charray, MergingAppendsTheTextsOrCopiesAndACopyIsDeepAndOfNothingNull)
{
    const texts lists[] = {{}, {"a"}, {"b", "cc"}, {"", "d", "d"}};
    for (const texts& first : lists) {
        for (const texts& second : lists) {
            texts expected = first;
            expected.insert(expected.end(), second.begin(), second.end());

            char** array = make(first);
            char** other = second.empty() ? without_elements() : make(second);
            EXPECT_EQ(charray_merge_copy(&array, other), 0);
            EXPECT_EQ(read(array), expected);
            EXPECT_EQ(read(other), second);
            charray_free(array);

            char** copy = charray_dup(other);
            EXPECT_EQ(read(copy), second);
            EXPECT_EQ(copy == nullptr, second.empty());
            charray_free(copy);

            array = make(first);
            EXPECT_EQ(charray_merge(&array, other), 0);
            EXPECT_EQ(read(array), expected);
            EXPECT_TRUE(std::equal(other, other + second.size(), array + first.size())) << "the texts themselves";
            std::free(other);
            charray_free(array);
        }
    }
    EXPECT_EQ(charray_dup(nullptr), nullptr);
}

TEST(Charray, LookUpIgnoresCaseAndTellsWhere)
{
    char** array = make({"cn", "sn", "CN", "title"});
    const struct {
        const char* text;
        int found;
        int index;
    } cases[] = {{"Cn", 1, 0}, {"SN", 1, 1}, {"tItLe", 1, 3}, {"titl", 0, 4}, {"titles", 0, 4}, {"", 0, 4}};
    for (const auto& c : cases) {
        int index = -1;
        EXPECT_EQ(charray_inlist(array, c.text), c.found) << c.text;
        EXPECT_EQ(charray_inlist_with_index(array, c.text, &index), c.found) << c.text;
        EXPECT_EQ(index, c.index) << c.text;
    }
    charray_free(array);
}

TEST(Str2Charray, PartsLieBetweenRunsOfSeparators)
{
    const struct {
        const char* text;
        const char* separators;
        texts parts;
    } cases[] = {
        {",a b,,c,", ", ", {"a", "b", "c"}},
        {"a\xc3\xa9 b", " ", {"a\xc3\xa9", "b"}},
        {"abc", ",", {"abc"}},
        {"abc", "", {"abc"}},
        {",,,", ",", {}},
        {"", ",", {}},
    };
    for (const auto& c : cases) {
        std::string text = c.text;
        char** array = str2charray(text.data(), c.separators);
        ASSERT_NE(array, nullptr) << c.text;
        EXPECT_EQ(read(array), c.parts) << c.text;
        charray_free(array);
    }
}

TEST(SlapiCh, BlocksMixWithThoseOfMallocAndNullIsAllowed)
{
    EXPECT_EQ(slapi_ch_strdup(nullptr), nullptr);
    slapi_ch_free(nullptr);
    char* copy = static_cast<char*>(slapi_ch_realloc(slapi_ch_strdup("a text"), 100));
    EXPECT_STREQ(copy, "a text");
    std::free(copy);
    auto* zeros = static_cast<char*>(slapi_ch_calloc(10, 10));
    EXPECT_EQ(std::count(zeros, zeros + 100, '\0'), 100);
    slapi_ch_free(zeros);
    slapi_ch_free(slapi_ch_malloc(100));
    EXPECT_LT(slapi_ch_strcmp("a", "b"), 0);
    EXPECT_GT(slapi_ch_strcmp("a", "B"), 0);
    EXPECT_EQ(slapi_ch_strncmp("abc", "abd", 2), 0);
    EXPECT_LT(slapi_ch_strncmp("abc", "abd", 3), 0);
}

}  // namespace
