// Entries as lists of modifications, and back: see entry_mods.h.
#include "servers/vrnd/libdirbase/model/entry_mods.h"

#include <algorithm>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <strings.h>
#include <utility>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "libraries/libmsg/message_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/model/dn_esc_records.h"
#include "servers/vrnd/libdirbase/model/record_guards.h"

namespace {

std::size_t count_of(const Attribute* first)
{
    std::size_t count = 0;
    for (const Attribute* attr = first; attr != nullptr; attr = attr->a_next) {
        ++count;
    }
    return count;
}

// The records of an array under construction, linked as they come.
struct mods_builder {
    mods_guard array;
    std::size_t count = 0;

    // `slots` null pointers. False when memory ran out.
    bool start(std::size_t slots)
    {
        array.reset(static_cast<LDAPMod**>(std::calloc(slots, sizeof(LDAPMod*))));
        return array != nullptr;
    }

    // Puts a new record behind the others. Null when memory ran out.
    LDAPMod* add()
    {
        LDAPMod* const mod = alloc_ldapmod();
        if (mod != nullptr) {
            if (count != 0) {
                array.get()[count - 1]->mod_next = mod;
            }
            array.get()[count++] = mod;
        }
        return mod;
    }
};

// Fills an add with a copy of an attribute. False, and the log tells, when memory ran out.
bool copy_attribute(LDAPMod& mod, const Attribute& attr)
{
    mod.mod_op = LDAP_MOD_ADD | LDAP_MOD_BVALUES;
    mod.mod_type = strdup(attr.a_type);
    if (mod.mod_type == nullptr) {
        debug_error("Error - EntryToLDAPMod: strdup failed in file %s near line %d\n", __FILE__, __LINE__);
        return false;
    }
    if (attr.a_vals == nullptr) {
        return true;
    }
    std::size_t count = 0;
    while (attr.a_vals[count] != nullptr) {
        ++count;
    }
    mod.mod_bvalues = static_cast<berval**>(std::calloc(count + 1, sizeof(berval*)));
    if (mod.mod_bvalues == nullptr) {
        debug_error("Error - EntryToLDAPMod: calloc failed in file %s near line %d\n", __FILE__, __LINE__);
        return false;
    }
    for (std::size_t i = 0; i < count; ++i) {
        mod.mod_bvalues[i] = ber_bvdup(attr.a_vals[i]);
        if (mod.mod_bvalues[i] == nullptr) {
            debug_error("Error - EntryToLDAPMod: ber_bvdup failed in file %s near line %d\n", __FILE__, __LINE__);
            return false;
        }
    }
    return true;
}

bool name_less(const char* a, const char* b)
{
    return strcasecmp(a, b) < 0;
}

// Makes the deletes of the old attributes that the modifications don't name. False when memory ran out.
bool delete_the_others(const mods_builder& named, const Attribute* old_first, mods_builder& deletes)
{
    // Sorted, so that lists of any length are compared quickly.
    const heap_pointer<const char*> names(
        static_cast<const char**>(std::malloc((named.count + 1) * sizeof(const char*))));
    if (names == nullptr || !deletes.start(count_of(old_first) + 1)) {
        return false;
    }
    const char** const end = std::transform(named.array.get(), named.array.get() + named.count, names.get(),
                                            [](const LDAPMod* mod) { return mod->mod_type; });
    std::sort(names.get(), end, name_less);
    for (const Attribute* attr = old_first; attr != nullptr; attr = attr->a_next) {
        if (std::binary_search(names.get(), end, attr->a_type, name_less)) {
            continue;
        }
        LDAPMod* const mod = deletes.add();
        if (mod == nullptr) {
            return false;
        }
        mod->mod_op = LDAP_MOD_DELETE;
        mod->mod_type = strdup(attr->a_type);
        if (mod->mod_type == nullptr) {
            return false;
        }
    }
    return true;
}

// Puts the records of one array behind those of the other, in both shapes.
int join(mods_builder& mods, mods_builder& behind)
{
    LDAPMod** array = mods.array.release();
    const int result = modarray_merge(&array, behind.array.get());
    mods.array.reset(array);
    if (result == LDAP_SUCCESS) {
        if (mods.count != 0) {
            array[mods.count - 1]->mod_next = array[mods.count];
        }
        std::free(behind.array.release());
    }
    return result;
}

// The normal form of the DN. False when there is none.
bool set_norm_dn(Entry& entry)
{
    const escDN_guard normal(dn_normalize_esc(entry.e_dn));
    if (normal == nullptr || normal->result == LDAP_NO_MEMORY) {
        return false;
    }
    entry.e_norm_dn = std::exchange(normal->upper, nullptr);
    return entry.e_norm_dn != nullptr;
}

int merge_mods(Entry& entry, LDAPMod* const* mods)
{
    for (; mods != nullptr && *mods != nullptr; ++mods) {
        const LDAPMod& mod = **mods;
        int result = LDAP_PROTOCOL_ERROR;
        if (mod.mod_bvalues == nullptr) {
            PrintMessage(MSG_COMPONENT_SERVER, MSG_WARNING, 92, mod.mod_type);
        } else {
            result = attr_merge(&entry, mod.mod_type, mod.mod_bvalues, 1, 1, nullptr);
            // What an attribute refuses is for the check of the entry to tell. An entry must not lack values, though,
            // that nobody refused.
            if (result != LDAP_NO_MEMORY) {
                continue;
            }
        }
        debug_error("Error - LDAPModToEntry: Failed to put LDAPMod **attrs into e->e_attrs\n");
        return result;
    }
    return LDAP_SUCCESS;
}

int make_entry(entry_guard& entry, char* dn, LDAPMod* const* mods)
{
    heap_text owned_dn(dn);
    Entry* made = nullptr;
    const int result = CreateEntry(&made);
    if (result != LDAP_SUCCESS) {
        return result;
    }
    entry.reset(made);
    made->e_dn = owned_dn.release();
    return set_norm_dn(*made) ? merge_mods(*made, mods) : LDAP_NO_MEMORY;
}

}  // namespace

