// UTF-8 and the folding of text.
//
// A text is measured once, and folded with that as its bound: runs of ASCII by words of eight bytes, characters of two
// and three bytes by the pages of uni_case_pages.h, which are named by the front bytes as they stand. What is rare (an
// overlong form) goes the long way through a character and back.
#include "servers/vrnd/libdirbase/base/utf8_text.h"

#include <cstddef>
#include <cstring>

#include "servers/vrnd/libdirbase/base/uni_case.h"
#include "servers/vrnd/libdirbase/base/uni_case_pages.h"

namespace {

using byte = unsigned char;
using word = std::uint64_t;

constexpr bool is_continuation(byte value)
{
    return (value & 0xC0) == 0x80;
}

// Whether a proper form (not an overlong one) of two, or of three, bytes stands here.
bool is_two(const byte* at)
{
    return at[0] >= 0xC2 && at[0] < 0xE0 && is_continuation(at[1]);
}

bool is_three(const byte* at)
{
    return at[0] >= 0xE0 && at[0] < 0xF0 && is_continuation(at[1]) && is_continuation(at[2]) &&
           (at[0] != 0xE0 || at[1] >= 0xA0);
}

constexpr word in_every_byte(byte value)
{
    return value * word{0x0101010101010101};
}

// A case to fold to: the letters of ASCII that change, and the tables for the rest.
struct upper_case {
    static constexpr byte first = 'a';
    static constexpr byte last = 'z';
    static const uni_case_pages& pages() { return uni_upper_pages; }
    static std::int32_t map(std::int32_t character) { return UniToupper(character); }
};

struct lower_case {
    static constexpr byte first = 'A';
    static constexpr byte last = 'Z';
    static const uni_case_pages& pages() { return uni_lower_pages; }
    static std::int32_t map(std::int32_t character) { return UniTolower(character); }
};

constexpr byte case_bit = 'a' - 'A';

// Eight bytes below 0x80. The two sums carry into the top bit of a byte from the first letter on, and from behind the
// last.
template <typename Case>
constexpr word fold_word(word text)
{
    const word from_first = text + in_every_byte(0x80 - Case::first);
    const word behind_last = text + in_every_byte(0x80 - (Case::last + 1));
    const word letters = from_first & ~behind_last & in_every_byte(0x80);
    return text ^ (letters >> 2);
}
static_assert(0x80 >> 2 == case_bit);

// Folds words while they are all ASCII; returns the first byte of the word that isn't, or of the last few bytes.
template <typename Case>
byte* fold_words(byte* at, const byte* end)
{
    for (word text; end - at >= static_cast<std::ptrdiff_t>(sizeof text); at += sizeof text) {
        std::memcpy(&text, at, sizeof text);
        if ((text & in_every_byte(0x80)) != 0)
            break;
        text = fold_word<Case>(text);
        std::memcpy(at, &text, sizeof text);
    }
    return at;
}

template <typename Case>
byte* fold_ascii(byte* at, const byte* end)
{
    at = fold_words<Case>(at, end);
    for (; at != end && *at < 0x80; ++at) {
        if (*at >= Case::first && *at <= Case::last)
            *at ^= case_bit;
    }
    return at;
}

// The difference of the character whose front bytes give `page` and whose last byte is `last`.
template <typename Case>
int difference_of(std::size_t page, byte last)
{
    const uni_case_pages& pages = Case::pages();
    return pages.pages[pages.page_of[page]][last & 0x3F];
}

// Changes a page by the carry out of its 64 places, and returns the place.
constexpr byte carry(std::size_t& page, byte last, int difference)
{
    const std::ptrdiff_t place = (last & 0x3F) + difference;  // -128 to 190
    page = static_cast<std::size_t>(static_cast<std::ptrdiff_t>(page) + (place >> 6));
    return static_cast<byte>(0x80 | (place & 0x3F));
}

template <typename Case>
void fold_two(byte* at)
{
    std::size_t page = at[0] & 0x1Fu;
    if (const int difference = difference_of<Case>(page, at[1]); difference != 0) {
        at[1] = carry(page, at[1], difference);
        at[0] = static_cast<byte>(0xC0 | page);
    }
}

template <typename Case>
void fold_three(byte* at)
{
    std::size_t page = (at[0] & 0x0Fu) << 6 | (at[1] & 0x3Fu);
    if (const int difference = difference_of<Case>(page, at[2]); difference != 0) {
        at[2] = carry(page, at[2], difference);
        at[0] = static_cast<byte>(0xE0 | page >> 6);
        at[1] = static_cast<byte>(0x80 | (page & 0x3F));
    }
}

template <typename Case>
int fold_any(byte* at)
{
    std::int32_t character = 0;
    const int length = utf8towc(&character, reinterpret_cast<const char*>(at));
    if (length > 0)
        wctoutf8(reinterpret_cast<char*>(at), Case::map(character));
    return length;
}

template <typename Case>
int fold(char* text)
{
    if (text == nullptr)
        return 0;
    auto* at = reinterpret_cast<byte*>(text);
    const byte* const end = at + std::strlen(text);

    while (at != end) {
        // The terminator is no continuation byte, so no look-ahead goes beyond it.
        if (*at < 0x80) {
            at = fold_ascii<Case>(at, end);
        } else if (is_two(at)) {
            do {
                fold_two<Case>(at);
                at += 2;
            } while (is_two(at));
        } else if (is_three(at)) {
            do {
                fold_three<Case>(at);
                at += 3;
            } while (is_three(at));
        } else {
            const int length = fold_any<Case>(at);
            if (length < 0)
                return -1;
            at += length;
        }
    }
    return 0;
}

}  // namespace

extern "C" {

int utf8towc(std::int32_t* character, const char* text)
{
    if (text == nullptr)
        return 0;
    const auto* bytes = reinterpret_cast<const byte*>(text);
    std::int32_t value = bytes[0];
    int length = 1;
    if (bytes[0] >= 0xC0 && bytes[0] < 0xE0 && is_continuation(bytes[1])) {
        value = (bytes[0] & 0x1F) << 6 | (bytes[1] & 0x3F);
        length = 2;
    } else if (bytes[0] >= 0xE0 && bytes[0] < 0xF0 && is_continuation(bytes[1]) && is_continuation(bytes[2])) {
        value = (bytes[0] & 0x0F) << 12 | (bytes[1] & 0x3F) << 6 | (bytes[2] & 0x3F);
        length = 3;
    } else if (bytes[0] >= 0x80) {
        return -1;
    }
    if (character != nullptr)
        *character = value;
    return length;
}

int wctoutf8(char* target, std::int32_t character)
{
    if (target == nullptr)
        return 0;
    if (character < 0x80) {
        target[0] = static_cast<char>(character);
        return character == 0 ? 0 : 1;
    }
    if (character < 0x800) {
        target[0] = static_cast<char>(0xC0 | character >> 6);
        target[1] = static_cast<char>(0x80 | (character & 0x3F));
        return 2;
    }
    target[0] = static_cast<char>(0xE0 | character >> 12);
    target[1] = static_cast<char>(0x80 | (character >> 6 & 0x3F));
    target[2] = static_cast<char>(0x80 | (character & 0x3F));
    return 3;
}

int utfToUpper(char* text)
{
    return fold<upper_case>(text);
}

int utfToLower(char* text)
{
    return fold<lower_case>(text);
}

}  // extern "C"
