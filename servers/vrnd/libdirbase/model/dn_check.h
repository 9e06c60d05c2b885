// The strict checkers: whether a text is a DN, or an RDN, by the grammar of LDAP v3 (RFC 2253 section 3).
//
// They look at the grammar only, without the schema and without resolving values. So they refuse what the normalisers
// put up with (a trailing separator, an empty value in front of one, an escaped space), and take what these refuse (an
// empty last value, a "#" value of another type, bytes that aren't UTF-8, any length). Blanks are space, line feed and
// carriage return. Any thread may call them.
#pragma once

#include <stddef.h>

#include "libraries/dirbase_export.h"

DIRBASE_C_BEGIN

// Check a text. `offset` may be null and else takes, on failure, the offset of the character at fault (0 for a null
// text). Return LDAP_SUCCESS, also for the empty text, or LDAP_INVALID_DN_SYNTAX with a line in the debug log, also for
// a null text.
DIRBASE_EXPORT int dn_check(const char* dn, size_t* offset);
DIRBASE_EXPORT int rdn_check(const char* rdn, size_t* offset);

DIRBASE_C_END
