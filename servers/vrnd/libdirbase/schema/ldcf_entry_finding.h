// What the check of an entry finds, as data: one finding for each fault, and for each value that the check adds.
#pragma once

#include <cstdint>

#include "libraries/dirbase_export.h"

enum class ldcf_entry_finding_kind : int {
    // Faults that end the check.
    no_objectclass,         // the entry names no class
    policy_undefined,       // name: a password policy attribute that the schema lacks
    entry_dn_invalid,       // the entry's own DN
    value_dn_invalid,       // name: the attribute; count: the place of the value, from 0
    not_binary,             // name: an attribute with ";binary" whose syntax isn't binary
    attribute_undefined,    // name: an attribute that the schema lacks
    single_value_exceeded,  // name: the attribute; count: of its values
    class_undefined,        // name: a class that the schema lacks

    // Faults behind which the check goes on.
    structural_class_missing,  // no class is structural
    structural_class_count,    // count: of the structural classes that are no superclass of another, not 1
    superclass_missing,        // name: the class
    attribute_missing,         // name: an attribute that a class requires
    attribute_not_allowed,     // name: an attribute that no class permits

    // Faults of an alias or a referral, which end the check.
    attribute_unknown,        // name: an attribute that the schema lacks
    alias_target_missing,     // neither aliasedObjectName nor aliasedEntryName
    alias_target_twice,       // both
    alias_target_exceeded,    // count: of the values of the one
    referral_target_missing,  // no `ref`

    // Faults in the older check only; the second ends it.
    class_unknown,     // name: a class that the schema lacks
    boolean_exceeded,  // name: an attribute of boolean syntax; count: of its values

    // No faults.
    top_added,         // `top` was missing, and was added
    superclass_added,  // name: a class that was missing, and was added
    mode_invalid,      // the mode is none of the known ones: some tests were left out
};

// Everything is borrowed for the length of the call.
struct ldcf_entry_finding {
    ldcf_entry_finding_kind kind;
    const char* name;    // an attribute or a class; null where the kind tells of none
    std::int64_t count;  // 0 where the kind tells of none
    const char* dn;      // of the entry as given; may be null
};

// Takes findings in the order of the tests. What it raises ends the check and passes to the caller.
class DIRBASE_EXPORT ldcf_entry_sink {
public:
    virtual void report(const ldcf_entry_finding& finding) = 0;

protected:
    ~ldcf_entry_sink() = default;
};

// The sink of the server: the message log and the debug log. It has no state, so any number of threads may share it.
DIRBASE_EXPORT ldcf_entry_sink& ldcf_entry_log();
