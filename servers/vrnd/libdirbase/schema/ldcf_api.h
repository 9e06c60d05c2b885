// The door to the schema for the rest of the server: plain functions that see names and flat records, not the classes.
//
// Look-ups, predicates and lists answer from the active schema. They take no lock: any number of threads may call them
// while the caller holds the read side of the schema lock (ldcf_api_get_modify_attr_info_lock_g), or while no change
// can be in progress. Where a record is made for the first time, threads take turns (be_fill_attr_info runs then). The
// life cycle runs on one thread at start-up. No function raises an exception.
#pragma once

#include <stdbool.h>

#include "servers/vrnd/libdirbase/base/backend.h"
#include "servers/vrnd/libdirbase/locking/rdbm_lock.h"
#include "servers/vrnd/libdirbase/schema/asyntaxinfo.h"
#include "servers/vrnd/libdirbase/schema/ldcf_hash.h"

#ifdef __cplusplus
#include "servers/vrnd/libdirbase/schema/ldcf_schema.h"
#endif

typedef struct Entry Entry;
typedef struct ldcf_schema ldcf_schema;  // opaque in C

// What ldcf_api_attrtype_apply calls for each attribute type; a result other than 0 ends the walk.
typedef int (*ldcf_attrtype_function)(asyntaxinfo* info, void* argument);

DIRBASE_C_BEGIN

// ---- life cycle, in this order ------------------------------------------------------------------------------------

// Makes the schema lock, forgets the kept schema entry without freeing it and, at the first call, empties the name
// cache. Nobody may hold the lock. Returns 0.
DIRBASE_EXPORT int ldcf_api_schema_init(void);

// Reads one schema file into the active schema. Returns 0, or 1 when anything is wrong with it: the message log tells,
// and the definitions in front of the fault stay.
DIRBASE_EXPORT int ldcf_api_schema_parse(const char* file);

// Links and checks the active schema. Returns 0, or 1 for a schema that can't be used.
DIRBASE_EXPORT int ldcf_api_schema_complete(void);

// Works out the names in the store, when the back ends are known, and fills the name cache. Returns 0; or 1 for a name
// of a table or column that can't be one, without the back end that g_srvType asks for (backend.h), and without memory.
// Names that the cache has no memory for are found without it.
DIRBASE_EXPORT int ldcf_api_schema_complete_db_names(void);

// ---- the schemas and their lock -----------------------------------------------------------------------------------

// The active schema, which is never null, and that of the change in progress: null before the first change, the active
// one after a change that went through, and an empty one after a change that didn't.
DIRBASE_EXPORT ldcf_schema* ldcf_api_get_schema_g(void);
DIRBASE_EXPORT ldcf_schema* ldcf_api_get_schema_proposed_g(void);

// The lock "ldcf_modify_attr_info_lock": held for reading through every operation, for writing while the active schema
// is replaced.
DIRBASE_EXPORT extern rdbm_lock_t ldcf_api_modify_attr_info_lock_g;
DIRBASE_EXPORT rdbm_lock_t* ldcf_api_get_modify_attr_info_lock_g(void);

// How strictly entries are checked; 2 at start. Set before other threads read it.
DIRBASE_EXPORT extern int32_t ldcf_api_schema_check_g;
DIRBASE_EXPORT void ldcf_api_set_schema_check(int32_t mode);
DIRBASE_EXPORT int32_t ldcf_api_get_schema_check(void);

// The active schema as the entry "cn=schema", kept by the schema back end; null when it must be built again.
DIRBASE_EXPORT extern Entry* ldcf_api_schema_entry_g;

// A schema as that entry: its classes, its attribute types in the standard and the extended form with all defaults
// filled in, its syntaxes and its matching rules, each definition as one value (RFC 4512, section 4.2). The schema is
// complete. Returns a new entry for entry_free, or null when memory ran out.
DIRBASE_EXPORT Entry* ldcf_api_schema2entry(const ldcf_schema* schema);

// Adds one text value (null counts as the empty one) to an entry, by attr_merge, with its results.
//
//   flag  1: a value that is there already is passed over, and the value tree is kept or built; 0: neither
DIRBASE_EXPORT int add_attr_to_entry(Entry* entry, const char* type, const char* text, int flag);

