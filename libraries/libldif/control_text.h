// Controls as LDIF has them (RFC 2849): "control: OID [true|false]" and perhaps ": value", ":: Base64" or ":< URL".
//
// Any number of threads may call these on texts and controls of their own.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"
#include "libraries/libber/ldap_control.h"

DIRBASE_C_BEGIN

// Makes a control of what stands behind "control:".
//
//   line       zero-terminated; not changed
//   is_base64  takes 1 when the value is in Base64, else 0
//   is_url     takes 1 when it is a URL, whose file is read then (localfromfile_url), else 0
//
// The word behind the OID tells the criticality, "true" or "false", on whichever side of the ":"; any other is the
// value of a control that isn't critical, and ends at a space, ":" or line end. Behind a criticality a plain value is
// all that follows the ":" up to the line end, spaces included; with a blank in front of the ":" that mark belongs to
// it. A Base64 value that reads "true" or "false" is taken for the criticality.
//
// Returns a new control for the caller to release with ldap_control_free. Null, with a line in the debug log, for null
// arguments, without an OID, for bad Base64, a file that can't be read, and without memory.
DIRBASE_EXPORT LDAPControl* string2control(const char* line, int* is_base64, int* is_url);

// The text of a control, new, for the caller to free(): with a value a line with its line feed, without one a line that
// lacks it. Null for a null control, one without an OID, and without memory.
DIRBASE_EXPORT char* control2string(const LDAPControl* control);

// Appends the controls that stand in a text, each from one "control" to the next.
//
//   array  null-terminated, of malloc; null for none. The old array isn't to be used afterwards.
//   text   changed
//
// Returns the array, grown; stretches of the text that give no control are left out. A text without controls, and
// memory running out for the array, leave it as it is.
DIRBASE_EXPORT LDAPControl** string2controlarray(LDAPControl** array, char* text);

// The texts of all controls, with a line feed between two of them (and behind a single one), new, for the caller to
// free(). Null for a null or empty array, and without memory.
DIRBASE_EXPORT char* control2stringarray(LDAPControl** array);

// Reads a file whole.
//
//   target  takes the bytes, new, for the caller to free(); they aren't zero-terminated. After a failure it is as it
//           was.
//
// Returns their number, or -1 with a line in the debug log.
DIRBASE_EXPORT int64_t localfromfile(const char* path, berval* target);

// The same for a URL "file:///path" (RFC 8089), whose percent escapes are decoded in place. Any other gives -1, and so
// does an escaped zero byte.
DIRBASE_EXPORT int64_t localfromfile_url(char* url, berval* target);

DIRBASE_C_END
