// Lists of modifications (libraries/libber/ldap_mod.h): making, copying, joining and releasing them.
//
// A list is a null-terminated array, a chain through mod_next, or both at once; what makes an array here links its
// records in the order of the array too. Records belong to the caller, and nothing here locks. Memory that runs out is
// told to the debug log as well, except by alloc_ldapmod.
#pragma once

#include "libraries/dirbase_export.h"
#include "libraries/libber/ldap_mod.h"

DIRBASE_C_BEGIN

// ---- making and releasing -------------------------------------------------------------------------------------------

// Makes a zeroed record. Null when memory ran out.
DIRBASE_EXPORT LDAPMod* alloc_ldapmod(void);

// Releases one record with its name and its values, which are bervals or texts as mod_op says, but not the next record.
// Null does nothing.
DIRBASE_EXPORT void free_ldapmod(LDAPMod* mod);

// Release a chain, and an array with its records. Null does nothing.
DIRBASE_EXPORT void free_ldmll(LDAPMod* first);
DIRBASE_EXPORT void free_ldmarr(LDAPMod** array);
DIRBASE_EXPORT void FreeMods(LDAPMod** array);

// ---- copying --------------------------------------------------------------------------------------------------------

// Copies one record whose values are bervals (whether mod_op says so isn't looked at; it is copied as it is, and has to
// say so by the time free_ldapmod comes). The next record of the copy is null. Returns the copy for the caller to
// release with free_ldapmod; null for null, and when memory ran out.
DIRBASE_EXPORT LDAPMod* dup_mod(const LDAPMod* mod);

// Copies a chain of such records. Null for null, and when memory ran out.
DIRBASE_EXPORT LDAPMod* dup_ldmll(const LDAPMod* first);

// As dup_mod, with a result. *copy takes the copy, or null. Returns LDAP_SUCCESS, LDAP_NO_MEMORY, or LDAP_OTHER for a
// null argument.
DIRBASE_EXPORT int duplicateBVMod(const LDAPMod* mod, LDAPMod** copy);

// Copies a chain of such records behind the end of the chain *copies, which may be null. Returns LDAP_SUCCESS, also for
// null arguments, or LDAP_NO_MEMORY: then the chain has the copies that were made before.
DIRBASE_EXPORT int duplicateAllMods(const LDAPMod* first, LDAPMod** copies);

// Copies an array. Values that are texts become bervals of their length, and each mod_op has LDAP_MOD_BVALUES. Null for
// null, and when memory ran out.
DIRBASE_EXPORT LDAPMod** DuplicateMods(LDAPMod* const* array);

// ---- joining --------------------------------------------------------------------------------------------------------

// Moves the records of an array to the end of another one; mod_next stays as it is.
//
//   array  *array may be null; it is a terminated array after a success
//   other  may be null; after a success the caller releases this block, and only the block, with free()
//
// Returns LDAP_SUCCESS, LDAP_OTHER for a null `array`, or LDAP_NO_MEMORY with both arrays as they were.
DIRBASE_EXPORT int modarray_merge(LDAPMod*** array, LDAPMod** other);

DIRBASE_C_END
