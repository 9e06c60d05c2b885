// Entries in BER: a SearchResultEntry's sequence of the DN and the attributes with their values (RFC 4511 section
// 4.5.2).
#pragma once

#include <stddef.h>

#include "libraries/dirbase_export.h"
#include "servers/vrnd/libdirbase/model/entry.h"

DIRBASE_C_BEGIN

// Encodes an entry: SEQUENCE { DN, SEQUENCE OF { type, SET OF value } }, attributes in order of arrival.
//
//   buffer  takes the encoding, in a new block for the caller to free()
//   length  takes its length in bytes
//
// Returns LDAP_SUCCESS; LDAP_OPERATIONS_ERROR for a null argument, an entry without a DN and when encoding fails;
// LDAP_NO_MEMORY when it can't be begun. After a failure *buffer is null and *length 0. Any number of threads may
// encode entries that nobody changes.
DIRBASE_EXPORT int entry2ber(const Entry* entry, char** buffer, size_t* length);

DIRBASE_C_END