// ---- look-ups -----------------------------------------------------------------------------------------------------

// The record of an attribute type by name or OID, with or without "oid." in front, a language tag or ";binary" behind
// (the latter for types of binary syntax only). Null for a name that the schema lacks, a null or empty name, and a type
// that can't have a record; and without memory for a record that wasn't made yet, or for the name without what stands
// behind it. Memory that ran out leaves errno at ENOMEM: a caller who must tell it from an unknown name sets errno to 0
// first.
//
//   base_out  may be null. For a name that the cache doesn't hold it receives the name without its language tags, a
//             text for the caller to free(), or null when it has none, its tags are too long (240 bytes) or memory ran
//             out. For a name that the cache holds, one with ";binary", and a null or empty one it is left alone: the
//             caller sets it to null.
//
// A name that the cache holds costs no allocation (RFC 4512 section 2.5, RFC 3866).
DIRBASE_EXPORT asyntaxinfo* ldcf_api_attr_get_info(const char* name, char** base_out);

// The OID of an attribute type by name or OID, with or without "oid." in front and ";binary" behind (for types of any
// syntax); owned by the type. Null for a name that the schema lacks, one with language tags, and a null or empty one.
DIRBASE_EXPORT const char* ldcf_api_attr_get_oid(const char* name);

// The record of an attribute type of the proposed schema, by plain name or OID. Null when there is none, as for the
// active schema, and before the first change; it goes with the proposed schema.
DIRBASE_EXPORT asyntaxinfo* ldcf_api_attr_get_info_from_proposed_schema(const char* name);

// The record of the first type, in the order of keys (OIDs first, then names), whose values are in this table, without
// regard to case; null when there is none.
DIRBASE_EXPORT asyntaxinfo* ldcf_api_attr_get_info_based_on_table(const char* table);

// The record of an object class by name or OID; null when the schema lacks it, and without memory for a record that
// wasn't made yet.
DIRBASE_EXPORT objectclassinfo* ldcf_api_objectclass_get_info(const char* name);

// Calls a function with the record of every attribute type, once each. Returns 0, or LDAP_OTHER when a type has no
// record or the function gives anything but 0.
DIRBASE_EXPORT int ldcf_api_attrtype_apply(ldcf_attrtype_function function, void* argument);

// Free a record that belongs to no definition; null does nothing. The first also empties the name cache: under the
// write side of the schema lock.
DIRBASE_EXPORT void ldcf_api_delete_asyntaxinfo(asyntaxinfo* info);
DIRBASE_EXPORT void ldcf_api_delete_objectclassinfo(objectclassinfo* info);

// Drops the record of an attribute type, if it has one, so that the next look-up makes it anew, and empties the name
// cache, which ldcf_api_load_attr_hash fills again. Under the write side of the schema lock. A name that the schema
// lacks does nothing.
DIRBASE_EXPORT void ldcf_api_attrtype_reset_info(const char* name);

// The table of a record, which isn't null (null without tables; not to be changed), and what to do with the text
// afterwards: nothing, it stays with the record.
DIRBASE_EXPORT char* get_qualified_table_name(asyntaxinfo* info);
DIRBASE_EXPORT void free_qualified_table_name(char* name);

// Puts the names and OIDs of the active schema's attribute types into the name cache, but for types whose primary name
// is there already or that have no record. At start-up or under the write side of the schema lock.
DIRBASE_EXPORT void ldcf_api_load_attr_hash(void);

// ---- predicates: false for a name that the schema lacks -------------------------------------------------------------

DIRBASE_EXPORT bool ldcf_api_is_langtag_attr(const char* name);      // may carry language tags
DIRBASE_EXPORT bool ldcf_api_is_unique_attr(const char* name);       // may be made unique over the directory
DIRBASE_EXPORT bool ldcf_api_is_attrcache_attr(const char* name);    // no user attribute
DIRBASE_EXPORT bool ldcf_api_is_config_attr(const char* name);       // a configuration attribute
DIRBASE_EXPORT bool ldcf_api_is_operational_attr(const char* name);  // neither user nor configuration attribute
DIRBASE_EXPORT bool ldcf_api_is_encryptable_attr(const char* name);  // may be encrypted
DIRBASE_EXPORT bool ldcf_api_is_encrypted_attr(const char* name);    // is encrypted
DIRBASE_EXPORT bool ldcf_api_is_binary_syntax(const char* oid);      // takes the OID of a syntax

