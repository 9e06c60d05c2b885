// Base64: see line64.h.
#include <algorithm>
#include <array>
#include <cstdint>
#include <cstring>

#include "libraries/libber/ldap_result.h"
#include "libraries/libldif/line64.h"
#include "libraries/libldif/line_write.h"
#include "libraries/libmsg/debug_log.h"

namespace {

constexpr char alphabet[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
constexpr std::uint8_t no_digit = 0xff;

constexpr std::array<std::uint8_t, 256> make_digits()
{
    std::array<std::uint8_t, 256> digits{};
    digits.fill(no_digit);
    for (std::uint8_t i = 0; i < 64; ++i) {
        digits[static_cast<unsigned char>(alphabet[i])] = i;
    }
    return digits;
}
constexpr std::array<std::uint8_t, 256> digits = make_digits();

std::uint8_t digit_of(char c)
{
    return digits[static_cast<unsigned char>(c)];
}

// The four characters of up to three bytes.
void encode_group(const unsigned char* bytes, std::size_t count, char* out)
{
    const unsigned bits = static_cast<unsigned>(bytes[0]) << 16 |
                          (count > 1 ? static_cast<unsigned>(bytes[1]) << 8 : 0) | (count > 2 ? bytes[2] : 0u);
    out[0] = alphabet[bits >> 18];
    out[1] = alphabet[bits >> 12 & 63];
    out[2] = count > 1 ? alphabet[bits >> 6 & 63] : '=';
    out[3] = count > 2 ? alphabet[bits & 63] : '=';
}

int refuse(char c)
{
    // A zero byte, where the text has ended, would end the line of the log as well.
    debug_error("base64decode: invalid base 64 encoding char (%c) 0x%x\n", c == '\0' ? ' ' : c,
                static_cast<unsigned>(static_cast<unsigned char>(c)));
    return LDAP_DECODING_ERROR;
}

}  // namespace

extern "C" {

int base64encode(char** out, const char* start, const char* stop, int column)
{
    if (out == nullptr || *out == nullptr || start == nullptr || stop == nullptr) {
        debug_error("base64encode: NULL input parameter. out=%p, val=%p, stop=%p\n", static_cast<void*>(out),
                    static_cast<const void*>(start), static_cast<const void*>(stop));
        return -1;
    }
    const auto* at = reinterpret_cast<const unsigned char*>(start);
    const auto* const end = reinterpret_cast<const unsigned char*>(stop);
    char* to = *out;
    while (at < end) {
        const auto count = static_cast<std::size_t>(std::min<std::ptrdiff_t>(end - at, 3));
        if (column < 0 || column + 3 <= ldif_column_limit) {
            encode_group(at, count, to);
            to += 4;
            column += column < 0 ? 0 : 4;
        } else {
            char group[4];
            encode_group(at, count, group);
            for (const char c : group) {
                if (column > ldif_column_limit) {
                    *to++ = '\n';
                    *to++ = ' ';
                    column = 1;
                }
                *to++ = c;
                ++column;
            }
        }
        at += count;
    }
    *out = to;
    return 0;
}

int base64decode(char* target, const char* source, std::size_t* length)
{
    if (target == nullptr || source == nullptr || length == nullptr) {
        return -1;
    }
    *length = 0;
    char* to = target;
    while (*source != '\0' && *source != '\n') {
        unsigned bits = 0;
        unsigned count = 0;  // of characters in front of "="
        while (count < 4 && source[count] != '=') {
            const char c = source[count];
            std::uint8_t digit = digit_of(c);
            if (digit == no_digit) {
                if (count < 3 || c == '\0' || c == '\n') {
                    return refuse(c);
                }
                digit = 0;
            }
            bits |= static_cast<unsigned>(digit) << (18 - 6 * count);
            ++count;
        }
        source += count;
        // Three bytes, or what is whole in front of "=".
        const char bytes[3] = {static_cast<char>(bits >> 16), static_cast<char>(bits >> 8), static_cast<char>(bits)};
        const std::size_t whole = count == 0 ? 0 : count - 1;
        std::memcpy(to, bytes, whole);
        to += whole;
        if (count < 4) {
            break;
        }
    }
    *to = '\0';
    *length = static_cast<std::size_t>(to - target);
    return 0;
}

}  // extern "C"
