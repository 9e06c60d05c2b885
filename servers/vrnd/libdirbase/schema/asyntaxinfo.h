// The flat records through which the rest of the server knows attribute types and object classes.
//
// A record belongs to its definition: it is made when it is first asked for and lives as long as the definition, or
// until it is reset. Callers read it and never free it. All pointers are owned by the record and come from malloc.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"

DIRBASE_C_BEGIN

typedef struct ldcf_attrtype_ ldcf_attrtype_;

// A column of the relational store.
typedef struct rdbm_col_info rdbm_col_info;
struct rdbm_col_info {
    char* name;
    uint16_t length;
};

// What a relational back end hangs on a record: a list of blocks from malloc that begin with this link. They are freed
// with the record.
typedef struct asyntaxinfo_back_end asyntaxinfo_back_end;
struct asyntaxinfo_back_end {
    asyntaxinfo_back_end* next;
};

// One attribute type.
typedef struct asyntaxinfo asyntaxinfo;
struct asyntaxinfo {
    char** names;                         // the names, shortest first, then the OID; ended by null
    int32_t name_length;                  // length of names[0], 0 for a type without names
    uint32_t syntax;                      // syntax code (base/syntax_codes.h)
    uint32_t equality;                    // syntax code of the EQUALITY rule, 0 without one that counts
    uint32_t substring;                   // the same of SUBSTR
    uint32_t ordering;                    // the same of ORDERING
    int32_t index_action;                 // 1 when an index is wanted
    int32_t system_column;                // 1 for the columns of creator, modifier and their times
    int32_t attr_id;                      // number of a well-known attribute, else -1
    int32_t attr_class;                   // 9 user, 2 configuration, others operational (11 counts as neither in lists)
    char* table;                          // null when the server has no tables
    char* short_table;                    // null without tables, and for a table name without a qualifier
    int32_t access_class;                 // 1 NORMAL, 2 SENSITIVE, 4 CRITICAL, 8 RESTRICTED, 16 SYSTEM, 32 OBJECT
    rdbm_col_info* attr;                  // the column of the values
    rdbm_col_info* trunc;                 // the column of the truncated values, null when none is needed
    asyntaxinfo_back_end* back_end_list;  // starts empty
    int32_t encryption;                   // 1 none, 9 SSHA, 133 AES-256, 134 AES-192, 135 AES-128; bit 0x80: two-way
    uint8_t secure_connection;            // 1: only over a secure connection
    int32_t return_value;                 // 0 cleartext, 1 encrypted, 2 type only
    uint8_t non_matchable;                // 1: values aren't matched

    const ldcf_attrtype_* type;  // the definition that the record belongs to
};

// One object class.
typedef struct objectclassinfo objectclassinfo;
struct objectclassinfo {
    char** names;  // the names, then the OID, in upper case; ended by null
};

DIRBASE_C_END
