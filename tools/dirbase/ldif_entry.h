// From the lines of an entry to the record that the library works on, and the checks that an addition would meet.
//
// All this looks names up in the active schema: the caller holds the read side of its lock (schema_reader).
#pragma once

#include <memory>

#include "servers/vrnd/libdirbase/model/entry.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"
#include "tools/dirbase/ldif_faults.h"
#include "tools/dirbase/ldif_text.h"

namespace dirbase_tool {

struct free_entry {
    void operator()(Entry* entry) const noexcept { entry_free(entry); }
};
using entry_pointer = std::unique_ptr<Entry, free_entry>;

// Holds the read side of the schema lock for its lifetime.
class schema_reader {
public:
    schema_reader() { _rdbm_rd_lock(ldcf_api_get_modify_attr_info_lock_g()); }
    ~schema_reader() { _rdbm_rd_unlock(ldcf_api_get_modify_attr_info_lock_g()); }
    schema_reader(const schema_reader&) = delete;
    schema_reader& operator=(const schema_reader&) = delete;
};

// The most versions of attributes (types, and types with a language tag) that an entry may have: they stand on a list,
// so that the time for an entry grows with the square of their number.
constexpr std::size_t attribute_limit = 10'000;

// Makes an entry with its DN and normal DN alone; without the latter, and with a fault, when the DN is refused.
entry_pointer new_entry(const ldif_text& text, ldif_fault_list& faults);

// Adds the values of a text to its entry, as they are given and in their order. False, with a fault, when there are too
// many attributes, and when `faults` had one before. A name or an option that the schema doesn't know is kept.
//
//   complete  whether the naming attributes are added, as a server does, and values that an attribute has already are
//             dropped; values that their syntax refuses come last then
bool add_values(Entry& entry, ldif_text& text, bool complete, ldif_fault_list& faults);

// Both: the entry of a text, or null with a fault.
entry_pointer make_entry(ldif_text& text, bool complete, ldif_fault_list& faults);

struct check_options {
    int mode = 2;         // of the schema check (ldcf_schema_check_mode)
    bool policy = false;  // whether attributes of the password policy and of the server are permitted
};

// Checks an entry as an addition would.
void check_entry(ldif_text& text, const check_options& options, ldif_fault_list& faults);

}  // namespace dirbase_tool
