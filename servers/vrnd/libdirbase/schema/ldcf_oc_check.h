// The older check of an entry: each class by its own MUST and MAY lists, without what it inherits.
//
// It is weaker than ldcf_api_schema_check: a class may be named without its superclasses, and then nothing of theirs is
// required or permitted. All look names up in the active schema, under the read side of its lock; the entry isn't
// changed. None raises an exception.
#pragma once

#include <stdbool.h>

#include "servers/vrnd/libdirbase/model/attribute.h"

DIRBASE_C_BEGIN

// Checks an entry: the attributes that its classes require, those that they permit, its DN and the values that are DNs
// by their grammar (dn_check.h), and the number of values of boolean attributes. An alias is only asked for what the
// alias classes require.
//
// Returns LDAP_SUCCESS, LDAP_OBJECT_CLASS_VIOLATION, LDAP_INVALID_DN_SYNTAX, LDAP_INVALID_SYNTAX or LDAP_NO_MEMORY;
// a null entry passes. Faults go to the message log, all missing attributes, or else all that aren't permitted.
DIRBASE_EXPORT int ldcf_oc_schema_check(const Entry* entry);

// Whether an entry has a value of every attribute that a class itself requires: 0, or 1 with a message for each that
// is missing. Also 1 for a class that the schema lacks, a null argument and without memory.
DIRBASE_EXPORT int oc_check_required(const Entry* entry, const char* objclass);

// Whether one of the classes in `values` (null-terminated) itself requires or permits an attribute: 0, or 1 with a
// message; `dn` is for that. `objectclass` is always permitted, and so is everything when there is a class that the
// schema lacks. Also 1 for a null type and without memory.
DIRBASE_EXPORT int oc_check_allowed(const char* type, berval** values, const char* dn);

// 0 when two names lead to one attribute type, else 1. The second may have ";binary" behind it, if the type's syntax is
// binary.
DIRBASE_EXPORT int oc_attr_type_cmp(const char* a, const char* b);

// Whether a class's own list names the attribute "userpassword" in so many letters; `attribute` isn't looked at.
//
//   where  0 the MAY list, 1 the MUST list, 2 both; for any other number the answer is false
DIRBASE_EXPORT bool ldcf_api_oc_contains_attr(const char* objclass, const char* attribute, int where);

DIRBASE_C_END
