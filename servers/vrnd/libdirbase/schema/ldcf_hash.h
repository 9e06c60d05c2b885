// The name cache: attribute names to flat records, in front of the schema's maps.
//
// A fixed number of slots, each the head of a chain; keys are names folded to upper case. Any number of threads may
// look names up while nobody changes the cache. It is filled and emptied at start-up and under the write side of the
// schema lock.
#pragma once

#include <stddef.h>
#include <stdint.h>

#include "libraries/dirbase_export.h"
#include "servers/vrnd/libdirbase/schema/asyntaxinfo.h"

DIRBASE_NUMBER(size_t, ldcf_hash_slots, 7001);
DIRBASE_NUMBER(size_t, ldcf_hash_longest_key, 1024);

// A node. The key and the node are one block; the record is the definition's.
typedef struct ldcf_hash_tbl_entry ldcf_hash_tbl_entry;
struct ldcf_hash_tbl_entry {
    char* name;  // the key, in upper case
    asyntaxinfo* info;
    int32_t length;  // of the key
    ldcf_hash_tbl_entry* next;
};

DIRBASE_C_BEGIN

// The slot of a key, which isn't null: the hash of ELF symbol tables over its bytes as they stand, taken as signed. A
// name is folded first.
DIRBASE_EXPORT uint32_t ldcf_hash_name(const char* key);

// The node of a name, without regard to case (only bytes from 'a' to 0x7f fold); null when the cache lacks it, the name
// is null or has more than ldcf_hash_longest_key bytes.
DIRBASE_EXPORT const ldcf_hash_tbl_entry* ldcf_hash_get(const char* name);

// Adds a node ahead of all others of its slot. A null or too long name, or no memory, adds nothing.
DIRBASE_EXPORT void ldcf_hash_put(const char* name, asyntaxinfo* info);

// Empties the cache and leaves the records alone.
DIRBASE_EXPORT void ldcf_hash_flush(void);

// Writes the cache to a file, for the developer; does nothing when the file can't be opened.
DIRBASE_EXPORT void ldcf_debug_hash_tbl(const char* filename);

DIRBASE_C_END
