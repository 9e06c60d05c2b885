// What the sources of BER elements share.
#pragma once

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>

#include "libraries/libber/ber_element.h"

// The bits of ber_state.
enum ber_state_bit : std::uint8_t {
    ber_writes = 1,
    ber_reads = 2,
    ber_owns_record = 4,  // made by the library, so ber_free releases it
    ber_owns_buffer = 8,
    ber_has_failed = 16,
};

inline bool ber_is(const BerElement& ber, ber_state_bit bit)
{
    return (ber.ber_state & bit) != 0;
}

inline void ber_set(BerElement& ber, ber_state_bit bit)
{
    ber.ber_state = static_cast<std::uint8_t>(ber.ber_state | bit);
}

// A tag of one byte: its number is below 31, and it isn't the mark of an indefinite length's end.
inline bool ber_is_tag(ber_tag_t tag)
{
    return tag != 0 && tag <= 0xFF && (tag & 0x1F) != 0x1F;
}

inline bool ber_is_universal(ber_tag_t tag)
{
    return (tag & 0xC0) == 0;
}

inline bool ber_is_constructed(ber_tag_t tag)
{
    return (tag & 0x20) != 0;
}

// A copy of a value's bytes with a zero byte behind them, for free(); null when memory ran out.
inline char* ber_copy_bytes(const berval& value)
{
    const unsigned long length = value.bv_val == nullptr ? 0 : value.bv_len;
    if (length == ULONG_MAX) {  // no room for the zero byte
        errno = ENOMEM;
        return nullptr;
    }
    auto* copy = static_cast<char*>(std::malloc(length + 1));
    if (copy != nullptr) {
        if (length != 0) {
            std::memcpy(copy, value.bv_val, length);
        }
        copy[length] = '\0';
    }
    return copy;
}

// Reads the tag and the length of the value at *at, whose content has to end at or before `end`, and moves *at to the
// content. False when there is none; then nothing is changed.
inline bool ber_read_header(const char** at, const char* end, ber_tag_t* tag, ber_len_t* len)
{
    const char* p = *at;
    if (end - p < 2) {
        return false;
    }
    const ber_tag_t read_tag = static_cast<unsigned char>(*p++);
    ber_len_t length = static_cast<unsigned char>(*p++);
    if (!ber_is_tag(read_tag) || length == 0x80) {  // 0x80: the indefinite form
        return false;
    }
    if (length > 0x80) {
        ber_len_t octets = length & 0x7F;
        if (octets > static_cast<ber_len_t>(end - p)) {
            return false;
        }
        for (length = 0; octets != 0; --octets) {
            if (length >> (8 * (sizeof(length) - 1)) != 0) {  // no room for another octet
                return false;
            }
            length = length << 8 | static_cast<unsigned char>(*p++);
        }
    }
    if (length > static_cast<ber_len_t>(end - p)) {
        return false;
    }
    *at = p;
    *tag = read_tag;
    *len = length;
    return true;
}
