// The schema in the relational store: one table for each attribute, with names that the store accepts, and the flat
// records that tell the rest of the server how an attribute is stored and compared.
#pragma once

#include <cstdint>

#include "servers/vrnd/libcsgl/csgl_string.h"
#include "servers/vrnd/libdirbase/schema/asyntaxinfo.h"

class ldcf_attrtype;
class ldcf_objclass;

class DIRBASE_EXPORT ldcf_rdbm {
public:
    ldcf_rdbm() = delete;

    // The name of the table for an attribute: in upper case, each "-" as "_", a final "I" as "X", and behind the
    // store's qualifier and "." where it has one. Attributes of class SYSTEM live in the table of entries, whose name
    // is the store's own or "LDAP_ENTRY" and stays as it is; only xanEntryUuid, CryptoSync and CryptoSalt have tables
    // of theirs.
    //
    //   name           the attribute's primary name, or the name that its definition gives
    //   access_class   the ACCESS-CLASS by number; attributes of class 4 (SYSTEM) live in the table of entries
    //   have_db_names  0 when the name is the attribute's own, else the number of names that the definition gives
    //
    // A name of more than 128 characters is cut, with a message to the log; an attribute's own name to 121 and the slot
    // of these (ldcf_hash_name, as they stand) as seven digits. Raises exc_assertion_failed_t when the list of back
    // ends (g_backends) holds none of the type that g_srvType asks for, and exc_not_enough_memory_t.
    static csgl_string normalize_table_name(const csgl_string& name, int access_class, int have_db_names);

    // The name of the column, in the same form, at most 17 characters; a longer one is cut to 16, with a message to the
    // log. Raises exc_not_enough_memory_t.
    static csgl_string normalize_column_name(const csgl_string& name);

    // The syntax code (base/syntax_codes.h) by which values of a syntax are held; 0 for a syntax without one.
    static std::uint32_t syntax_code(const csgl_string& oid);

    // A new record of a complete attribute type whose names in the store are known, or null, with the reason in the
    // debug log: memory ran out, the syntax is none that values can be compared by, or a text column would be longer
    // than the 32700 bytes that the store takes. Lengths of other columns are given up to 65535.
    static asyntaxinfo* fill_asyntaxinfo(const ldcf_attrtype& attribute);

    // A new record of an object class, or null when memory ran out.
    static objectclassinfo* fill_classinfo(const ldcf_objclass& objclass);

    // Free a record; null does nothing. The first also empties the name cache, which may lead to the record: readers
    // must be kept out by the write side of the schema lock.
    static void delete_asyntaxinfo(asyntaxinfo* info);
    static void delete_objectclassinfo(objectclassinfo* info);
};

extern "C" {

// Writes the lowest 35 bits of `value` as 7 digits of base 32 (0 to 9, A to V), highest first, and a terminating zero
// to `out`, which has room for 8 bytes. Returns 0, or 1 when out is null.
DIRBASE_EXPORT int unpack_int(std::uint64_t value, char* out);

}  // extern "C"
