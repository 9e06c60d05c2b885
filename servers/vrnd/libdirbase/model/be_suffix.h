// Whether a DN is a suffix of a back end, which has no parent there.
#pragma once

#include "libraries/dirbase_export.h"

typedef struct Backend Backend;

DIRBASE_C_BEGIN

// Whether a DN is one of the suffixes of a back end: 1 or 0, and LDAP_NO_MEMORY when it couldn't be normalised for want
// of memory. A null or empty DN is none, nor is one that isn't well-formed.
//
//   normalised  1 for an upper text of dn_normalize_esc; 0 for any DN, which is normalised first: the caller then holds
//               the read side of the schema lock
DIRBASE_EXPORT int be_issuffix_internal(Backend* be, const char* dn, int normalised);

DIRBASE_C_END
