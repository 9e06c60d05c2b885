// Internal to the library: writing one line of LDIF whose lengths are known. line64.h tells the rules.
//
// Nearly all values are short, safe and need no fold. They are tested and copied in one pass, inline; everything
// else is left to ldif_write_special.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>

#if defined(__SSE2__)
#include <emmintrin.h>
#endif

constexpr int ldif_column_limit = 76;

// Sixteen bytes, and a mask with all bits of a byte set or none.
using ldif_block = unsigned char __attribute__((vector_size(16)));
using ldif_mask = signed char __attribute__((vector_size(16)));
using ldif_words = std::uint64_t __attribute__((vector_size(16)));

template <typename T>
T ldif_load(const char* from)
{
    T word;
    std::memcpy(&word, from, sizeof word);
    return word;
}

// Marks the plain bytes, 0x20 to 0x7E, which are safe anywhere: moved to the bottom of the signed numbers they are
// below all others.
inline ldif_mask ldif_plain(ldif_block block)
{
    return reinterpret_cast<ldif_mask>(block + 0x60) < static_cast<signed char>(0x7f + 0x60 - 0x100);
}

inline bool ldif_all(ldif_mask mask)
{
#if defined(__SSE2__)
    return _mm_movemask_epi8(reinterpret_cast<__m128i>(mask)) == 0xffff;
#else
    const auto words = reinterpret_cast<ldif_words>(mask);
    return (words[0] & words[1]) == ~std::uint64_t{0};
#endif
}

inline bool ldif_all_plain(std::uint64_t first, std::uint64_t second)
{
    return ldif_all(ldif_plain(reinterpret_cast<ldif_block>(ldif_words{first, second})));
}

inline bool ldif_is_plain(char c)
{
    return c >= 0x20 && c < 0x7f;
}

// Copies bytes, the last ones perhaps twice, and never touches one outside. Returns whether all are plain.
inline bool ldif_copy(char* to, const char* from, std::size_t length)
{
    if (length >= 16) {
        const std::size_t last = length - 16;
        const auto end = ldif_load<ldif_block>(from + last);
        ldif_mask plain = ldif_plain(end);
        for (std::size_t at = 0; at < last; at += 16) {
            const auto block = ldif_load<ldif_block>(from + at);
            std::memcpy(to + at, &block, sizeof block);
            plain &= ldif_plain(block);
        }
        std::memcpy(to + last, &end, sizeof end);
        return ldif_all(plain);
    }
    if (length >= 8) {
        const auto first = ldif_load<std::uint64_t>(from);
        const auto last = ldif_load<std::uint64_t>(from + length - 8);
        std::memcpy(to, &first, 8);
        std::memcpy(to + length - 8, &last, 8);
        return ldif_all_plain(first, last);
    }
    if (length >= 4) {
        const auto first = ldif_load<std::uint32_t>(from);
        const auto last = ldif_load<std::uint32_t>(from + length - 4);
        std::memcpy(to, &first, 4);
        std::memcpy(to + length - 4, &last, 4);
        const std::uint64_t both = std::uint64_t{first} << 32 | last;
        return ldif_all_plain(both, both);
    }
    if (length == 0) {
        return true;
    }
    const char first = from[0];
    const char middle = from[length / 2];
    const char last = from[length - 1];
    to[0] = first;
    to[length / 2] = middle;
    to[length - 1] = last;
    return ldif_is_plain(first) && ldif_is_plain(middle) && ldif_is_plain(last);
}

// Whether a safe value may begin so. Most begin with a letter.
inline bool ldif_is_first(char c)
{
    return c > '<' || (c != ' ' && c != ':' && c != '<');
}

inline char* ldif_write_colon(char* behind_type)
{
    // NOLINTNEXTLINE(clang-analyzer-core.NullDereference): a position in a buffer, which callers have
    behind_type[0] = ':';
    behind_type[1] = ' ';
    return behind_type + 2;
}

// Writes the rest of a line behind "type: ", a value of any bytes with its line feed. Returns the position behind it.
//
//   out   behind ": "
//   used  columns up to there
char* ldif_write_special(char* out, std::size_t used, const char* value, std::size_t length);

// The same, with the frequent case inline.
inline char* ldif_write_value(char* out, std::size_t used, const char* value, std::size_t length)
{
    if (length != 0 && value != nullptr && used + length <= std::size_t{ldif_column_limit} && ldif_is_first(*value) &&
        ldif_copy(out, value, length)) {
        out[length] = '\n';
        return out + length + 1;
    }
    return ldif_write_special(out, used, value, length);
}

// Writes a line. Returns the position behind it.
inline char* ldif_write_line(char* out, const char* type, std::size_t type_length, const char* value,
                             std::size_t length)
{
    ldif_copy(out, type, type_length);
    return ldif_write_value(ldif_write_colon(out + type_length), type_length + 2, value, length);
}
