// UTF-8 and folding once more, slow and obvious: what the tests and the fuzzer compare the library with.
#pragma once

#include <bitset>
#include <cstddef>
#include <cstdint>
#include <string>

namespace test_support {

struct slow_character {
    int length = -1;  // bytes, or -1 when no character stands there
    std::int32_t value = 0;
};

// The character at `at` in a text without zero bytes; its end stands for the terminator.
inline slow_character slow_decode(const std::string& text, std::size_t at)
{
    const auto bits_at = [&](std::size_t index) {
        const char byte = index < text.size() ? text[index] : '\0';
        return std::bitset<8>(static_cast<unsigned char>(byte)).to_string();
    };
    struct form {
        const char* lead;
        int length;
    };
    for (const form& known : {form{"0", 1}, form{"110", 2}, form{"1110", 3}}) {
        const std::string lead = known.lead;
        if (bits_at(at).compare(0, lead.size(), lead) != 0)
            continue;
        std::string bits = bits_at(at).substr(lead.size());
        for (int i = 1; i < known.length; ++i) {
            const std::string next = bits_at(at + static_cast<std::size_t>(i));
            if (next.compare(0, 2, "10") != 0)
                return {};
            bits += next.substr(2);
        }
        return {known.length, static_cast<std::int32_t>(std::bitset<32>(bits).to_ulong())};
    }
    return {};
}

// The UTF-8 form of a character from 0 to 0xFFFF.
inline std::string slow_encode(std::int32_t character)
{
    const std::string bits = std::bitset<16>(static_cast<unsigned>(character)).to_string();
    std::string pattern;
    if (character < 0x80)
        pattern = "0" + bits.substr(9);
    else if (character < 0x800)
        pattern = "110" + bits.substr(5, 5) + "10" + bits.substr(10);
    else
        pattern = "1110" + bits.substr(0, 4) + "10" + bits.substr(4, 6) + "10" + bits.substr(10);
    std::string text;
    for (std::size_t at = 0; at < pattern.size(); at += 8)
        text += static_cast<char>(std::bitset<8>(pattern.substr(at, 8)).to_ulong());
    return text;
}

// Folds a text without zero bytes, character by character, as utfToUpper and utfToLower do by UniToupper and
// UniTolower.
inline int slow_fold(std::string& text, std::int32_t (*map)(std::int32_t))
{
    const std::string before = text;
    for (std::size_t at = 0; at < before.size();) {
        const slow_character found = slow_decode(before, at);
        if (found.length < 0)
            return -1;
        const std::string mapped = slow_encode(map(found.value));
        text.replace(at, mapped.size(), mapped);
        at += static_cast<std::size_t>(found.length);
    }
    return 0;
}

}  // namespace test_support
