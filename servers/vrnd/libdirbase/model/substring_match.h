// Internal to the model: whether a text holds pieces in their order.
#pragma once

#include <cstring>
#include <string_view>

#include <string.h>  // memmem

// Whether `text` begins with `initial`, ends with `final` and holds each of `any` in between, in their order, without
// overlap. Bytes are compared.
//
//   initial, final  empty where none is wanted; the empty text is at either end of any text
//   any             null-terminated; null for none
//
// The leftmost place is taken for each piece: what can be found behind a later one can be found behind it, too. So no
// place is tried twice, and the text is searched once from its start to its end, however many pieces there are.
inline bool substring_match(std::string_view text, std::string_view initial, const char* const* any,
                            std::string_view final)
{
    if (text.size() < initial.size() + final.size() || !text.starts_with(initial) || !text.ends_with(final)) {
        return false;
    }
    const char* at = text.data() + initial.size();
    const char* const end = text.data() + text.size() - final.size();
    for (; any != nullptr && *any != nullptr; ++any) {
        const std::size_t length = std::strlen(*any);
        if (length == 0) {
            continue;  // and `at` may be null for an empty text
        }
        const void* const found = memmem(at, static_cast<std::size_t>(end - at), *any, length);
        if (found == nullptr) {
            return false;
        }
        at = static_cast<const char*>(found) + length;
    }
    return true;
}
