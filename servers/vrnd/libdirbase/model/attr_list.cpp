// The records of an entry on their two lists: making, finding, walking and removing them (attribute.h).
//
// In the sorted list a record stands by its key (attr_index.h). So all versions of a known attribute stand side by
// side, and a walk that looks for one can't pass it by. An entry in which such a walk gets long is given an index.
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <utility>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/attr_ids.h"
#include "servers/vrnd/libdirbase/model/attr_index.h"
#include "servers/vrnd/libdirbase/model/attr_records.h"
#include "servers/vrnd/libdirbase/model/attr_value_tree.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/model/language_tag.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"

namespace {

int first_letter(const char* name)
{
    return *name >= 'A' && *name <= 'Z' ? *name - 'A' + 'a' : static_cast<unsigned char>(*name);
}

bool has_tag(const char* tag)
{
    return tag != nullptr && *tag != '\0';
}

bool is_tagged(const Attribute& attr)
{
    const named_attribute* const named = named_attribute::of(attr);
    return named != nullptr ? named->is_tagged : has_tag(find_language_tag(attr.a_type));
}

bool is_extra(const Attribute& attr)
{
    const named_attribute* const named = named_attribute::of(attr);
    return named != nullptr && named->is_extra;
}

bool is_version(const Attribute& attr, const asyntaxinfo* info, const char* tag)
{
    if (attr.a_info != info) {
        return false;
    }
    return has_tag(tag) ? strtagcmp(find_language_tag(attr.a_type), tag) == 0 : !is_tagged(attr);
}

// The entry's slot for an attribute, where it has one for this version; else null.
Attribute** slot_of(Entry& entry, const asyntaxinfo* info, bool tagged)
{
    if (info == nullptr) {
        return nullptr;
    }
    switch (info->attr_id) {
    case attr_id_objectclass: return &entry.e_objectclass_attr;
    case attr_id_member: return &entry.e_member_attr;
    case attr_id_uniquemember: return &entry.e_uniquemember_attr;
    case attr_id_allmembers: return &entry.e_allmembers_attr;
    case attr_id_ref: return tagged ? nullptr : &entry.e_ref_attr;
    default: return nullptr;
    }
}

// The first record at or behind `at` that belongs to a known attribute, whatever its tag.
Attribute* next_of(Attribute* at, const asyntaxinfo* info)
{
    while (at != nullptr && at->a_info != info) {
        at = at->a_next;
    }
    return info == nullptr ? nullptr : at;
}

// How many records a walk may pass before the entry is given an index.
constexpr int longest_walk = 64;

// Where a version stands: its record, or else where it belongs.
struct sorted_place {
    Attribute* found;
    sorted_neighbours neighbours;
    int passed;  // how many records the walk went by
};

// Walks down from the largest name. Names are compared as a whole only within one first letter.
sorted_place walk_to_place(const Entry& entry, const asyntaxinfo* info, const char* name, const char* tag)
{
    const char* const key = attr_key(info, name);
    const int letter = first_letter(key);
    Attribute* above = nullptr;
    Attribute* at = entry.e_sorted_high;
    int passed = 0;
    for (; at != nullptr; above = std::exchange(at, at->a_sorted_prev), ++passed) {
        if (info != nullptr && at->a_info == info) {
            if (strtagcmp(find_language_tag(at->a_type), tag) == 0) {
                return {at, {}, passed};
            }
            continue;
        }
        const char* const other = attr_key(at->a_info, at->a_type);
        const int other_letter = first_letter(other);
        const int order = other_letter != letter ? other_letter - letter : vrn_strcasecmp(other, key);
        // Equal keys of unlike records: the schema has come to know, or to lose, the attribute in between.
        const bool both_unknown = info == nullptr && at->a_info == nullptr;
        if (order == 0 && (both_unknown || strtagcmp(find_language_tag(at->a_type), tag) == 0)) {
            return {at, {}, passed};
        }
        if (order < 0) {
            break;
        }
    }
    return {nullptr, {at, above}, passed};
}

sorted_place find_place(const Entry& entry, const asyntaxinfo* info, const char* name, const char* tag)
{
    if (entry.e_index == nullptr) {
        return walk_to_place(entry, info, name, tag);
    }
    const char* const key = attr_key(info, name);
    return {entry.e_index->find(key, tag), entry.e_index->place(entry, key), 0};
}

Attribute* new_attribute(const char* name, asyntaxinfo* info)
{
    const std::size_t size = std::strlen(name) + 1;
    const std::size_t room = (size + named_attribute::unit - 1) / named_attribute::unit * named_attribute::unit;
    auto* made = static_cast<named_attribute*>(std::malloc(sizeof(named_attribute) + room));
    if (made == nullptr) {
        return nullptr;
    }
    *made = {};
    Attribute& attr = made->attribute;
    attr.a_type = made->name();
    std::memset(attr.a_type + room - named_attribute::unit, 0, named_attribute::unit);
    std::memcpy(attr.a_type, name, size);
    attr.a_syntax = static_cast<std::int32_t>(info == nullptr ? SC_CIS : info->syntax);
    attr.a_info = info;
    made->is_tagged = has_tag(find_language_tag(name));
    made->is_extra = made->is_tagged || info == nullptr;
    made->type_length = static_cast<std::uint32_t>(strchrnul(name, ':') - name);
    return &attr;
}

void link_attribute(Entry& entry, Attribute& attr, const sorted_neighbours& place)
{
    attr.a_sorted_prev = place.below;
    attr.a_sorted_next = place.above;
    (place.below == nullptr ? entry.e_sorted_low : place.below->a_sorted_next) = &attr;
    (place.above == nullptr ? entry.e_sorted_high : place.above->a_sorted_prev) = &attr;
    attr.a_prev = entry.e_attrs_tail;
    (entry.e_attrs_tail == nullptr ? entry.e_attrs : entry.e_attrs_tail->a_next) = &attr;
    entry.e_attrs_tail = &attr;
    entry.e_extra_versions += is_extra(attr) ? 1 : 0;
}

// Keeps the index true to a new record, or makes it where a walk was long. Without memory the entry goes on without.
void index_attribute(Entry& entry, Attribute& attr, int passed)
{
    if (entry.e_index != nullptr) {
        if (!entry.e_index->add(attr)) {
            delete std::exchange(entry.e_index, nullptr);
        }
    } else if (passed > longest_walk) {
        entry.e_index = attr_index::build(entry);
    }
}

void unlink_attribute(Entry& entry, Attribute& attr)
{
    if (entry.e_index != nullptr && !entry.e_index->remove(attr)) {
        delete std::exchange(entry.e_index, nullptr);
    }
    (attr.a_sorted_prev == nullptr ? entry.e_sorted_low : attr.a_sorted_prev->a_sorted_next) = attr.a_sorted_next;
    (attr.a_sorted_next == nullptr ? entry.e_sorted_high : attr.a_sorted_next->a_sorted_prev) = attr.a_sorted_prev;
    (attr.a_prev == nullptr ? entry.e_attrs : attr.a_prev->a_next) = attr.a_next;
    (attr.a_next == nullptr ? entry.e_attrs_tail : attr.a_next->a_prev) = attr.a_prev;
    entry.e_extra_versions -= is_extra(attr) ? 1 : 0;
}

// The slot of a new record: a version without a tag takes it over from one with a tag.
void fill_slot(Entry& entry, Attribute& attr)
{
    const bool tagged = is_tagged(attr);
    Attribute** const slot = slot_of(entry, attr.a_info, tagged);
    if (slot != nullptr && (*slot == nullptr || !tagged)) {
        *slot = &attr;
    }
}

// The slot of a record that is no longer on the lists: a version that is left moves up, or else it is cleared.
void clear_slot(Entry& entry, const Attribute& attr)
{
    Attribute** const slot = slot_of(entry, attr.a_info, is_tagged(attr));
    if (slot != nullptr && *slot == &attr) {
        *slot = attr.a_info->attr_id == attr_id_ref ? nullptr : next_of(entry.e_attrs, attr.a_info);
    }
}

// The record that a name stands for. LDAP_INVALID_SYNTAX for a tag that is too long, which keeps nobody from a slot.
int find_by_name(const Entry& entry, const char* name, const asyntaxinfo* info, Attribute** attr)
{
    const char* const tag = find_language_tag(name);
    const bool too_long = tag != nullptr && std::strlen(tag) > longest_language_tag;
    Attribute* const* const slot = slot_of(const_cast<Entry&>(entry), info, has_tag(tag));
    if (slot != nullptr) {
        *attr = *slot;
        return too_long && info->attr_id != attr_id_objectclass ? LDAP_INVALID_SYNTAX : LDAP_SUCCESS;
    }
    *attr = too_long ? nullptr : flatattr_find(&entry, info, tag);
    return too_long ? LDAP_INVALID_SYNTAX : LDAP_SUCCESS;
}

// Puts what attr_find finds into *attr, which is null, and returns the attribute's first version in order of arrival
// (for a name with a tag whose version is there, that one). Both come from one walk over the records, where a walk is
// needed.
Attribute* find_by_name_or_tag(const Entry& entry, const char* name, const asyntaxinfo* info, Attribute** attr)
{
    const bool is_tagged_name = has_tag(find_language_tag(name));
    if (is_tagged_name) {
        find_by_name(entry, name, info, attr);
        if (*attr != nullptr) {
            return *attr;
        }
    }
    Attribute* const earliest = next_of(entry.e_attrs, info);
    if (is_tagged_name || earliest == nullptr) {
        return earliest;
    }
    if (entry.e_index != nullptr || slot_of(const_cast<Entry&>(entry), info, false) != nullptr) {
        find_by_name(entry, name, info, attr);
        return earliest;
    }
    *attr = earliest;
    while (*attr != nullptr && is_tagged(**attr)) {
        *attr = next_of((*attr)->a_next, info);
    }
    return earliest;
}

// How a walk over versions has begun.
enum walk_state : int {
    walk_not_started = 0,
    walk_in_order = 1,        // every version from the previous one on
    walk_untagged_first = 2,  // the version without a tag is out of its turn: all others follow
};

}  // namespace

