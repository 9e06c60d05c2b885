// Values of attributes between the clear and their stored form, by the methods of the password library.
//
// Values and their texts are blocks of malloc. Each call works on what the caller holds; nothing here locks.
#pragma once

#include "libraries/dirbase_export.h"
#include "libraries/libber/berval.h"
#include "libraries/libpwd/pwd_format.h"

DIRBASE_C_BEGIN

// The server's key, used where a call passes none. Null at start; the front end sets it before other threads run and
// keeps the record.
DIRBASE_EXPORT extern aes_key_data* g_DirKeyData;

// Makes the stored form of a value.
//
//   method  a one-way or two-way method, but neither 1 (clear text) nor 4 (crypt).
//   value   not null; left alone unless it is `out`.
//   out     not null; takes a new text with a zero byte behind it, for the caller to free(), and its length. As `value`
//           itself it gives up its old text, which is wiped, for the new one, and is left alone where none is made. Any
//           other is cleared first. So a null bv_val (as `value` itself: an unchanged one) means that no text was made.
//   key     null means g_DirKeyData.
//
// Returns LDAP_SUCCESS, also where the password library makes no text (there is no key, the method is unknown);
// LDAP_OTHER for methods 1 and 4; LDAP_NO_MEMORY after telling the debug log.
DIRBASE_EXPORT int value_encode_one_value(int method, const berval* value, berval* out, const aes_key_data* key);

// Encodes in place those values of a null-terminated array that are clear text; others are encoded already.
//
//   method   as above; 1 changes nothing and succeeds.
//   freeOld  non-zero: replaced texts are wiped and released. 0: they stay the caller's.
//
// Returns LDAP_SUCCESS or the first failure of value_encode_one_value, with the values before it encoded. A value for
// which the password library makes no text stays in the clear, which is told to the debug log.
DIRBASE_EXPORT int value_encode_values(int method, berval** values, int freeOld, const aes_key_data* key);

// Decodes in place, with g_DirKeyData, those values of a null-terminated array that are stored by a two-way method.
// Replaced texts are released; a value that can't be decoded stays as it was. Values in the clear are the caller's to
// wipe. Returns LDAP_SUCCESS.
DIRBASE_EXPORT int value_decode_values(berval** values);

DIRBASE_C_END
