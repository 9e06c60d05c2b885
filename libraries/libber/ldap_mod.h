// A modification of an entry: one change of one attribute (RFC 4511 section 4.6).
//
// Modifications stand in null-terminated arrays, in chains through mod_next, or in both at once.
#pragma once

#include <cstdint>

#include "libraries/libber/berval.h"

// Values of mod_op.
constexpr std::int32_t LDAP_MOD_ADD = 0;
constexpr std::int32_t LDAP_MOD_DELETE = 1;
constexpr std::int32_t LDAP_MOD_REPLACE = 2;
constexpr std::int32_t LDAP_MOD_BVALUES = 0x80;  // a bit beside them: the values are bervals, not texts

// All blocks are of malloc and belong to the record, but for the next record.
struct LDAPMod {
    std::int32_t mod_op;
    char* mod_type;
    union {
        berval** mod_bvalues;  // with LDAP_MOD_BVALUES: null-terminated, or null
        char** mod_values;     // without: zero-terminated texts, null-terminated, or null
    };
    LDAPMod* mod_next;
};
