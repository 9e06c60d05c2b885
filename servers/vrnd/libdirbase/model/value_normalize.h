// The normal form of values: two values of an attribute are equal exactly when their normal forms are (RFC 4517).
//
// Only text that is compared without regard to case has one: syntax codes with SC_CIS. Everything else is left alone,
// with result LDAP_SUCCESS. The first bit of the code that is set decides:
//
//     SC_DN              the upper text of dn_normalize_esc
//     SC_TEL             without spaces and hyphens, a to z in upper case
//     SC_BIT_STRING      '0101'B without quotes and letter; spaces around it are passed over
//     SC_NUMERIC_STRING  digits without the spaces around them; may be empty
//     SC_COUNTRY_STRING  two letters, in upper case
//     none of these      utfToUpper; spaces stay, and from bytes on that aren't UTF-8 everything does
//
// A text ends at its first zero byte, and the zero byte behind a value's counted bytes is relied on: ber_bvdup puts one
// there. A value with a zero byte among those is refused where the rule may refuse a text. Results: LDAP_SUCCESS;
// LDAP_INVALID_SYNTAX with a line in the debug log for a text that the rule refuses; what dn_normalize_esc has for a
// DN; LDAP_NO_MEMORY. A refused text is left as it was.
//
// Any thread may call these on texts of its own. For DNs it holds the read side of the schema lock.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"
#include "libraries/libber/berval.h"

DIRBASE_C_BEGIN

// Normalises a text in place, except for a DN, whose text is replaced by a new one and released.
//
//   text  address of a text of malloc; *text stays at the start of it in all cases.
DIRBASE_EXPORT int value_normalize(char** text, uint32_t syntax);

// The same for a value, whose length becomes that of its normal form. The buffer is kept where the normal form fits
// into it. Else a new one takes its place, which only happens to DNs.
//
//   value     not null; null bytes are the empty text.
//   embedded  not 0: the buffer is part of another block, so it isn't released when it is replaced; the caller compares
//             bv_val with what it was, and free()s a new one.
DIRBASE_EXPORT int value_normalize_berval(berval* value, uint32_t syntax, int embedded);

// Prepares a value for the relational store: a copy, normalised where that can be done and as given where not.
//
//   target  *target is a record of the caller's; it takes the length and new bytes for the caller to free(), with a
//           zero byte behind them. For a code with SC_BIN *target is set to null instead.
//
// Returns LDAP_SUCCESS, also when the normal form is refused; or LDAP_NO_MEMORY, and the record is empty.
DIRBASE_EXPORT int value_normalize_for_tables(const berval* source, berval** target, uint32_t syntax);

DIRBASE_C_END
