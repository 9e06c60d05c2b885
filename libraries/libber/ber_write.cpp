// Writing BER elements.
//
// All goes into one block that grows by doubling. A construction is opened with room for the one length octet that most
// need. When it is closed and needs more, its content moves by so much; a run of closings ("}}") moves every byte once,
// to its last place.
#include <algorithm>
#include <cerrno>
#include <cstdarg>
#include <cstdlib>
#include <cstring>

#include "libraries/libber/ber_element.h"
#include "libraries/libber/ber_state.h"

namespace {

constexpr std::size_t first_block = 1024;
constexpr std::size_t max_header = 2 + sizeof(std::size_t);  // tag, count of length octets, length octets
constexpr std::size_t max_length = PTRDIFF_MAX / 4;          // of a value and of the whole: sums of two never overflow

std::size_t used(const BerElement& ber)
{
    return static_cast<std::size_t>(ber.ber_ptr - ber.ber_buf);
}

__attribute__((noinline)) bool grow(BerElement& ber, std::size_t more)
{
    const std::size_t length = used(ber);
    const std::size_t needed = length + more;
    if (needed > max_length) {
        errno = ENOMEM;
        return false;
    }
    const auto before = static_cast<std::size_t>(ber.ber_end - ber.ber_buf);
    std::size_t size = before == 0 ? first_block : 2 * before;
    if (size < needed) {
        size = needed;
    }
    auto* block = static_cast<char*>(std::realloc(ber.ber_buf, size));
    if (block == nullptr) {
        return false;
    }
    ber.ber_buf = block;
    ber.ber_ptr = block + length;
    ber.ber_end = block + size;
    return true;
}

bool has_room(BerElement& ber, std::size_t more)
{
    return static_cast<std::size_t>(ber.ber_end - ber.ber_ptr) >= more || grow(ber, more);
}

// How many octets tell a length.
std::size_t length_octets(std::size_t length)
{
    std::size_t octets = 1;
    if (length >= 0x80) {
        for (; length != 0; length >>= 8) {
            ++octets;
        }
    }
    return octets;
}

char* put_length(char* out, std::size_t length)
{
    if (length < 0x80) {
        *out = static_cast<char>(length);
        return out + 1;
    }
    const std::size_t octets = length_octets(length) - 1;
    *out = static_cast<char>(0x80 | octets);
    for (std::size_t i = octets; i != 0; --i, length >>= 8) {
        out[i] = static_cast<char>(length);
    }
    return out + octets + 1;
}

ber_tag_t take_tag(BerElement& ber, ber_tag_t own)
{
    const ber_tag_t tag = ber.ber_tag == 0 ? own : ber.ber_tag;
    ber.ber_tag = 0;
    return tag;
}

bool put_bytes(BerElement& ber, ber_tag_t tag, const char* bytes, std::size_t length)
{
    if (!has_room(ber, std::min(length, max_length) + max_header)) {  // a value that is cut here has no room
        return false;
    }
    char* out = ber.ber_ptr;
    *out = static_cast<char>(tag);
    out = put_length(out + 1, length);
    if (length != 0) {
        std::memcpy(out, bytes, length);
    }
    ber.ber_ptr = out + length;
    return true;
}

bool put_text(BerElement& ber, ber_tag_t tag, const char* text)
{
    return text != nullptr && put_bytes(ber, tag, text, std::strlen(text));
}

bool put_value(BerElement& ber, ber_tag_t tag, const berval* value)
{
    return value != nullptr && put_bytes(ber, tag, value->bv_val, value->bv_val == nullptr ? 0 : value->bv_len);
}

bool put_integer(BerElement& ber, ber_tag_t tag, std::int64_t number)
{
    char octets[sizeof(number)];
    std::size_t first = sizeof(octets);
    std::int64_t rest = number;
    do {
        octets[--first] = static_cast<char>(rest);
        rest >>= 8;
    } while (first != 0 && rest != (static_cast<signed char>(octets[first]) < 0 ? -1 : 0));
    return put_bytes(ber, tag, octets + first, sizeof(octets) - first);
}

template <typename Item>
bool put_all(BerElement& ber, const Item* const* items, bool (*put)(BerElement&, ber_tag_t, const Item*))
{
    const ber_tag_t tag = take_tag(ber, LBER_OCTETSTRING);
    for (; items != nullptr && *items != nullptr; ++items) {
        if (!put(ber, tag, *items)) {
            return false;
        }
    }
    return true;
}

bool open(BerElement& ber, ber_tag_t own)
{
    if (ber.ber_open == LBER_MAX_OPEN || !has_room(ber, 2)) {
        return false;
    }
    *ber.ber_ptr = static_cast<char>(take_tag(ber, own));
    ber.ber_ptr += 2;
    ber.ber_starts[ber.ber_open++] = used(ber);
    return true;
}

// Closes the innermost `count` constructions, which all end here.
bool close(BerElement& ber, std::size_t count)
{
    if (count > ber.ber_open || ber.ber_tag != 0) {
        return false;
    }
    const std::size_t* innermost = ber.ber_starts + ber.ber_open - 1;
    std::size_t lengths[LBER_MAX_OPEN];
    std::size_t growth = 0;
    for (std::size_t i = 0; i < count; ++i) {
        lengths[i] = used(ber) + growth - innermost[-static_cast<std::ptrdiff_t>(i)];
        growth += length_octets(lengths[i]) - 1;
    }
    if (!has_room(ber, growth)) {
        return false;
    }

    char* end = ber.ber_ptr;  // of what hasn't moved yet
    std::size_t distance = growth;
    for (std::size_t i = 0; i < count; ++i) {
        char* content = ber.ber_buf + innermost[-static_cast<std::ptrdiff_t>(i)];
        if (distance != 0) {
            std::memmove(content + distance, content, static_cast<std::size_t>(end - content));
        }
        distance -= length_octets(lengths[i]) - 1;
        put_length(content - 1 + distance, lengths[i]);
        end = content - 1;  // the tag moves with what stands before it
    }
    ber.ber_ptr += growth;
    ber.ber_open -= static_cast<unsigned>(count);
    return true;
}

// How many closings stand at the beginning of the format.
std::size_t closings(const char* format)
{
    std::size_t count = 0;
    while (format[count] == '}' || format[count] == ']') {
        ++count;
    }
    return count;
}

bool print(BerElement& ber, const char* format, va_list args)
{
    for (bool done = true; *format != '\0'; ++format) {
        switch (*format) {
        case 'b': {
            const char octet = va_arg(args, int) == 0 ? '\0' : '\xFF';
            done = put_bytes(ber, take_tag(ber, LBER_BOOLEAN), &octet, 1);
            break;
        }
        case 'i': done = put_integer(ber, take_tag(ber, LBER_INTEGER), va_arg(args, int)); break;
        case 'e': done = put_integer(ber, take_tag(ber, LBER_ENUMERATED), va_arg(args, int)); break;
        case 'I': done = put_integer(ber, take_tag(ber, LBER_INTEGER), va_arg(args, std::int64_t)); break;
        case 's': done = put_text(ber, take_tag(ber, LBER_OCTETSTRING), va_arg(args, const char*)); break;
        case 'o': {
            const char* bytes = va_arg(args, const char*);
            const auto length = va_arg(args, ber_len_t);
            done = (bytes != nullptr || length == 0) && put_bytes(ber, take_tag(ber, LBER_OCTETSTRING), bytes, length);
            break;
        }
        case 'O': done = put_value(ber, take_tag(ber, LBER_OCTETSTRING), va_arg(args, const berval*)); break;
        case 'v': done = put_all<char>(ber, va_arg(args, const char* const*), put_text); break;
        case 'V': done = put_all<berval>(ber, va_arg(args, const berval* const*), put_value); break;
        case 'n': done = put_bytes(ber, take_tag(ber, LBER_NULL), nullptr, 0); break;
        case '{': done = open(ber, LBER_SEQUENCE); break;
        case '[': done = open(ber, LBER_SET); break;
        case '}':
        case ']': {
            const std::size_t count = closings(format);
            done = close(ber, count);
            format += count - 1;
            break;
        }
        case 't':
            ber.ber_tag = va_arg(args, ber_tag_t);
            done = ber_is_tag(ber.ber_tag);
            break;
        default: done = false; break;
        }
        if (!done) {
            return false;
        }
    }
    return true;
}

}  // namespace

extern "C" {

int ber_printf(BerElement* ber, const char* format, ...)
{
    if (ber == nullptr || format == nullptr || !ber_is(*ber, ber_writes) || ber_is(*ber, ber_has_failed)) {
        return -1;
    }
    va_list args;
    va_start(args, format);
    const bool done = print(*ber, format, args);
    va_end(args);
    if (!done) {
        ber_set(*ber, ber_has_failed);
    }
    return done ? 0 : -1;
}

int ber_printf_w(BerElement* ber, const char* format, ...) __attribute__((alias("ber_printf")));
int fber_printf(BerElement* ber, const char* format, ...) __attribute__((alias("ber_printf")));

}  // extern "C"
