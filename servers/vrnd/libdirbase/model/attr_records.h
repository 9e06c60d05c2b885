// Internal to the model: attributes (attribute.h) seen closer, for who reads and writes many of them.
#pragma once

#include <cstddef>

#include "libraries/libber/berval.h"
#include "servers/vrnd/libdirbase/model/attribute.h"

// The record that flatattr_insert makes. The name stands behind it in the same block, with zero bytes behind the name
// up to a multiple of the unit, so that it may be copied by units.
struct named_attribute {
    static constexpr std::size_t unit = 16;

    Attribute attribute;
    std::uint32_t type_length;  // of the name, up to its first ":"
    bool is_tagged;             // whether the name has a language tag
    bool is_extra;              // whether e_extra_versions counts it

    char* name() { return reinterpret_cast<char*>(this + 1); }

    // What a record is part of; null for one that something else has made.
    static const named_attribute* of(const Attribute& attr)
    {
        const auto* whole = reinterpret_cast<const named_attribute*>(&attr);
        return attr.a_type == reinterpret_cast<const char*>(whole + 1) ? whole : nullptr;
    }
};
// A name that somebody puts into a block of its own can't stand right behind a record then.
static_assert(sizeof(named_attribute) % 16 != 0);

// ---- the two steps of attr_merge ------------------------------------------------------------------------------------

// Finds or makes the record that a name stands for. `info` is the name's, null where the schema doesn't know it. Fails
// as attr_merge does; the count of the back end becomes unknown in any case.
int attr_merge_record(Entry& entry, const char* name, asyntaxinfo* info, Attribute** attr);

// Adds values to it.
int attr_merge_values(Attribute& attr, berval** values, int drop_duplicates, int tree_mode);

// ---- values in the clear --------------------------------------------------------------------------------------------

// Releases a null-terminated array of values, each wiped first. Null does nothing.
void free_secret_values(berval** values);
