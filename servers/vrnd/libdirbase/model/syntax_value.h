// Values by their syntax: whether a text is legal, and the typed form in which it is held and compared (RFC 4517).
//
// Only integers, booleans and times have a typed form; what is held as text or bytes keeps its text. A syntax is told
// by its whole code (base/syntax_codes.h). Nothing here keeps or changes a text, and every function may be called from
// any thread. A null text is no value of any syntax that is looked at: LDAP_INVALID_SYNTAX, and what dn_check says in
// the case of a DN.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"

DIRBASE_C_BEGIN

// Whether a text is an integer from -2147483648 to 2147483647, in at most ten digits behind a sign or none:
// LDAP_SUCCESS or LDAP_INVALID_SYNTAX. No digits at all is the integer 0.
DIRBASE_EXPORT int int_str_check(const char* text);

// The integer that a text stands for, or 1 for "TRUE" and 0 for "FALSE" in any case: a new integer for the caller to
// free(). `result` receives LDAP_SUCCESS; or LDAP_INVALID_SYNTAX when the text is none, or LDAP_NO_MEMORY, and the
// return is null.
DIRBASE_EXPORT int32_t* str2int(const char* text, int* result);
DIRBASE_EXPORT int32_t* str2bool(const char* text, int* result);

// Whether a text is legal for a syntax: LDAP_SUCCESS; LDAP_INVALID_SYNTAX; LDAP_INVALID_DN_SYNTAX for a bad DN;
// LDAP_OPERATIONS_ERROR when the clock can't be read for a UTC Time. Texts and bytes are always legal, and so is
// everything of a syntax that isn't known.
DIRBASE_EXPORT int check_syntax(uint32_t syntax, const char* text);

// How many bytes a value takes in a value tree.
//
//   text_length  bytes of the value's text; a negative one stands for no value and gives length 0.
//   length       receives the text's own length; 4 for integers and booleans, 16 for times; 1 for binary values, whose
//                bytes aren't held in the tree.
//
// Returns LDAP_SUCCESS, or LDAP_INVALID_SYNTAX with length 0 for an unknown syntax.
DIRBASE_EXPORT int find_value_length(uint32_t syntax, int text_length, int* length);

// The typed form of a value, in a new block for the caller to free(): of SC_INT and SC_BOOL an int32_t, of SC_GT
// and SC_UTCT a tag_timestamp_struct (timestamp.h).
//
//   result  receives LDAP_SUCCESS; on failure that of str2int, str2bool or str2timestamp, or LDAP_INVALID_SYNTAX for an
//           unknown syntax.
//
// Returns null on failure, and for a syntax that has no typed form with LDAP_SUCCESS.
DIRBASE_EXPORT void* str2syntaxvalue(const char* text, uint32_t syntax, int* result);

DIRBASE_C_END
