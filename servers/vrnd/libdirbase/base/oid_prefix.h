// The prefix "oid." of an attribute name in numeric form, in any case.
#pragma once

#include <cstddef>

constexpr std::size_t oid_prefix_length = 4;

// `name` is zero-terminated; nothing behind its end is read. Asked for every attribute name, so no library call.
inline bool has_oid_prefix(const char* name)
{
    constexpr char to_lower = 'a' - 'A';
    return (name[0] | to_lower) == 'o' && (name[1] | to_lower) == 'i' && (name[2] | to_lower) == 'd' && name[3] == '.';
}
