// The ending ";binary" of an attribute name (RFC 4522), in any case.
//
// Private to this folder.
#pragma once

#include <cstddef>
#include <cstring>

#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/base/heap.h"

constexpr char ldcf_binary_ending[] = ";binary";
constexpr std::size_t ldcf_binary_ending_length = sizeof(ldcf_binary_ending) - 1;

// Whether a name ends so, with something in front of it.
inline bool ldcf_ends_in_binary(const char* name, std::size_t length)
{
    return length > ldcf_binary_ending_length && (name[length - 1] | 0x20) == 'y' &&
           vrn_strcasecmp(name + length - ldcf_binary_ending_length, ldcf_binary_ending) == 0;
}

// A copy of such a name without that; null when memory ran out.
inline heap_text ldcf_without_binary(const char* name, std::size_t length)
{
    return heap_text(strndup(name, length - ldcf_binary_ending_length));
}
