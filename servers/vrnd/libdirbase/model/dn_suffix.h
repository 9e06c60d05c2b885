// DNs as texts: what ends what, and parents.
//
// The tests work byte for byte on normalised DNs (the upper texts of dn_normalize_esc). Any thread may call them; where
// a back end and a DN that isn't normalised come together, the caller holds the read side of the schema lock.
#pragma once

#include <stdbool.h>

#include "libraries/dirbase_export.h"

typedef struct Backend Backend;

DIRBASE_C_BEGIN

// Whether the suffix ends the DN: it is the whole DN, or all behind one of its ",". So the empty suffix ends the empty
// DN only. The first compares copies in upper case (utfToUpper), which are otherwise as written, and gives false
// without memory, the second the texts as they are. False for a null text.
DIRBASE_EXPORT bool dn_issuffix(const char* dn, const char* suffix);
DIRBASE_EXPORT bool dn_issuffix_norm(const char* dn, const char* suffix);

// Whether one of two normalised DNs is the other or a descendant of it; the empty one has no descendants here.
DIRBASE_EXPORT bool are_nested_dn(const char* a, const char* b);

// Whether a text is a DN, that is holds "=", and no plain name.
DIRBASE_EXPORT bool dn_type(const char* text);

// The parent of a DN: what stands behind its first RDN, not trimmed; of a name without "=" what follows its first "@",
// or without one its first ".". There is none when nothing follows, for a null or empty DN, and for a suffix of the
// back end, which may be null to skip that test. The forms with _norm take a normalised DN.
//
// Return a new text for the caller to free(); null when there is no parent or no memory.
DIRBASE_EXPORT char* dn_parent(Backend* be, const char* dn);
DIRBASE_EXPORT char* dn_parent_norm(Backend* be, const char* dn);

// The same with a result: LDAP_SUCCESS, with *parent null when there is none, or LDAP_NO_MEMORY. *parent is a new text
// for the caller to free(); with `copy` 0 a part of `dn`.
DIRBASE_EXPORT int dn_get_parent(Backend* be, const char* dn, char** parent);
DIRBASE_EXPORT int dn_get_parent_norm(Backend* be, const char* dn, char** parent, int copy);

DIRBASE_C_END
