// Entries whose password is checked by another server (object class xan-ptaReferral).
#pragma once

#include "libraries/dirbase_export.h"
#include "servers/vrnd/libdirbase/model/entry.h"

DIRBASE_C_BEGIN

// Checks what such an entry says about finding its owner on the other server: the first value of xan-ptaLinkAttribute,
// where there is that attribute, is the name of an attribute, or "_DN_" or "_DISABLE_" in any case; and that of
// xan-ptaLinkValue, where there is that one, isn't empty. Any other entry, and null, passes.
//
// Returns LDAP_SUCCESS or LDAP_CONSTRAINT_VIOLATION. The entry is only read; the caller holds the read side of the
// schema lock.
DIRBASE_EXPORT int checkPassthroughReferral(const Entry* entry);

DIRBASE_C_END
