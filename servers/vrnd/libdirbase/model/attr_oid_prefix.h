// The prefix "oid." of an attribute name in numeric form, in any case.
#pragma once

#include <cstddef>

#include <cstddef>

constexpr std::size_t oid_prefix_length = 4;

inline bool has_oid_prefix(const char* name)
{
    return (name[0] | 0x20) == 'o' && (name[1] | 0x20) == 'i' && (name[2] | 0x20) == 'd' && name[3] == '.';
}
