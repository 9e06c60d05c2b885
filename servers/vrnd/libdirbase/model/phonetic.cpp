// The Soundex code of texts, and their words: see filter_evaluation.h. All of it goes by ASCII, whatever the locale.
#include "servers/vrnd/libdirbase/model/phonetic.h"

#include <cstring>

#include "servers/vrnd/libdirbase/model/filter_evaluation.h"

namespace {

// The digit of each letter; equal digits sound alike.
constexpr char digits[] = "01230120022455012623010202";

bool is_letter(char c)
{
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}

char upper(char letter)
{
    return letter >= 'a' ? static_cast<char>(letter - 'a' + 'A') : letter;
}

// What is left of the ASCII characters without white space, punctuation and digits: letters and control characters.
bool is_word_character(char c)
{
    const auto byte = static_cast<unsigned char>(c);
    const bool white_space = byte >= '\t' && byte <= '\r';
    const bool control = (byte != 0 && byte < ' ' && !white_space) || byte == 0x7f;
    return is_letter(c) || control;
}

const char* skip_word(const char* text)
{
    while (is_word_character(*text)) {
        ++text;
    }
    return text;
}

}  // namespace

phonetic_code phonetic_code_of(std::string_view text)
{
    phonetic_code code = {"Z000"};
    std::size_t written = 0;
    char last = '0';
    for (const char c : text) {
        if (!is_letter(c)) {
            continue;
        }
        const char digit = digits[upper(c) - 'A'];
        if (written == 0) {
            code.text[written++] = upper(c);
        } else if (digit != last && digit != '0') {
            code.text[written++] = digit;
        }
        last = digit;
        if (written == 4) {
            break;
        }
    }
    return code;
}

extern "C" {

char* phonetic(const char* text)
{
    return strdup(phonetic_code_of(text == nullptr ? std::string_view() : std::string_view(text)).text);
}

const char* first_word(const char* text)
{
    if (text == nullptr) {
        return nullptr;
    }
    while (*text != '\0' && !is_word_character(*text)) {
        ++text;
    }
    return *text == '\0' ? nullptr : text;
}

const char* next_word(const char* text)
{
    return text == nullptr ? nullptr : first_word(skip_word(text));
}

char* word_dup(const char* text)
{
    return text == nullptr ? nullptr : strndup(text, static_cast<std::size_t>(skip_word(text) - text));
}

}  // extern "C"
