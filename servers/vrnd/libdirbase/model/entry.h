// The entry: a DN, its normal form, and the attributes, each of them a record on two lists (attribute.h).
//
// An entry is changed by one thread at a time; while nobody changes it any number of threads may read. What takes the
// name of an attribute looks it up: the caller holds the read side of the schema lock
// (ldcf_api_get_modify_attr_info_lock_g).
#pragma once

#include <stdbool.h>
#include <stddef.h>
#include <stdint.h>

#include "libraries/dirbase_export.h"
#include "libraries/libber/berval.h"
#include "libraries/libber/ldap_mod.h"

typedef struct attr_index attr_index;
typedef struct Attribute Attribute;
typedef struct avl_node avl_node;

// Bits of e_flag.
DIRBASE_NUMBER(uint8_t, ENTRY_IN_CACHE, 0x01);        // the entry belongs to a cache, which alone may release it
DIRBASE_NUMBER(uint8_t, ENTRY_MEMBER_TRIMMED, 0x02);  // the text that it was read from had `member` lines, trimmed
DIRBASE_NUMBER(uint8_t, ENTRY_UNIQUEMEMBER_TRIMMED, 0x04);  // the same for `uniquemember`

// All pointers are owned by the entry and come from malloc, but for the slots, the back end's word and the index. A new
// entry is zeroed.
typedef struct Entry Entry;
struct Entry {
    char* e_dn;          // as given
    Attribute* e_attrs;  // in order of arrival: the first
    int32_t e_id;        // 0 when none was given
    uint8_t e_flag;
    Attribute* e_sorted_low;       // in order of names: the smallest
    Attribute* e_sorted_high;      // and the largest
    Attribute* e_attrs_tail;       // in order of arrival: the last
    char* e_norm_dn;               // the upper text of dn_normalize_esc for e_dn
    void* e_backend_word;          // the back end's own; a copy of the entry takes the same pointer
    char* e_checksum;              // value of xan-entryCheckSum as the back end holds it
    char* e_checksumop;            // value of xan-entryCheckSumOp as the back end holds it
    berval** e_backend_values[4];  // filled by the back ends

    // Direct slots: the record of an attribute that nearly every operation asks for, or null. Of `ref` the version
    // without a language tag, of the others that version as long as there is one.
    Attribute* e_objectclass_attr;
    Attribute* e_ref_attr;
    Attribute* e_member_attr;
    Attribute* e_uniquemember_attr;
    Attribute* e_allmembers_attr;

    // Numbers of values as the back end knows them: -1 after values were merged, 0 after the attribute was deleted.
    int64_t e_member_count;
    int64_t e_uniquemember_count;

    // The library's own.
    attr_index* e_index;       // made once an entry has very many attributes, else null
    int32_t e_extra_versions;  // how many records may be further versions of an attribute: those with a language
                               // tag, and those that the schema didn't know when they came
};

DIRBASE_C_BEGIN

// Makes a zeroed entry. Returns LDAP_SUCCESS, LDAP_OTHER for a null argument, or LDAP_NO_MEMORY with *entry null.
DIRBASE_EXPORT int CreateEntry(Entry** entry);

// Releases an entry with all that it owns. An entry that belongs to a cache (ENTRY_IN_CACHE) stays as it is, with a
// line in the debug log. Null does nothing.
DIRBASE_EXPORT void entry_free(Entry* entry);

// Whether the entry holds a value of an attribute. `value` has `length` bytes. Values of `objectclass`, and of an
// attribute without a value tree, compare without regard to the case of ASCII letters and up to a byte 0, others by
// their syntax. So of binary values the answer may be true for others of that length. False for a null argument.
DIRBASE_EXPORT bool verify_attribute(const Entry* entry, const char* name, const char* value, size_t length);

// Removes the values of a modification, which are bervals, or for one without values the whole attribute. The value
// tree keeps them: it is the caller's to mend, by delete_valuetree_value. Decoded values are dropped with the first
// that goes. An attribute may be left with no values.
//
// Returns LDAP_SUCCESS, or LDAP_NO_SUCH_ATTRIBUTE for an attribute or value that isn't there, a null argument, and
// without memory to look the name up; the values before it are gone then, and those behind it are left.
DIRBASE_EXPORT int delete_values_from_entry(Entry* entry, const LDAPMod* mod);

// Releases the nodes of a value tree with their values. Null does nothing. Returns 0.
DIRBASE_EXPORT int free_attrtree(avl_node* node);

DIRBASE_C_END
