// Entries as lists of modifications, and back.
//
// Lists of attributes are given by their first record in order of arrival (e_attrs), null for none; they are only read.
// Arrays are null-terminated, their records are linked through mod_next in the same order, and the caller releases them
// with free_ldmarr. Nothing here locks.
#pragma once

#include "libraries/dirbase_export.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/model/entry.h"
#include "servers/vrnd/libdirbase/model/ldap_mods.h"

DIRBASE_C_BEGIN

// Makes the modifications that add the attributes: for each of them an add of copies of all its values, as bervals (an
// attribute that never had values gives one with none). Null when memory ran out.
DIRBASE_EXPORT LDAPMod** EntryToLDAPMod(const Attribute* first);

// Makes the modifications that turn the old attributes into the new ones: a replace, with all its values, of each new
// attribute, changed or not, in order of arrival, and then a delete of each old one whose name no new one has by
// strcasecmp.
//
//   mods  takes the array, null after a failure
//
// Returns LDAP_SUCCESS, LDAP_OTHER for a null `mods`, or LDAP_NO_MEMORY. The time grows as that of sorting the names.
DIRBASE_EXPORT int diffEntriesToMods(const Attribute* new_first, const Attribute* old_first, LDAPMod*** mods);

// Makes an entry from what is to be added. Its values are normalised by their syntaxes and kept once each; a value that
// its attribute refuses is left out without a failure, together with the others of its modification.
//
//   entry  takes the entry, for the caller to release with entry_free; null after a failure
//   dn     a block of malloc; the call takes it over in any case: it becomes e_dn, or is released with the failure
//   mods   their values are bervals, whatever mod_op says, and are copied; null for none
//
// Returns LDAP_SUCCESS; LDAP_PROTOCOL_ERROR, with message 92, for a modification without an array of values;
// LDAP_NO_MEMORY, also for a DN that has no normal form because it is null or too long; LDAP_OTHER for a null `entry`.
// The e_norm_dn of a refused DN is empty or a front of it: the result doesn't tell. The caller holds the read side of
// the schema lock.
DIRBASE_EXPORT int LDAPModToEntry(Entry** entry, char* dn, LDAPMod* const* mods);

DIRBASE_C_END
