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
// it. So a plain value that control2string has written comes back with its space in front, while Base64 comes back as
// it was. A Base64 value that reads "true" or "false" is taken for the criticality, and ":<" with nothing behind it for
// no value. The text is that of one control alone: a missing word is looked for in the lines behind it.
//
// A URL makes the process read whatever regular file it names, of any length, with its own rights: not for texts of
// clients.
//
// Returns a new control for the caller to release with ldap_control_free. Null, with a line in the debug log, for null
// arguments, without an OID, for bad Base64, a file that can't be read, and without memory.
DIRBASE_EXPORT LDAPControl* string2control(const char* line, int* is_base64, int* is_url);

// The text of a control, new, for the caller to free(): with a value a line with its line feed, without one a line that
// lacks it. Null for a null control; for one whose OID is missing or holds a space, a colon or a line end; and without
// memory.
DIRBASE_EXPORT char* control2string(const LDAPControl* control);

// Appends the controls that stand in a text, each from one "control" to the next.
//
//   array  null-terminated, of malloc; null for none. The old array isn't to be used afterwards.
//   text   changed. The word is looked for everywhere, so a plain value that holds it ends there, unlike Base64.
//
// Returns the array, grown, for the caller to release with ldap_controls_free. Stretches of the text that give no
// control, or for which memory ran out, are left out; when all are, a null array becomes an empty one. A text without
// the word, and memory running out for the array, leave it as it is.
DIRBASE_EXPORT LDAPControl** string2controlarray(LDAPControl** array, char* text);

// The texts of all controls, with a line feed between two of them (and behind a single one), new, for the caller to
// free(). The text of a control with a value ends its own line, so an empty line stands behind it. Null for a null or
// empty array, when control2string has no text for one of them, and without memory.
DIRBASE_EXPORT char* control2stringarray(LDAPControl** array);

// Reads a regular file whole.
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
