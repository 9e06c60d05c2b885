// Arrays of texts, beside vectors of strings.
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
    for (char** text = array; text != nullptr && *text != nullptr; ++text)
        result.emplace_back(*text);
    return result;
}

char** make(const texts& from)
{
    char** array = nullptr;
    for (const std::string& text : from)
        EXPECT_EQ(charray_add(&array, strdup(text.c_str())), 0);
    return array;
}

char** without_elements()
{
    return static_cast<char**>(std::calloc(1, sizeof(char*)));
}

TEST(Charray, AdditionsKeepTheirOrderAndTakeTheTextItself)
{
    char** array = nullptr;
    texts expected;
    for (int i = 0; i < 50; ++i) {
        expected.push_back(std::to_string(i));
        char* text = strdup(expected.back().c_str());
        ASSERT_EQ(charray_add(&array, text), 0);
        ASSERT_EQ(array[i], text);
        ASSERT_EQ(read(array), expected);
    }
    charray_free(array);
    charray_free(nullptr);
}

TEST(Charray, SortedAdditionsGoByLengthThenBytesThenArrival)
{
    const auto less = [](const std::string& a, const std::string& b) {
        return a.size() != b.size() ? a.size() < b.size() : std::strcmp(a.c_str(), b.c_str()) < 0;
    };
    std::mt19937 random(3);
    char** array = nullptr;
    std::vector<char*> arrived;
    for (int i = 0; i < 300; ++i) {
        std::string text(random() % 4, ' ');
        for (char& c : text)
            c = "aAz\xc3"[random() % 4];
        arrived.push_back(strdup(text.c_str()));
        ASSERT_EQ(charray_add_sorted_by_len(&array, arrived.back()), 0);
    }
    std::stable_sort(arrived.begin(), arrived.end(), less);
    arrived.push_back(nullptr);
    EXPECT_TRUE(std::equal(arrived.begin(), arrived.end(), array));
    charray_free(array);

    char** few = without_elements();
    for (const char* text : {"bb", "a", "ccc", "aa"})
        ASSERT_EQ(charray_add_sorted_by_len(&few, strdup(text)), 0);
    EXPECT_EQ(read(few), (texts{"a", "aa", "bb", "ccc"}));
    charray_free(few);
}

TEST(Charray, MergingAppendsTheTextsOrCopiesOfThem)
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

            array = make(first);
            EXPECT_EQ(charray_merge(&array, other), 0);
            EXPECT_EQ(read(array), expected);
            EXPECT_TRUE(std::equal(second.begin(), second.end(), array + first.size(), array + expected.size()));
            EXPECT_TRUE(std::equal(other, other + second.size(), array + first.size())) << "the texts themselves";
            std::free(other);
            charray_free(array);
        }
    }
}

TEST(Charray, LookUpIgnoresCaseAndTellsWhere)
{
    char** array = make({"cn", "sn", "CN", "title"});
    const struct {
        const char* text;
        int found;
        int index;
    } cases[] = {
        {"cn", 1, 0}, {"Cn", 1, 0}, {"SN", 1, 1}, {"tItLe", 1, 3}, {"titl", 0, 4}, {"titles", 0, 4}, {"", 0, 4},
    };
    for (const auto& c : cases) {
        int index = -1;
        EXPECT_EQ(charray_inlist(array, c.text), c.found) << c.text;
        EXPECT_EQ(charray_inlist_with_index(array, c.text, &index), c.found) << c.text;
        EXPECT_EQ(index, c.index) << c.text;
    }
    charray_free(array);

    char** empty = without_elements();
    int index = -1;
    EXPECT_EQ(charray_inlist_with_index(empty, "cn", &index), 0);
    EXPECT_EQ(index, 0);
    charray_free(empty);
}

TEST(Charray, ACopyIsDeepAndNothingIsCopiedToNull)
{
    char** array = make({"one", "", "three"});
    char** copy = charray_dup(array);
    EXPECT_EQ(read(copy), read(array));
    for (int i = 0; i < 3; ++i)
        EXPECT_NE(copy[i], array[i]);
    charray_free(array);
    charray_free(copy);

    EXPECT_EQ(charray_dup(nullptr), nullptr);
    char** empty = without_elements();
    EXPECT_EQ(charray_dup(empty), nullptr);
    charray_free(empty);
}

TEST(Str2Charray, PartsLieBetweenRunsOfSeparators)
{
    const struct {
        const char* text;
        const char* separators;
        texts parts;
    } cases[] = {
        {"a,b,c", ",", {"a", "b", "c"}},
        {"a,,b", ",", {"a", "b"}},
        {",a b,", ", ", {"a", "b"}},
        {"abc", ",", {"abc"}},
        {"abc", "", {"abc"}},
        {"a\xc3\xa9 b", " ", {"a\xc3\xa9", "b"}},
        {"a;b:;c", ":;", {"a", "b", "c"}},
        {",,,", ",", {}},
        {"", ",", {}},
        {"", "", {}},
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

    const char text[] = "a text";
    char* copy = slapi_ch_strdup(text);
    EXPECT_NE(copy, text);
    EXPECT_STREQ(copy, text);
    copy = static_cast<char*>(slapi_ch_realloc(copy, 100));
    EXPECT_STREQ(copy, text);
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
