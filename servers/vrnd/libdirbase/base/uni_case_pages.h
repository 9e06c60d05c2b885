// The case tables once more, cut into pages by the front bytes of UTF-8, for folding text without a walk per character.
//
// A character of two or three bytes in UTF-8 carries its low six bits in its last byte (RFC 3629). So the bytes in
// front name a page of 64 characters, and the last byte the place on it. Most pages hold no mapping at all and share
// page 0. The pages are computed from the tables of uni_case.h by the compiler.
//
// Private to this folder.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

struct uni_case_pages {
    static constexpr std::size_t page_size = 64;
    static constexpr std::size_t most_pages = 32;

    std::array<std::uint8_t, 0x10000 / page_size> page_of = {};             // [character / 64]: number of its page
    std::array<std::array<std::int8_t, page_size>, most_pages> pages = {};  // mapped character minus character
};

extern const uni_case_pages uni_upper_pages;
extern const uni_case_pages uni_lower_pages;