extern "C" {

// ---- making and finding ---------------------------------------------------------------------------------------------

int flatattr_insert(Entry* entry, asyntaxinfo* info, const char* name, Attribute** attr, const char* tag)
{
    if (entry == nullptr || attr == nullptr || name == nullptr) {
        return LDAP_OTHER;
    }
    const sorted_place place = find_place(*entry, info, name, tag);
    *attr = place.found != nullptr ? place.found : new_attribute(name, info);
    if (*attr == nullptr) {
        debug_error("Error - flatattr_insert: malloc() failed. Out of memory\n");
        return LDAP_NO_MEMORY;
    }
    if (place.found == nullptr) {
        link_attribute(*entry, **attr, place.neighbours);
        index_attribute(*entry, **attr, place.passed);
        fill_slot(*entry, **attr);
    }
    return LDAP_SUCCESS;
}

Attribute* flatattr_find(const Entry* entry, const asyntaxinfo* info, const char* tag)
{
    if (entry == nullptr || info == nullptr) {
        return nullptr;
    }
    if (entry->e_index != nullptr) {
        Attribute* const found = entry->e_index->find(attr_key(info, nullptr), tag);
        return found != nullptr && found->a_info == info ? found : nullptr;
    }
    Attribute* attr = entry->e_attrs;
    while (attr != nullptr && !is_version(*attr, info, tag)) {
        attr = attr->a_next;
    }
    return attr;
}

Attribute* attr_find(const Entry* entry, const char* name, int /*ignored*/, asyntaxinfo* info)
{
    if (entry == nullptr || name == nullptr) {
        return nullptr;
    }
    if (info == nullptr) {
        info = ldcf_api_attr_get_info(name, nullptr);
    }
    Attribute* attr = nullptr;
    find_by_name(*entry, name, info, &attr);
    return attr;
}

int attr_find_attr_or_lang_tag_version(const Entry* entry, const char* name, int* started, int* tag_state,
                                       asyntaxinfo** info, Attribute** attr)
{
    if (entry == nullptr || name == nullptr || started == nullptr || tag_state == nullptr || info == nullptr ||
        attr == nullptr) {
        return 1;
    }
    if (*info == nullptr) {
        *info = ldcf_api_attr_get_info(name, nullptr);
    }
    *attr = nullptr;
    Attribute* const earliest = find_by_name_or_tag(*entry, name, *info, attr);
    if (*attr == nullptr) {
        *tag_state = contains_valid_language_tag(name) ? 1 : 0;
        *attr = *tag_state == 1 ? nullptr : earliest;
    }
    if (*attr != nullptr) {
        *started = is_tagged(**attr) || *attr == earliest ? walk_in_order : walk_untagged_first;
    }
    return 0;
}

int attr_find_next_attr_match(const Entry* entry, const char* name, int* started, int* tag_state, asyntaxinfo* info,
                              Attribute** attr)
{
    if (entry == nullptr || name == nullptr || started == nullptr || tag_state == nullptr || attr == nullptr) {
        return 1;
    }
    if (*tag_state == -1) {
        *tag_state = contains_valid_language_tag(name) ? 1 : 0;
    }
    Attribute* const previous = *attr;
    *attr = nullptr;
    if (*tag_state != 0 || (*started != walk_not_started && previous == nullptr)) {
        return 0;
    }
    if (*started == walk_not_started) {
        *started = walk_in_order;
        *attr = next_of(entry->e_attrs, info);
    } else if (entry->e_extra_versions == 0) {
        // The previous version was the one without a tag, and there are no others.
    } else if (*started == walk_in_order) {
        *attr = next_of(previous->a_next, info);
    } else {
        *attr = next_of(is_tagged(*previous) ? previous->a_next : entry->e_attrs, info);
        if (*attr != nullptr && !is_tagged(**attr)) {
            *attr = next_of((*attr)->a_next, info);
        }
    }
    return 0;
}

int flatattr_apply(Entry* entry, flatattr_function function, void* argument)
{
    for (Attribute* attr = entry == nullptr ? nullptr : entry->e_sorted_low; attr != nullptr;) {
        Attribute* const next = attr->a_sorted_next;
        if (function(attr, argument) != 0) {
            return 1;
        }
        attr = next;
    }
    return AVL_NOMORE;
}

// ---- removing -------------------------------------------------------------------------------------------------------

int attr_delete(Entry* entry, const char* name, asyntaxinfo* info)
{
    if (entry == nullptr || entry->e_attrs == nullptr) {
        return -1;
    }
    if (name == nullptr) {
        return 1;
    }
    if (info == nullptr) {
        info = ldcf_api_attr_get_info(name, nullptr);
    }
    Attribute* attr = nullptr;
    const int result = find_by_name(*entry, name, info, &attr);
    if (result != LDAP_SUCCESS) {
        return result;
    }
    if (attr == nullptr) {
        return 1;
    }
    if (info->attr_id == attr_id_member) {
        entry->e_member_count = 0;
    } else if (info->attr_id == attr_id_uniquemember) {
        entry->e_uniquemember_count = 0;
    }
    unlink_attribute(*entry, *attr);
    clear_slot(*entry, *attr);
    attr_free(attr);
    return 0;
}

void attr_free(Attribute* attr)
{
    if (attr != nullptr) {
        ber_bvecfree(attr->a_vals);
        attr_free_normvals(attr);
        attr_free_decodedvals(attr);
    }
    std::free(attr);
}

void attr_free_normvals(Attribute* attr)
{
    if (attr != nullptr) {
        avl_free(std::exchange(attr->a_tree, nullptr),
                 [](void* node) { free_AttrvalsNorm(static_cast<AttrvalsNorm*>(node)); });
    }
}

void attr_free_decodedvals(Attribute* attr)
{
    if (attr != nullptr) {
        free_secret_values(std::exchange(attr->a_decoded, nullptr));
    }
}

}  // extern "C"
