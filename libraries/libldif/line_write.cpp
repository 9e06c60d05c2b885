// Writing lines of LDIF: see line64.h and line_write.h.
#include "libraries/libldif/line_write.h"

#include <algorithm>
#include <array>
#include <cstdlib>

#include "libraries/libldif/line64.h"

namespace {

constexpr std::array<bool, 256> make_safe()
{
    std::array<bool, 256> safe{};
    for (std::size_t c = 0x02; c < 0x7f; ++c) {
        safe[c] = c != '\n' && c != '\r';
    }
    return safe;
}
constexpr std::array<bool, 256> safe_anywhere = make_safe();

bool is_safe(const char* value, std::size_t length)
{
    return length == 0 || (ldif_is_first(*value) && std::all_of(value, value + length, [](char c) {
                               return safe_anywhere[static_cast<unsigned char>(c)];
                           }));
}

// The first column behind the `used` ones, as a number that can't overflow.
int column_behind(std::size_t used)
{
    return static_cast<int>(std::min<std::size_t>(used, ldif_column_limit)) + 1;
}

// Copies a value with folds and its line feed. Null when only plain bytes (ldif_copy) are wanted and there are others.
char* copy_folded(char* out, std::size_t used, const char* value, std::size_t length, bool only_plain)
{
    std::size_t room = std::size_t{ldif_column_limit} - std::min<std::size_t>(used, ldif_column_limit);
    for (; length > room; room = ldif_column_limit) {
        if (!ldif_copy(out, value, room) && only_plain) {
            return nullptr;
        }
        out += room;
        value += room;
        length -= room;
        *out++ = '\n';
        *out++ = ' ';
    }
    if (!ldif_copy(out, value, length) && only_plain) {
        return nullptr;
    }
    out[length] = '\n';
    return out + length + 1;
}

// Goes back behind the first ":" of "type: ".
char* write_encoded(char* out, std::size_t used, const char* value, std::size_t length)
{
    out[-1] = ':';
    *out++ = ' ';
    if (length != 0) {
        base64encode(&out, value, value + length, column_behind(used + 1));
    }
    *out++ = '\n';
    return out;
}

std::size_t length_of_type(const char* type)
{
    return static_cast<std::size_t>(strchrnul(type, ':') - type);
}

// Calls a writer with new text that has the room for its line.
template <typename Write>
char* into_new_text(const char* type, std::size_t length, Write&& write)
{
    if (type == nullptr) {
        return nullptr;
    }
    auto* text = static_cast<char*>(std::malloc(ldif_line_room(std::strlen(type), length) + 1));
    if (text != nullptr) {
        char* out = text;
        write(&out);
        *out = '\0';
    }
    return text;
}

}  // namespace

char* ldif_write_special(char* out, std::size_t used, const char* value, std::size_t length)
{
    if (length == 0 || value == nullptr) {
        *out = '\n';
        return out + 1;
    }
    char* end = ldif_is_first(*value) ? copy_folded(out, used, value, length, true) : nullptr;
    if (end == nullptr) {
        end = is_safe(value, length) ? copy_folded(out, used, value, length, false)
                                     : write_encoded(out, used, value, length);
    }
    return end;
}

extern "C" {

std::size_t ldif_line_room(std::size_t type_length, std::size_t value_length)
{
    // A third more for Base64 with the bytes that fill its last group, ":: " and the line feed, and for each column
    // limit that is passed two bytes. A type too long for one line breaks right behind itself, which its own length
    // covers.
    const std::size_t encoded = value_length / 3 * 4 + value_length % 3 * 4 / 3;
    return type_length + encoded + 7 + (encoded + 6 + type_length) / ldif_column_limit * 2;
}

void put_type_and_value(char** out, const char* type, const char* value, std::size_t length)
{
    *out = ldif_write_line(*out, type, length_of_type(type), value, length);
}

void put_type_and_value_or_bvalue(char** out, const char* type, const char* value, int /*flag*/, const char* bvalue,
                                  std::size_t length)
{
    if (bvalue != nullptr && (bvalue == value || !is_safe(bvalue, length))) {
        const std::size_t type_length = length_of_type(type);
        std::memcpy(*out, type, type_length);
        (*out)[type_length] = ':';
        *out = write_encoded(*out + type_length + 2, type_length + 2, bvalue, length);
    } else if (value == nullptr) {
        put_type_and_value(out, type, bvalue, length);
    } else {
        put_type_and_value(out, type, value, bvalue == nullptr ? length : strnlen(value, length));
    }
}

char* ldif_type_and_value(const char* type, const char* value, std::size_t length)
{
    return into_new_text(type, length, [&](char** out) { put_type_and_value(out, type, value, length); });
}

char* ldif_type_and_value_or_bvalue(const char* type, const char* value, int flag, const char* bvalue,
                                    std::size_t length)
{
    return into_new_text(type, length,
                         [&](char** out) { put_type_and_value_or_bvalue(out, type, value, flag, bvalue, length); });
}

}  // extern "C"
