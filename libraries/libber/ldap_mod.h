// A modification of an entry: one change of one attribute (RFC 4511 section 4.6).
//
// Modifications stand in null-terminated arrays, in chains through mod_next, or in both at once.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"
#include "libraries/libber/berval.h"

DIRBASE_C_BEGIN

// Values of mod_op.
DIRBASE_NUMBER(int32_t, LDAP_MOD_ADD, 0);
DIRBASE_NUMBER(int32_t, LDAP_MOD_DELETE, 1);
DIRBASE_NUMBER(int32_t, LDAP_MOD_REPLACE, 2);
DIRBASE_NUMBER(int32_t, LDAP_MOD_BVALUES, 0x80);  // a bit beside them: the values are bervals, not texts

// All blocks are of malloc and belong to the record, but for the next record.
typedef struct LDAPMod LDAPMod;
struct LDAPMod {
    int32_t mod_op;
    char* mod_type;
    union {
        berval** mod_bvalues;  // with LDAP_MOD_BVALUES: null-terminated, or null
        char** mod_values;     // without: zero-terminated texts, null-terminated, or null
    };
    LDAPMod* mod_next;
};

DIRBASE_C_END
