// Soundex codes, held against the coding as it was published, and words.
#include <gtest/gtest.h>

#include <string>

#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/model/filter_evaluation.h"
#include "tests/support/slow_filter.h"

namespace {

std::string code_of(const char* text)
{
    const heap_text code(phonetic(text));
    EXPECT_EQ(test_support::slow_phonetic(text == nullptr ? "" : text), code.get());
    return code.get();
}

TEST(Phonetic, PartsEqualDigitsAtVowelsAndGoesOnBehindTheFirstWord)
{
    struct {
        const char* text;
        const char* code;
    } const table[] = {
        {"Tymczak", "T522"},
        {"Pfister", "P236"},
        {"Ashcraft", "A226"},
        {"Smith", "S530"},
        {"Smyth", "S530"},
        {"Ann", "A500"},
        {"12", "Z000"},
        {"", "Z000"},
        {nullptr, "Z000"},
        {"Zoo", "Z000"},
        {"Jackson", "J250"},
        {"a-b c", "A120"},
        {"Anne Marie Jones", "A556"},
        {"b1b b", "B000"},
        {"b\xc3\xbc"
         "b",
         "B000"},
        {" 1.x", "X000"},
        {"bcdlmr", "B234"},
        {"bab", "B100"},
        {"BhB", "B100"},
    };
    for (const auto& row : table) {
        EXPECT_EQ(code_of(row.text), row.code) << row.text;
    }
    for (char first = 'a'; first <= 'z'; ++first) {
        for (char c = 'A'; c <= 'Z'; ++c) {
            code_of((std::string(1, first) + c + "a" + c).c_str());
        }
    }
}

TEST(Phonetic, WordsAreRunsOfLettersAndControlCharacters)
{
    const std::string text = " 1-Ab\x01 c9d\xc3\xbc"
                             "e_\n";
    std::string words;
    for (const char* word = first_word(text.c_str()); word != nullptr; word = next_word(word)) {
        const heap_text copy(word_dup(word));
        words += std::string(copy.get()) + "|";
    }
    EXPECT_EQ(words, "Ab\x01|c|d|e|");
    EXPECT_TRUE(first_word("1 ,\xc3\xbc") == nullptr && first_word("") == nullptr && first_word(nullptr) == nullptr);
    EXPECT_TRUE(next_word(nullptr) == nullptr && next_word("") == nullptr && word_dup(nullptr) == nullptr);
    EXPECT_STREQ(next_word(" ab"), "ab");
    EXPECT_STREQ(heap_text(word_dup(" ab")).get(), "");
}

}  // namespace
