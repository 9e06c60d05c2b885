// Internal to the model: the Soundex code without a block of its own.
#pragma once

#include <string_view>

struct phonetic_code {
    char text[5];  // a letter, three digits, a zero byte

    friend bool operator==(const phonetic_code&, const phonetic_code&) = default;
};

// The code of a text, which may hold any bytes; "Z000" where none is an ASCII letter.
phonetic_code phonetic_code_of(std::string_view text);
