// The flat records through which the rest of the server knows attribute types and object classes.
//
// A record belongs to its definition: it is made when it is first asked for and lives as long as the definition, or
// until it is reset. Callers read it and never free it. All pointers are owned by the record and come from malloc.
#pragma once

#include <cstdint>

class ldcf_attrtype_;

// A column of the relational store.
struct rdbm_col_info {
    char* name;
    std::uint16_t length;
};

// What a relational back end hangs on a record: a list of blocks from malloc that begin with this link. They are freed
// with the record.
struct asyntaxinfo_back_end {
    asyntaxinfo_back_end* next;
};

// One attribute type.
struct asyntaxinfo {
    char** names;                         // the names, shortest first, then the OID; ended by null
    std::int32_t name_length;             // length of names[0], 0 for a type without names
    std::uint32_t syntax;                 // syntax code (base/syntax_codes.h)
    std::uint32_t equality;               // syntax code of the EQUALITY rule, 0 without one that counts
    std::uint32_t substring;              // the same of SUBSTR
    std::uint32_t ordering;               // the same of ORDERING
    std::int32_t index_action;            // 1 when an index is wanted
    std::int32_t system_column;           // 1 for the columns of creator, modifier and their times
    std::int32_t attr_id;                 // number of a well-known attribute, else -1
    std::int32_t attr_class;              // 9 user, 2 configuration, others operational (11 counts as neither in lists)
    char* table;                          // null when the server has no tables
    char* short_table;                    // null without tables, and for a table name without a qualifier
    std::int32_t access_class;            // 1 NORMAL, 2 SENSITIVE, 4 CRITICAL, 8 RESTRICTED, 16 SYSTEM, 32 OBJECT
    rdbm_col_info* attr;                  // the column of the values
    rdbm_col_info* trunc;                 // the column of the truncated values, null when none is needed
    asyntaxinfo_back_end* back_end_list;  // starts empty
    std::int32_t encryption;              // 1 none, 9 SSHA, 133 AES-256, 134 AES-192, 135 AES-128; bit 0x80: two-way
    std::uint8_t secure_connection;       // 1: only over a secure connection
    std::int32_t return_value;            // 0 cleartext, 1 encrypted, 2 type only
    std::uint8_t non_matchable;           // 1: values aren't matched

    const ldcf_attrtype_* type;  // the definition that the record belongs to
};

// One object class.
struct objectclassinfo {
    char** names;  // the names, then the OID, in upper case; ended by null
};
