// Controls of a request or a response (RFC 4511 section 4.1.11), and the arrays that carry them.
//
// Records, texts, bytes and arrays are blocks of malloc; an array is null-terminated. Nothing here is shared: calls on
// different arrays may run at once.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"
#include "libraries/libber/berval.h"

typedef struct LDAPControl LDAPControl;
struct LDAPControl {
    char* ldctl_oid;           // null only in a record that is still to be filled
    berval ldctl_value;        // bv_val is null when the control has no value
    int32_t ldctl_iscritical;  // 0: not critical; any other value: critical
};

DIRBASE_C_BEGIN

// Release a control with its text and value, and an array with its controls. Null does nothing.
DIRBASE_EXPORT void ldap_control_free(LDAPControl* control);
DIRBASE_EXPORT void ldap_controls_free(LDAPControl** controls);

// Returns a copy for the caller to release with ldap_control_free, or null when `control` is null or memory ran out. A
// value is copied with a zero byte behind it that its length doesn't count; no text stays null, no value stays none.
DIRBASE_EXPORT LDAPControl* ldap_copy_control(const LDAPControl* control);

// Copies an array with its controls.
//
//   copy  receives the copy, for the caller to release with ldap_controls_free; null for a null array, and on failure.
//
// Returns LDAP_SUCCESS, LDAP_PARAM_ERROR when `copy` is null, or LDAP_NO_MEMORY.
DIRBASE_EXPORT int ldap_copy_controls(LDAPControl* const* controls, LDAPControl*** copy);

// Adds a control at the end of an array; no copy is made.
//
//   control   belongs to the array from then on.
//   controls  the place of the array. A null array becomes a new one, another may move.
//
// Returns LDAP_SUCCESS, LDAP_PARAM_ERROR for a null argument, or LDAP_NO_MEMORY. After a failure the array is as it
// was, and the control is still the caller's.
DIRBASE_EXPORT int ldap_insert_control(LDAPControl* control, LDAPControl*** controls);

// Takes a control out of an array; the others keep their order. An array that becomes empty is released and its place
// set to null.
//
//   control       the very one, told by its address and not by its text.
//   free_control  not 0: the control is released; 0: it is the caller's.
//
// Returns LDAP_SUCCESS, or LDAP_PARAM_ERROR for a null argument or a control that isn't in the array.
DIRBASE_EXPORT int ldap_remove_control(LDAPControl* control, LDAPControl*** controls, int free_control);

DIRBASE_C_END
