// The value tree of an attribute: its values in normal form, parsed once, for finding one among very many.
//
// a_tree is an AVL tree of AttrvalsNorm (value_compare.h) in the order of value_cmp_fast, without duplicates. It is
// optional; where there is one, it holds the normal form of every value that has one. So what adds values without a
// tree drops it.
//
//   - A binary node records a length only. The tree of a binary attribute holds at most one node a length and is no
//     index.
//   - Of an encrypted attribute, values in their stored form are looked at as bytes. They stay out of the tree, whose
//     other nodes they don't compare with.
//
// Concurrent readers of a finished attribute may call value_find and value_find_short_list. Everything here reads the
// attribute's schema record: the caller holds the read side of the schema lock.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/model/value_compare.h"

DIRBASE_C_BEGIN

// Makes a node of a value.
//
//   node       takes the new node for free_AttrvalsNorm; null on failure
//   value      not null; null bytes are the empty value
//   normalize  0: text with SC_CIS is taken as it is
//
// Returns LDAP_SUCCESS; LDAP_INVALID_SYNTAX for an unknown code or a text that isn't of its syntax; another failure of
// value_normalize_berval or str2syntaxvalue; LDAP_NO_MEMORY, also for a text of 2 GB and more.
DIRBASE_EXPORT int create_normalized_berval_in_attrvalsNorm(AttrvalsNorm** node, const berval* value, uint32_t syntax,
                                                            int normalize);

// Releases a node; null does nothing.
DIRBASE_EXPORT void free_AttrvalsNorm(AttrvalsNorm* node);

// Whether an attribute has a value: 0 when it has, 1 when it hasn't, -1 when that can't be told, since there is no tree
// or the value is none of the syntax (or memory ran out); the caller then looks for himself.
//
//   syntax     the code of the tree's nodes, which is the attribute's; with SC_BIN the values are compared byte for
//              byte, one after the other, and the tree isn't used
//   normalize  0: `value` is in normal form already
//
// The value "default" of `ownersource` and `aclsource` is found as it is stored, without being normalised
// (value_add.h).
DIRBASE_EXPORT int value_find(const Attribute* attr, const berval* value, uint32_t syntax, int normalize);

// Whether a raw text of that many bytes is one of the values without regard to ASCII case: 0 when it is, else 1. Looks
// at one value after the other, so it is for lists that the caller thinks short.
DIRBASE_EXPORT int value_find_short_list(const Attribute* attr, const char* text, int64_t length);

// Takes a value of the attribute's syntax, which is normalised first, out of the tree; the value array is the caller's
// to change. Returns LDAP_SUCCESS, also without a tree and when the value isn't in it, or the failure to make a node.
DIRBASE_EXPORT int delete_valuetree_value(Attribute* attr, const berval* value, uint32_t syntax);

DIRBASE_C_END

#ifdef __cplusplus

// Whether a value is the word "default" for one of the attributes that take it in place of a DN.
bool is_default_source(const Attribute& attr, const berval& value);

#endif
