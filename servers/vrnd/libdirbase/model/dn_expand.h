// The naming attributes of an entry: what its DN says about it, as attributes.
//
// Both add each pair of the first RDN to the entry by attr_merge, duplicates dropped, with the bare value. What was
// added before a failure stays. The caller holds the read side of the schema lock.
#pragma once

#include "libraries/dirbase_export.h"
#include "servers/vrnd/libdirbase/model/entry.h"

DIRBASE_C_BEGIN

// Reads e_dn tolerantly, as dn_normalize_light leaves it (so a hexadecimal pair is no pair any more). Returns
// LDAP_SUCCESS; -1 for a null entry or an empty DN; LDAP_INVALID_DN_SYNTAX for a pair without "="; LDAP_OTHER for an
// attribute that the schema doesn't know; the failure of attr_merge; LDAP_NO_MEMORY. The first failure ends the walk.
DIRBASE_EXPORT int expand_rdn(Entry* entry);

// Reads e_dn strictly, by parse_escDN. Returns the result for the last pair, a failure of attr_merge included; -1 as
// above; and where the DN can't be parsed, without adding anything, LDAP_OTHER for an attribute that the schema doesn't
// know, LDAP_INVALID_DN_SYNTAX or LDAP_NO_MEMORY.
DIRBASE_EXPORT int expand_rdn_esc(Entry* entry);

DIRBASE_C_END
