// Classes of characters in distinguished names, shared by the routines of this folder (RFC 4514 section 3).
//
// Letters and digits are those of ASCII whatever the locale, and a byte of 0x80 and above is in no class.
#pragma once

#include <array>
#include <cstdint>

namespace dn_chars {

constexpr std::uint16_t blank = 0x01;      // space, line feed, tab: passed over beside separators
constexpr std::uint16_t special = 0x02;    // " + , ; < = > and the backslash: stand for themselves only when escaped
constexpr std::uint16_t separator = 0x04;  // , ; +
constexpr std::uint16_t hash = 0x08;
constexpr std::uint16_t hex = 0x10;
constexpr std::uint16_t digit = 0x20;
constexpr std::uint16_t letter = 0x40;
constexpr std::uint16_t name = 0x80;  // letters, digits, hyphen: what a type's name is made of
constexpr std::uint16_t end = 0x100;  // the byte 0

constexpr std::array<std::uint16_t, 256> table = [] {
    std::array<std::uint16_t, 256> classes{};
    const auto add = [&](const char* characters, unsigned bits) {
        for (; *characters != '\0'; ++characters) {
            std::uint16_t& entry = classes[static_cast<unsigned char>(*characters)];
            entry = static_cast<std::uint16_t>(entry | bits);
        }
    };
    add(" \n\t", blank);
    add("\"+,;<=>\\", special);
    add(",;+", separator);
    add("#", hash);
    add("0123456789", hex | digit | name);
    add("abcdefABCDEF", hex);
    add("abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ", letter | name);
    add("-", name);
    classes[0] = end;
    return classes;
}();

// Whether a character is in one of the classes.
inline bool is(char c, unsigned classes)
{
    return (table[static_cast<unsigned char>(c)] & classes) != 0;
}

// The value of a hexadecimal digit.
inline unsigned hex_value(char c)
{
    return is(c, digit) ? static_cast<unsigned>(c - '0') : (static_cast<unsigned char>(c) | 0x20u) - 'a' + 10u;
}

// The byte of two hexadecimal digits.
inline char hex_byte(const char* digits)
{
    return static_cast<char>(hex_value(digits[0]) << 4 | hex_value(digits[1]));
}

}  // namespace dn_chars
