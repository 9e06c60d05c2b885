// See attr_index.h.
#include "servers/vrnd/libdirbase/model/attr_index.h"

#include <memory>
#include <new>

attr_index* attr_index::build(const Entry& entry) noexcept
{
    try {
        auto index = std::make_unique<attr_index>();
        // Down from the largest name, so that the last one of a key is its lowest.
        for (Attribute* attr = entry.e_sorted_high; attr != nullptr; attr = attr->a_sorted_prev) {
            index->insert(*attr);
        }
        return index.release();
    } catch (const std::bad_alloc&) {
        return nullptr;  // the entry goes on with its lists alone
    }
}

Attribute* attr_index::find(const char* key, const char* tag) const noexcept
{
    const auto of_key = by_key_.find(key);
    if (of_key == by_key_.end()) {
        return nullptr;
    }
    const auto version = of_key->second.by_tag.find(tag);
    return version == of_key->second.by_tag.end() ? nullptr : version->second;
}

sorted_neighbours attr_index::place(const Entry& entry, const char* key) const noexcept
{
    const auto next = by_key_.lower_bound(key);
    if (next == by_key_.end()) {
        return {entry.e_sorted_high, nullptr};
    }
    Attribute* const above = next->second.lowest;
    return {above->a_sorted_prev, above};
}

void attr_index::insert(Attribute& attr)
{
    versions& of_key = by_key_[attr_key(attr.a_info, attr.a_type)];
    of_key.by_tag.emplace(find_language_tag(attr.a_type), &attr);
    of_key.lowest = &attr;
}

bool attr_index::add(Attribute& attr) noexcept
{
    try {
        insert(attr);
        return true;
    } catch (const std::bad_alloc&) {
        return false;
    }
}

bool attr_index::remove(const Attribute& attr) noexcept
{
    const auto of_key = by_key_.find(attr_key(attr.a_info, attr.a_type));
    if (of_key == by_key_.end()) {
        return false;
    }
    versions& left = of_key->second;
    const auto version = left.by_tag.find(find_language_tag(attr.a_type));
    if (version == left.by_tag.end() || version->second != &attr) {
        return false;
    }
    left.by_tag.erase(version);
    if (left.by_tag.empty()) {
        by_key_.erase(of_key);
        return true;
    }
    if (left.lowest == &attr) {
        left.lowest = attr.a_sorted_next;  // the records of a key stand side by side
    }
    // The text of the key may be this record's, and stand for the versions that are left.
    return of_key->first != attr.a_type;
}
