// The prefix "oid." of an attribute name in numeric form, in any case.
#pragma once

#include <cstddef>

#include <strings.h>

constexpr std::size_t oid_prefix_length = 4;

inline bool has_oid_prefix(const char* name)
{
    return strncasecmp(name, "oid.", oid_prefix_length) == 0;
}
