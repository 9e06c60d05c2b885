// The attributes of an entry.
//
// Each version of an attribute (the type without a language tag, or with one; see language_tag.h) is a record. Records
// are threaded on two lists of the entry at once: in order of arrival from e_attrs by a_next, and in order of names
// from e_sorted_low by a_sorted_next.
//
// An entry, its attributes and their values are changed by one thread at a time; while nobody changes them any number
// of threads may read. Calls are made under the read side of the schema lock (ldcf_api_get_modify_attr_info_lock_g), to
// which the schema records belong. Where a schema record may be given it is the one of the name, and null has
// the name looked up. What finds and removes treats a name that there is no memory to look up (ldcf_api_attr_get_info)
// as one that the schema doesn't know; what adds says LDAP_NO_MEMORY.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"
#include "libraries/libavl/avl.h"
#include "libraries/libber/berval.h"
#include "servers/vrnd/libdirbase/model/entry.h"
#include "servers/vrnd/libdirbase/schema/asyntaxinfo.h"

// One version of an attribute. Blocks of malloc, owned by the record except where it says otherwise.
typedef struct Attribute Attribute;
struct Attribute {
    char* a_type;       // the name as stored, with its language tag; in the same block as the record
    berval** a_vals;    // null-terminated; null until the first value
    int32_t a_syntax;   // syntax code; SC_CIS when the schema doesn't know the attribute
    Attribute* a_next;  // in order of arrival
    Attribute* a_prev;
    avl_node* a_tree;  // the value tree (attr_value_tree.h), or null; may be dropped at any time
    int64_t a_numvals;
    int64_t a_maxvals;         // room of a_vals, in pointers
    asyntaxinfo* a_info;       // schema record, or null; the schema's
    Attribute* a_sorted_next;  // towards the larger names
    Attribute* a_sorted_prev;  // towards the smaller names
    berval** a_decoded;        // the values of an encrypted attribute in the clear, null-terminated, or null
};

// What flatattr_apply calls. Not 0 for a failure, which ends the walk.
typedef int (*flatattr_function)(Attribute* attr, void* argument);

DIRBASE_C_BEGIN

// ---- adding ---------------------------------------------------------------------------------------------------------

// Adds values to an entry under a name, which makes the record where it isn't there. Values are copied.
//
//   name             with a language tag or none. A name in numeric form, or with "oid." in front, is stored as the
//                    schema's first name, where there is one, with the tag behind it. One that the schema doesn't
//                    know is stored as it is, with SC_CIS.
//   values           null-terminated; null for none.
//   drop_duplicates  1: values that are there already are passed over, without a failure.
//   tree_mode        0: without drop_duplicates no value tree (one that was there is dropped, for it would lack the new
//                       values); with it as 1
//                    1: the value tree is kept or built
//                    2: as 1, and values of an attribute encrypted two ways are decoded first
//                    In use are (0, 0) for internal data, (1, 1) for modifications, (0, 1) and (x, 2).
//
// Returns LDAP_SUCCESS; LDAP_INVALID_SYNTAX for a bad tag or a value that its syntax refuses; another failure of
// value_add_normalize; LDAP_NO_MEMORY; LDAP_OTHER for a null entry or name. After a failure the record may be there,
// but with the values that it had. The count of the back end for `member` or `uniqueMember` becomes unknown (-1) in any
// case.
DIRBASE_EXPORT int attr_merge(Entry* entry, const char* name, berval** values, int drop_duplicates, int tree_mode,
                              asyntaxinfo* info);

// The same for a back end that loads very many values: nothing is checked, normalised or put in a tree, and the name is
// looked for only once.
//
//   old_count  has no effect: new values go behind those that the record counts.
//   added      how many there are in `values`, none of them null.
//   capacity   room of the value array in pointers, kept for the caller between calls; 0 at the first.
//   attr       *attr is null at the first call and the record from then on.
//
// Returns LDAP_SUCCESS, LDAP_INVALID_SYNTAX for a tag that is too long, LDAP_NO_MEMORY, LDAP_OTHER for null arguments.
DIRBASE_EXPORT int attr_merge_fast(Entry* entry, const char* name, berval** values, int64_t old_count, int64_t added,
                                   int64_t* capacity, Attribute** attr, asyntaxinfo* info);

// Adds one text value (null counts as the empty one) as attr_merge does with (0, 0), when the name is selected. Returns
// LDAP_SUCCESS when it isn't.
DIRBASE_EXPORT int do_attr_merge(Entry* entry, const char* name, const char* text, char** selected);

