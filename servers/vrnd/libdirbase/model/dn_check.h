// The strict checkers: whether a text is a DN, or an RDN, by the grammar of LDAP v3 (RFC 2253 section 3).
//
// They take less than the normalisers: no trailing separator, no empty value in front of one, no escaped space. Blanks are
// space, line feed and carriage return. They may be called from any thread and need no schema.
#pragma once

#include <cstddef>

#include "libraries/dirbase_export.h"

extern "C" {

// Check a text. `offset` may be null and else takes the offset of the character at fault. Return LDAP_SUCCESS, also for the
// empty text, or LDAP_INVALID_DN_SYNTAX with a line in the debug log, also for a null text.
DIRBASE_EXPORT int dn_check(const char* dn, std::size_t* offset);
DIRBASE_EXPORT int rdn_check(const char* rdn, std::size_t* offset);

}  // extern "C"
