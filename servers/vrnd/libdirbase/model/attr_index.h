// An index over the records of an entry that has very many attributes, beside its two lists (attribute.h).
//
// Every record has a key, by which the sorted list is in order, and a tag; no two records of an entry have both in
// common. Without the index a record is found by a walk over a list, which is the fastest way through the few
// attributes of nearly every entry, and would make the time for a hostile one grow with the square of their number.
//
// The index belongs to the entry and knows all of its records or isn't there. It is changed only by who changes the
// lists, and may be read by many threads in between.
#pragma once

#include <map>

#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/model/language_tag.h"

// What a record is sorted by: the schema's first name where the attribute is known, else the name as stored.
inline const char* attr_key(const asyntaxinfo* info, const char* name)
{
    return info != nullptr ? info->names[0] : name;
}

// Between which records of the sorted list a record belongs; either is null at an end.
struct sorted_neighbours {
    Attribute* below;
    Attribute* above;
};

struct attr_index {
    // An index of all records of an entry, to be kept in e_index; null without memory.
    static attr_index* build(const Entry& entry) noexcept;

    // The record with this key and tag, or null.
    Attribute* find(const char* key, const char* tag) const noexcept;

    // Where a new record with this key goes: below all others of the key.
    sorted_neighbours place(const Entry& entry, const char* key) const noexcept;

    // Takes in a record that stands on the lists already. False without memory: the index is no good any more.
    bool add(Attribute& attr) noexcept;

    // Takes out a record that still has its links. False when it isn't found where its key and tag say, since the
    // schema has learned its type meanwhile: the index is no good any more.
    bool remove(const Attribute& attr) noexcept;

private:
    struct key_less {
        bool operator()(const char* a, const char* b) const noexcept { return vrn_strcasecmp(a, b) < 0; }
    };
    struct tag_less {
        bool operator()(const char* a, const char* b) const noexcept { return strtagcmp(a, b) < 0; }
    };
    struct versions {
        Attribute* lowest = nullptr;  // the one that the sorted list comes to first from below
        std::map<const char*, Attribute*, tag_less> by_tag;
    };

    void insert(Attribute& attr);

    // The texts are the records' own, and the schema's.
    std::map<const char*, versions, key_less> by_key_;
};
