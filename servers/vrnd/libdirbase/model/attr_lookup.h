// Looking an attribute up where it matters why there is no record.
//
// ldcf_api_attr_get_info gives null for an attribute that the schema doesn't know, and also when there is no memory for
// the record or for the name without its language tag. To most callers the two are one. Who stores something or refuses
// something on the strength of "unknown" asks here: the C library's calls leave ENOMEM behind.
//
// Private to the library.
#pragma once

#include <cerrno>

#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"

// *info takes the record, null for an attribute that the schema doesn't know. Returns LDAP_SUCCESS, or LDAP_NO_MEMORY
// with *info null. errno stays as it was. The caller holds the read side of the schema lock.
inline int look_up_attr(const char* name, asyntaxinfo** info)
{
    const int before = errno;
    errno = 0;
    *info = ldcf_api_attr_get_info(name, nullptr);
    const bool failed = *info == nullptr && errno == ENOMEM;
    errno = before;
    return failed ? LDAP_NO_MEMORY : LDAP_SUCCESS;
}
