// Character conversion of the client library, on the platform's iconv and its language information.
#pragma once

#include <stddef.h>

#include <iconv.h>

#include "libraries/dirbase_export.h"

// A conversion from one character set to another. Like the platform's descriptor it remembers how far a text of a
// stateful character set has come, so threads that share one take turns.
typedef struct ldap_iconv_t ldap_iconv_t;
struct ldap_iconv_t {
    iconv_t descriptor;  // (iconv_t)-1 when the platform doesn't offer the conversion
};

// The one item of ldap_nl_langinfo: the name of the current locale's character set.
DIRBASE_NUMBER(int, LDAP_NL_CODESET, 0x3D);

DIRBASE_C_BEGIN

// Makes the conversion from the character set `from` to the character set `to`, by the names that iconv_open knows.
//
// Returns a new record for the caller to close with ldap_iconv_close, also when the conversion isn't available: then
// its descriptor is (iconv_t)-1 and errno tells why (EINVAL: not known; ENOMEM; and so on). Null with ENOMEM when there
// is no memory for the record.
DIRBASE_EXPORT ldap_iconv_t* ldap_iconv_open(const char* to, const char* from);

// Converts as much as it can, and moves the positions and the counts of bytes left on behind what was read and written.
// Where `in` and its position are given, the others must be, too.
//
// With a null `in`, or a null position in it, the conversion is set to the start of a text. Where `out`, its
// position and `out_left` are given, what closes a text in a stateful target is written there first; with a null `out`,
// or a null position in it, nothing is written.
//
// Returns the number of characters for which the target has only a substitute, 0 in general and INT_MAX where it is
// more, or -1 with errno: EILSEQ for input that is no text or that the target lacks, EINVAL for input that ends within
// a character, E2BIG for output without room, EBADF without a conversion. All of these leave the positions at the place
// in question.
DIRBASE_EXPORT int ldap_iconv(ldap_iconv_t* conversion, char** in, size_t* in_left, char** out, size_t* out_left);

// Closes a conversion, or does nothing for null. Returns 0, or -1 with errno when the platform refuses; the record is
// gone either way.
DIRBASE_EXPORT int ldap_iconv_close(ldap_iconv_t* conversion);

// Returns an item of the current locale's language information: a text of the platform's that lives until the next
// setlocale and isn't to be changed. Null for any item but LDAP_NL_CODESET, and when the platform doesn't know.
DIRBASE_EXPORT const char* ldap_nl_langinfo(int item);

DIRBASE_C_END