// False for the few attribute types that can't carry language tags, by OID.
DIRBASE_EXPORT bool checkIfLangTagAttrByOid(const char* oid);

// ---- lists: primary names, a new null-terminated array for charray_free ---------------------------------------------
//
// In the order of the schema's keys: OIDs come first, so that of the OIDs. Null when memory ran out. What a list
// without members gives is said with it.

DIRBASE_EXPORT char** ldcf_api_get_langtag_attrs(void);         // null
DIRBASE_EXPORT char** ldcf_api_get_nonlangtag_attrs(void);      // null
DIRBASE_EXPORT char** ldcf_api_get_unique_attrs(void);          // null
DIRBASE_EXPORT char** ldcf_api_get_nonunique_attrs(void);       // null; not all that may not be unique
DIRBASE_EXPORT char** ldcf_api_get_attrcache_attrs(void);       // null; user attributes
DIRBASE_EXPORT char** ldcf_api_get_nonattrcache_attrs(void);    // null
DIRBASE_EXPORT char** ldcf_api_get_config_attrs(void);          // null
DIRBASE_EXPORT char** ldcf_api_get_nonconfig_attrs(void);       // null
DIRBASE_EXPORT char** ldcf_api_get_operational_attrs(void);     // null; without those of class 11
DIRBASE_EXPORT char** ldcf_api_get_nonoperational_attrs(void);  // null
DIRBASE_EXPORT char** ldcf_api_get_encryptable_attrs(void);     // an empty array
DIRBASE_EXPORT char** ldcf_api_get_nonencryptable_attrs(void);  // an empty array
DIRBASE_EXPORT char** ldcf_api_get_encrypted_attrs(void);       // an empty array; any kind of protection counts
DIRBASE_EXPORT char** ldcf_api_get_nonencrypted_attrs(void);    // an empty array

// 1 when any attribute type is encrypted, else 0.
DIRBASE_EXPORT int ldcf_api_schema_contains_encrypted_attributes(void);

// ---- for callers that know the classes -----------------------------------------------------------------------------
// Plain names, like all others here, though no C program can use what they take or return.

#ifdef __cplusplus

#ifdef __clang__
#pragma clang diagnostic push
#pragma clang diagnostic ignored "-Wreturn-type-c-linkage"
#endif

// The attribute types that a complete class requires, or permits, inherited ones included.
DIRBASE_EXPORT const csgl_set<ldcf_attrtype>& ldcf_api_get_must_set_from_objclass(const ldcf_objclass& objclass);
DIRBASE_EXPORT const csgl_set<ldcf_attrtype>& ldcf_api_get_may_set_from_objclass(const ldcf_objclass& objclass);

// The definition under a name, which lives as long as the schema holds it. The name must be one that the schema has,
// and there must be a proposed schema: that isn't checked, and anything else is a fault of the program.
DIRBASE_EXPORT const ldcf_attrtype& ldcf_api_get_attrtype_from_schema_g(const char* name);
DIRBASE_EXPORT const ldcf_attrtype& ldcf_api_get_attrtype_from_proposed_schema_g(const char* name);
DIRBASE_EXPORT const ldcf_objclass& ldcf_api_get_objclass_from_schema_g(const char* name);
DIRBASE_EXPORT const ldcf_objclass& ldcf_api_get_objclass_from_proposed_schema_g(const char* name);

#ifdef __clang__
#pragma clang diagnostic pop
#endif

// The record of the definition that a map holds under a name or an OID; null when the map lacks it or the record can't
// be made. The second takes the first type, in the order of keys, whose values are in this table.
DIRBASE_EXPORT asyntaxinfo* ldcf_attrtype_get_info(const ldcf_map_name_to<ldcf_attrtype>& map, const char* name);
DIRBASE_EXPORT asyntaxinfo* ldcf_attrtype_get_info_based_on_table(const ldcf_map_name_to<ldcf_attrtype>& map,
                                                                  const char* table);
DIRBASE_EXPORT objectclassinfo* ldcf_objectclass_get_info(const ldcf_map_name_to<ldcf_objclass>& map, const char* name);

#endif

DIRBASE_C_END
