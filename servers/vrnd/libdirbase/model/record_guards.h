// Guards for records that own others: entries, arrays of values, modifications.
#pragma once

#include <memory>

#include "servers/vrnd/libdirbase/model/entry.h"
#include "servers/vrnd/libdirbase/model/ldap_mods.h"

struct free_entry {
    void operator()(Entry* entry) const noexcept { entry_free(entry); }
};
struct free_values {
    void operator()(berval** values) const noexcept { ber_bvecfree(values); }
};
struct free_mods {
    void operator()(LDAPMod** mods) const noexcept { free_ldmarr(mods); }
};
using entry_guard = std::unique_ptr<Entry, free_entry>;
using values_guard = std::unique_ptr<berval*, free_values>;
using mods_guard = std::unique_ptr<LDAPMod*, free_mods>;