// Finds or makes the record of a version.
//
//   info  null for an attribute that the schema doesn't know
//   name  with its tag; stored as it is in a new record
//   attr  takes the record
//   tag   the name's tag, null or empty for none
//
// A known attribute has one record for each tag (by strtagcmp), whatever names it comes under; an unknown one has a
// record for each name (by strcasecmp). Returns LDAP_SUCCESS, LDAP_OTHER for a null entry, out pointer or name,
// LDAP_NO_MEMORY.
DIRBASE_EXPORT int flatattr_insert(Entry* entry, asyntaxinfo* info, const char* name, Attribute** attr,
                                   const char* tag);

// ---- finding --------------------------------------------------------------------------------------------------------

// The record of a version by any name or OID of the attribute; null when there is none, when the schema doesn't know
// the attribute, and when the tag is too long. For `objectclass`, `member`, `uniqueMember` and `xan-allmembers` the tag
// isn't looked at: the entry's slot is the answer. `ignored` has no effect.
DIRBASE_EXPORT Attribute* attr_find(const Entry* entry, const char* name, int ignored, asyntaxinfo* info);

// The record of an attribute with this tag, or without one for a null or empty tag; null when there is none and for a
// null `info`.
DIRBASE_EXPORT Attribute* flatattr_find(const Entry* entry, const asyntaxinfo* info, const char* tag);

// Walk the versions that a name stands for: with a valid language tag the one of that tag, else all, each once.
//
//     int started = 0, tag_state = -1;
//     asyntaxinfo* info = nullptr;
//     Attribute* attr = nullptr;
//     attr_find_attr_or_lang_tag_version(entry, name, &started, &tag_state, &info, &attr);
//     while (attr != nullptr) {
//         ...
//         attr_find_next_attr_match(entry, name, &started, &tag_state, info, &attr);
//     }
//
//   started    0 until a version was found. A walk may also be started by attr_find_next_attr_match.
//   tag_state  1 when the name has a valid tag, 0 when it has none, -1 as long as nobody has looked
//   info       *info is looked up when null
//
// The first call gives the version that attr_find finds, else the first in order of arrival; the others follow in that
// order. Return 0, or 1 for a null argument (`info` of the second may be null and gives no version).
DIRBASE_EXPORT int attr_find_attr_or_lang_tag_version(const Entry* entry, const char* name, int* started,
                                                      int* tag_state, asyntaxinfo** info, Attribute** attr);
DIRBASE_EXPORT int attr_find_next_attr_match(const Entry* entry, const char* name, int* started, int* tag_state,
                                             asyntaxinfo* info, Attribute** attr);

// Calls a function with each record in ascending order of names. The function may delete the record that it is called
// with. Returns 1 when the function failed, else AVL_NOMORE.
DIRBASE_EXPORT int flatattr_apply(Entry* entry, flatattr_function function, void* argument);

// ---- removing -------------------------------------------------------------------------------------------------------

// Removes the record that attr_find gives. Returns 0; 1 when there is none; -1 for an entry without attributes; or
// LDAP_INVALID_SYNTAX for a tag that is too long, which isn't looked at for `objectclass`.
DIRBASE_EXPORT int attr_delete(Entry* entry, const char* name, asyntaxinfo* info);

// Release a record with its values, which is on no list any more; its value tree; its decoded values. Null does
// nothing.
DIRBASE_EXPORT void attr_free(Attribute* attr);
DIRBASE_EXPORT void attr_free_normvals(Attribute* attr);
DIRBASE_EXPORT void attr_free_decodedvals(Attribute* attr);

// ---- values of encrypted attributes ---------------------------------------------------------------------------------

// Fills a_decoded, unless it is there already, with a copy of each value, decoded by the server's key where its form is
// a two-way one. A value that can't be decoded is copied as it is. An attribute that isn't encrypted, or has no values,
// needs nothing. Returns LDAP_SUCCESS, or LDAP_OTHER for a null attribute and without memory.
DIRBASE_EXPORT int attr_create_decodedvals(Attribute* attr);

// Encodes the values in place by the attribute's method. Returns LDAP_NO_SUCH_ATTRIBUTE without a schema record, else
// what value_encode_values gives, LDAP_SUCCESS for an attribute that isn't encrypted.
DIRBASE_EXPORT int attr_encode_attribute(Attribute* attr);

// Decodes the values of an encrypted attribute in place, where they can be, and builds the value tree anew. Returns
// LDAP_SUCCESS, also for an attribute that isn't encrypted, or the failure of create_normalized_values, without a tree
// then.
DIRBASE_EXPORT int attr_decode_and_normalize_values(Attribute* attr);

// The values of the value tree in their order, in a new null-terminated array for the caller to free(); the values stay
// the tree's. It has a_numvals + 1 pointers, so it ends early where several values have one normal form. Null without a
// tree, without an attribute, and when memory ran out.
DIRBASE_EXPORT berval** attr_get_normvals_array(const Attribute* attr);

DIRBASE_C_END
