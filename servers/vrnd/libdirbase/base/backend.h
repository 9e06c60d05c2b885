// The record of one data store of the server, and the list of them.
//
// The front end fills the records and the list before other threads read them; neither changes after that.
#pragma once

#include "libraries/dirbase_export.h"

typedef struct asyntaxinfo asyntaxinfo;
typedef struct Backend Backend;

// Gives a text of a back end.
typedef const char* (*backend_text_function)(Backend* be);

// Texts and functions belong to whoever fills the record; a function pointer may be null.
struct Backend {
    // Suffixes, each the upper text of dn_normalize_esc; ended by a null pointer.
    char** be_suffix DIRBASE_DEFAULT(nullptr);
    // "rdbm" for the relational store, "proxy", "ldcf" for the schema store.
    const char* be_type DIRBASE_DEFAULT(nullptr);
    Backend* be_next DIRBASE_DEFAULT(nullptr);  // next on the list

    // What stands in front of the names of a relational store's tables, for example their owner, and the table that
    // holds entry-level attributes. The texts stay with the back end; null stands for none, and for LDAP_ENTRY. They
    // are called while names in the store are worked out: at the start, and in each vote on its thread, under the write
    // side of the schema lock, which they don't take.
    backend_text_function be_table_qualifier DIRBASE_DEFAULT(nullptr);
    backend_text_function be_entry_table DIRBASE_DEFAULT(nullptr);

    // May add to the record of an attribute type that has just been made, before anybody else sees it. It may run in
    // any look-up, before index_action and the four members about protection are filled, while other threads wait to
    // make theirs: it takes no lock that callers of look-ups hold, asks for no record of the same type, and raises
    // nothing. What it hangs on back_end_list is given to free() with the record.
    void (*be_fill_attr_info)(asyntaxinfo* info) DIRBASE_DEFAULT(nullptr);
};

DIRBASE_C_BEGIN

// Head of the list.
DIRBASE_EXPORT extern Backend* g_backends;

// The kind of server: 2, the value at start, for one with a relational back end ("rdbm" is on the list); 1 for one
// without tables ("proxy" is on the list). Without that back end ldcf_api_schema_complete_db_names fails.
DIRBASE_EXPORT extern int g_srvType;

// The first back end of a list whose type is `type`, without regard to case; null when there is none or type is null.
DIRBASE_EXPORT Backend* ldcf_api_get_backend(Backend* head, const char* type);

DIRBASE_C_END