extern "C" {

LDAPMod** EntryToLDAPMod(const Attribute* first)
{
    mods_builder mods;
    if (!mods.start(count_of(first) + 2)) {
        debug_error("Error - EntryToLDAPMod: calloc failed in file %s near line %d\n", __FILE__, __LINE__);
        return nullptr;
    }
    for (const Attribute* attr = first; attr != nullptr; attr = attr->a_next) {
        LDAPMod* const mod = mods.add();
        if (mod == nullptr) {
            debug_error("Error - EntryToLDAPMod: alloc_ldapmod failed in file %s near line %d\n", __FILE__, __LINE__);
            return nullptr;
        }
        if (!copy_attribute(*mod, *attr)) {
            return nullptr;
        }
    }
    return mods.array.release();
}

int diffEntriesToMods(const Attribute* new_first, const Attribute* old_first, LDAPMod*** mods)
{
    if (mods == nullptr) {
        return LDAP_OTHER;
    }
    *mods = nullptr;
    mods_builder made = {mods_guard(EntryToLDAPMod(new_first)), count_of(new_first)};
    if (made.array == nullptr) {
        debug_error("Error - diffEntriesToMods: EntryToLDAPMod failed!\n");
        return LDAP_NO_MEMORY;
    }
    std::for_each(made.array.get(), made.array.get() + made.count,
                  [](LDAPMod* mod) { mod->mod_op |= LDAP_MOD_REPLACE; });
    if (old_first != nullptr) {
        mods_builder deletes;
        if (!delete_the_others(made, old_first, deletes)) {
            debug_error("Error - diffEntriesToMods: malloc failed. Out of memory\n");
            return LDAP_NO_MEMORY;
        }
        const int result = join(made, deletes);
        if (result != LDAP_SUCCESS) {
            return result;
        }
    }
    *mods = made.array.release();
    return LDAP_SUCCESS;
}

int LDAPModToEntry(Entry** entry, char* dn, LDAPMod* const* mods)
{
    if (entry == nullptr) {
        std::free(dn);
        return LDAP_OTHER;
    }
    entry_guard made;
    const int result = make_entry(made, dn, mods);
    if (result != LDAP_SUCCESS) {
        made.reset();
        debug_error("Error - LDAPModToEntry: CreateEntry failed rc=%d\n", result);
    }
    *entry = made.release();
    return result;
}

}  // extern "C"
