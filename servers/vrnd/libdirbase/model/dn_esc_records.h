// What the parts of the structured DN share: guards for its records, and pairs made in one go.
#pragma once

#include <cstddef>
#include <memory>

#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/model/dn_esc.h"

struct free_escDN {
    void operator()(ldap_escDN* dn) const noexcept { free_ldap_escDN(&dn); }
};
struct free_escRDN {
    void operator()(ldapDN_elem33* rdn) const noexcept { free_ldapDN_elem33(rdn); }
};
struct free_esc_pair {
    void operator()(ldapRDN_elem33* pair) const noexcept { free_ldapRDN_elem33(pair); }
};
using escDN_guard = std::unique_ptr<ldap_escDN, free_escDN>;
using escRDN_guard = std::unique_ptr<ldapDN_elem33, free_escRDN>;
using esc_pair_guard = std::unique_ptr<ldapRDN_elem33, free_esc_pair>;

// A pair with its type, with room for a value of up to `value_room` bytes and its terminator, and with the lengths of
// value and escaped value 0. Null without memory.
esc_pair_guard make_esc_pair(const char* type, std::size_t type_length, std::size_t value_room, std::int64_t syntax);

// The order of the pairs of an RDN.
inline bool esc_pair_less(const ldapRDN_elem33& a, const ldapRDN_elem33& b)
{
    const int types = vrn_strcasecmp(a.rdn->type, b.rdn->type);
    return (types != 0 ? types : vrn_strcasecmp(a.rdn->value, b.rdn->value)) < 0;
}

// The length of a value as the canonical text has it.
std::size_t escaped_length_of(const char* value, std::size_t length);

// Writes the value of a pair as the canonical text has it, and returns the position behind it.
char* write_escaped(char* out, const ldapRDN_struct33& pair);
