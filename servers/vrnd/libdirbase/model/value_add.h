// Adding values to an attribute: to its array, and to its value tree (attr_value_tree.h).
//
// Value arrays are null-terminated; they and the bervals in them are blocks of malloc. An attribute knows the number of
// its values and the room of its array, so nothing here counts what is there. The array grows by a rule: for a new
// total of T values it gets 2T + 1 pointers, from T = 10001 on T + 10001.
//
// Every call either adds all values that it is given (less the duplicates, where these are dropped) or none: after a
// failure the attribute has its old values and its old tree. Memory running out gives LDAP_NO_MEMORY and a line in the
// debug log. What adds values to an attribute drops a_decoded, which would lack them; for value_add_fast, which doesn't
// know the attribute, that and the tree are the caller's to drop.
//
// One thread at a time changes an attribute. It holds the read side of the schema lock, since the attribute's schema
// record is read. The values that are given may not be the attribute's own array.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"
#include "servers/vrnd/libdirbase/model/attribute.h"

// Bits of the mode of create_normalized_values.
DIRBASE_NUMBER(int, VALUES_TREE_ONLY, 1);  // the array isn't touched: `values` are in it already
// The values have been decoded, so their tree is kept for an encrypted attribute, too.
DIRBASE_NUMBER(int, VALUES_ARE_CLEAR, 2);

DIRBASE_C_BEGIN

// Appends copies of values, unchecked. A value tree is dropped, as it would lack them; the next value_add_normalize
// builds it anew, so the two don't go well in turns. Returns LDAP_SUCCESS or LDAP_NO_MEMORY.
//
//   array   &attr->a_vals; becomes an array of one pointer at least
//   values  null-terminated; null for none
//   attr    not null: its counts are used and kept
DIRBASE_EXPORT int value_add(berval*** array, berval** values, Attribute* attr);

// Appends copies of values for a caller that keeps the counts himself. The room is doubled until it suffices. Returns
// LDAP_SUCCESS or LDAP_NO_MEMORY; *array and *capacity may have grown then, and the values are the old ones.
//
//   array      *array may be null
//   old_count  values in the array
//   added      values in `values`, none of them null
//   capacity   room of the array in pointers, 0 for null; takes the new one
DIRBASE_EXPORT int value_add_fast(berval*** array, berval** values, int64_t old_count, int64_t added,
                                  int64_t* capacity);

// Appends values and keeps the value tree: create_normalized_values on an array that is made to fit.
//
//   drop_duplicates  not 0: a value whose normal form is there already is passed over
//   decode           not 0: values of an attribute encrypted two ways are decoded first (dup_and_decode_vals)
//
// Returns what create_normalized_values gives. A value takes its slot in the array, two blocks for its copy, and two
// for its node and that of the tree; the cost of one grows with the logarithm of their number.
DIRBASE_EXPORT int value_add_normalize(berval*** array, berval** values, uint32_t syntax, Attribute* attr,
                                       int drop_duplicates, int decode);

// Puts values into an array that has the room for them, and into the value tree.
//
//   mode       VALUES_ bits
//   out_count  takes how many went into the array
//   new_count  number of new values
//   old_count  number of values in the array; the new ones go behind them, without a terminator
//   syntax     the attribute's
//
// Values are normalised, except where the first one is "default" for `ownersource` or `aclsource`: then none of the
// call is. Of an attribute without encryption the tree is kept; where it is missing it is first built over the values
// that are there (those that their syntax refuses are left out). Of an encrypted attribute it only serves to find
// duplicates within the call, unless the values are clear, and is dropped at the end. A value in stored form is then
// compared as bytes. A clear value of an attribute encrypted one way goes into the array in its normal form, if that is
// text.
//
// Binary values are compared with all that are there, byte for byte.
//
// Returns LDAP_SUCCESS; LDAP_OPERATIONS_ERROR for a null attribute; LDAP_OTHER when duplicates are to be dropped in a
// mode that makes no nodes; the failure to make a node; LDAP_NO_MEMORY. On failure out_count is 0.
DIRBASE_EXPORT int create_normalized_values(int mode, int64_t* out_count, int64_t new_count, int64_t old_count,
                                            berval** values, berval*** array, Attribute* attr, uint32_t syntax,
                                            int drop_duplicates);

// Makes an array of values with those in a two-way stored form decoded by the server's key. All others are the caller's
// own records, and so is a value that claims to be encoded and can't be decoded: it stands for itself, as
// value_decode_values leaves it, and the batch goes on.
//
//   copies  takes the null-terminated array for free_dup_vals
//
// Returns LDAP_SUCCESS or LDAP_NO_MEMORY.
DIRBASE_EXPORT int dup_and_decode_vals(berval** values, berval*** copies);

// Releases such an array and overwrites what was decoded. Null does nothing.
DIRBASE_EXPORT void free_dup_vals(berval** values, berval** copies);

DIRBASE_C_END
