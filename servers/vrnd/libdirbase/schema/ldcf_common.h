// What the four kinds of schema definition share: names, maps, cached text forms, and the wording of failures.
#pragma once

#include <atomic>
#include <mutex>

#include "servers/vrnd/libcsgl/csgl_exception.h"
#include "servers/vrnd/libcsgl/csgl_memory.h"
#include "servers/vrnd/libcsgl/csgl_string.h"

// Schema names and OIDs compare without regard to case.
using ldcf_names = csgl_set<csgl_string, csgl_str_ci_less>;

// Definitions by every name they answer to and by OID; several keys lead to one body.
template <typename T>
using ldcf_map_name_to = csgl_map<csgl_string, T, csgl_str_ci_less>;

// From the definitions of a schema to their counterparts in its copy.
template <typename T>
using ldcf_translation = csgl_map<T, T>;

// True when two sets hold the same names, without regard to case.
DIRBASE_EXPORT bool ldcf_names_equal(const ldcf_names& a, const ldcf_names& b);

// Looks a name or OID up; a handle without body when the map lacks it.
template <typename T>
T ldcf_find(const ldcf_map_name_to<T>& map, const csgl_string& name)
{
    const auto found = map.find(name);
    return found == map.end() ? T() : found->second;
}

// Enters a handle under its OID and every name, all or none: a key that the map holds already keeps its handle, and
// when memory runs out the map is as it was.
template <typename T>
void ldcf_enter(ldcf_map_name_to<T>& map, const csgl_string& oid, const ldcf_names& names, const T& handle)
{
    ldcf_map_name_to<T> entries;
    entries[oid] = handle;
    for (const csgl_string& name : names) {
        entries[name] = handle;
    }
    map.merge(entries);
}

// Visits every definition of a map once, in the map's order: at the key that is the body's OID.
template <typename Map, typename Visit>
void ldcf_for_each_definition(Map& map, Visit&& visit)
{
    for (auto& [key, definition] : map) {
        if (key == definition->oid()) {
            visit(definition);
        }
    }
}

// The counterpart of a handle in the copy of its schema; a handle without body when the translation lacks it.
template <typename T>
T ldcf_translate(const ldcf_translation<T>& translation, const T& handle)
{
    const auto found = translation.find(handle);
    return found == translation.end() ? T() : found->second;
}

template <typename T>
csgl_set<T> ldcf_translate(const ldcf_translation<T>& translation, const csgl_set<T>& handles)
{
    csgl_set<T> result;
    for (const T& handle : handles) {
        result.insert(ldcf_translate(translation, handle));
    }
    return result;
}

// Held while a record of ldcf_lazy_record is made.
DIRBASE_EXPORT std::recursive_mutex& ldcf_record_mutex();

// A text form that is built when it is first asked for, by any reader.
//
// Readers may ask at the same time: each that finds nothing builds the text for itself, and the first to finish keeps
// it. Once kept it doesn't move until clear, which belongs to whoever may change the definition. Copying copies what is
// kept.
class DIRBASE_EXPORT ldcf_text_cache {
public:
    ldcf_text_cache() = default;
    ldcf_text_cache(const ldcf_text_cache& other) { *this = other; }
    ldcf_text_cache& operator=(const ldcf_text_cache& other);

    template <typename Build>
    const csgl_string& get(Build&& build) const
    {
        if (!filled_.load(std::memory_order_acquire)) {
            keep(build());
        }
        return text_;
    }

    void clear();

private:
    void keep(const csgl_string& text) const;

    mutable csgl_string text_;
    mutable std::atomic<bool> filled_{false};
};

// A record that is made when it is first asked for, by any reader, and lives as long as the definition that holds it.
//
// Readers who find it take no lock. Those who don't take turns, so that each record is made once; a maker may ask for
// other records. A record that couldn't be made is tried again by the next who asks. A copy of the definition makes a
// record of its own, and a definition that is told to say something else drops its record.
template <typename Record, void (*destroy)(Record*)>
class ldcf_lazy_record {
public:
    ldcf_lazy_record() = default;
    ldcf_lazy_record(const ldcf_lazy_record&) {}
    ldcf_lazy_record& operator=(const ldcf_lazy_record&)
    {
        reset();
        return *this;
    }
    ~ldcf_lazy_record() { reset(); }

    // The record, or null when `make`, which gives a new record or null, can't make it.
    template <typename Make>
    Record* get(Make&& make) const
    {
        if (Record* made = record_.load(std::memory_order_acquire); made != nullptr) {
            return made;
        }
        const std::lock_guard<std::recursive_mutex> guard(ldcf_record_mutex());
        Record* record = record_.load(std::memory_order_relaxed);
        if (record == nullptr) {
            record = make();
            record_.store(record, std::memory_order_release);
        }
        return record;
    }

    // Drops the record; no reader may hold it.
    void reset()
    {
        if (Record* record = record_.exchange(nullptr, std::memory_order_acq_rel); record != nullptr) {
            destroy(record);
        }
    }

private:
    mutable std::atomic<Record*> record_{nullptr};
};

// A flag that readers may raise at the same time.
class ldcf_reader_flag {
public:
    ldcf_reader_flag() = default;
    ldcf_reader_flag(const ldcf_reader_flag& other) : raised_(other.raised()) {}
    ldcf_reader_flag& operator=(const ldcf_reader_flag& other)
    {
        raised_.store(other.raised(), std::memory_order_relaxed);
        return *this;
    }

    bool raised() const { return raised_.load(std::memory_order_relaxed); }
    void raise() const { raised_.store(true, std::memory_order_relaxed); }
    void clear() { raised_.store(false, std::memory_order_relaxed); }

private:
    mutable std::atomic<bool> raised_{false};
};

// Joins texts into one new string.
template <typename... Texts>
csgl_string ldcf_join(const Texts&... texts)
{
    csgl_string result("");
    (result.append(texts), ...);
    return result;
}

// A value as it stands in messages: a parameter, its single quotes included.
DIRBASE_EXPORT csgl_string ldcf_quoted_parameter(const csgl_string& value);

// A number in decimal.
DIRBASE_EXPORT csgl_string ldcf_number(long value);

// Raises exc_invalid_input_t with the library's own place.
#define LDCF_THROW_INPUT(text, message_id) \
    throw exc_invalid_input_t(__FILE__, __LINE__, ldcf_join text.c_str(), message_id)
