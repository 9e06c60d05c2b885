// Whether an entry obeys the schema: what a server asks before it stores one (RFC 4512, sections 2.4 and 2.5).
//
// The check goes over the attributes (each known, with one value where it must be), then over the classes (each known),
// and then compares the attributes that are present with those that the classes require and permit. It works on handles
// of the schema and on sorted ranges of them, and takes no reference, so that threads don't meet in the counters.
//
// Calls are made under the read side of the schema lock (ldcf_api_get_modify_attr_info_lock_g), by any number of
// threads; the entry belongs to the caller.
#pragma once

#include <stdbool.h>

#include "servers/vrnd/libdirbase/model/attribute.h"

#ifdef __cplusplus
#include "servers/vrnd/libdirbase/schema/ldcf_entry_finding.h"
#include "servers/vrnd/libdirbase/schema/ldcf_schema.h"
#endif

typedef struct ldcf_schema ldcf_schema;  // opaque in C

// How entries are checked, the values of ldcf_api_set_schema_check. Any other value leaves out the tests of the number
// of structural classes and of superclasses.
enum ldcf_schema_check_mode DIRBASE_ENUM_INT {
    ldcf_check_declared = 1,  // the older check, by what each class itself declares (ldcf_oc_check.h)
    ldcf_check_strict = 2,    // one base structural class; a missing superclass is a fault, but for `top`
    ldcf_check_lenient = 3,   // any number of structural classes but none; missing superclasses are added
    ldcf_check_none = 4,      // every entry passes
};

#ifdef __cplusplus

// Checks an entry and hands each fault to a sink: ldcf_api_schema_check for those who want the faults as data.
//
//   schema  complete. Names and classes are looked up in it; the records that the attributes carry, and the DNs, are
//           those of the active schema in any case, which it usually is.
//   entry   gets the superclasses that it lacks, as values of its object class attribute, where the mode says so; these
//           stay whatever the result. Nothing else of it is changed. Null passes.
//   mode    one of ldcf_schema_check_mode
//   policy  also permits the password policy attributes, which the schema must then hold, and the attributes of the
//           access classes RESTRICTED and SYSTEM
//   added   may be null; takes whether the check had a value to add (and did, unless memory ran out for it)
//
// Returns LDAP_SUCCESS; LDAP_OBJECT_CLASS_VIOLATION; LDAP_INVALID_DN_SYNTAX or LDAP_UNDEFINED_TYPE for a DN, of the
// entry or a value; LDAP_INVALID_SYNTAX (the older check only); LDAP_NO_MEMORY. With all but the first and the last a
// fault was reported. An alias or a referral is judged by check_aliasObject or check_referralObject in place of the
// tests by sets: one without a structural class has that reported and may pass all the same. The entry's own DN is
// looked at only while e_norm_dn is null (the older check always looks): str2entry and LDAPModToEntry have normalised
// it, with an empty or cut e_norm_dn for a bad DN, which is no fault here. Raises
// exc_not_enough_memory_t, and what the sink raises.
DIRBASE_EXPORT int ldcf_check_entry(const ldcf_schema& schema, Entry* entry, int mode, bool policy, bool* added,
                                    ldcf_entry_sink& sink);

#endif

DIRBASE_C_BEGIN

// Checks an entry against the active schema, in the mode of ldcf_api_get_schema_check, as ldcf_check_entry does; faults
// go to the logs. An exception ends here with LDAP_OPERATIONS_ERROR, but for lack of memory in the older check, which
// is LDAP_NO_MEMORY.
DIRBASE_EXPORT int ldcf_api_schema_check(Entry* entry, bool* added, bool policy);

// Normalises each value of an attribute whose record says that its values are DNs. Returns LDAP_SUCCESS, also for any
// other attribute and one without values; the result of the first DN that can't be normalised; LDAP_NO_MEMORY. `schema`
// isn't looked at.
DIRBASE_EXPORT int check_dn_in_attr(const ldcf_schema* schema, const Attribute* attr);

// Whether an alias has its one aliasedObjectName or aliasedEntryName, and whether a referral has a `ref`; all other
// attributes must be known. The entry isn't null. What the classes require and permit isn't looked at. Return
// LDAP_SUCCESS or LDAP_OBJECT_CLASS_VIOLATION, with a line in the debug log.
DIRBASE_EXPORT int check_aliasObject(const Entry* entry);
DIRBASE_EXPORT int check_referralObject(const Entry* entry);

DIRBASE_C_END
