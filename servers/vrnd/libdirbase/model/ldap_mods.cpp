// Lists of modifications: see ldap_mods.h. The name and the values of a copy are made before its record, so that a
// half-built record never exists.
#include "servers/vrnd/libdirbase/model/ldap_mods.h"

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <utility>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/model/record_guards.h"

namespace {

template <typename T>
std::size_t count_of(T* const* array)
{
    std::size_t count = 0;
    while (array != nullptr && array[count] != nullptr) {
        ++count;
    }
    return count;
}

void tell_no_memory(const char* function)
{
    debug_error("Error - %s: malloc failed. Out of memory\n", function);
}

berval* copy_of(const berval* value)
{
    return ber_bvdup(value);
}

berval* copy_of(const char* text)
{
    const berval value = {std::strlen(text), const_cast<char*>(text)};
    return ber_bvdup(&value);
}

// Null when memory ran out.
template <typename T>
values_guard copy_values(T* const* values)
{
    const std::size_t count = count_of(values);
    values_guard copies(static_cast<berval**>(std::calloc(count + 1, sizeof(berval*))));
    for (std::size_t i = 0; copies != nullptr && i < count; ++i) {
        copies.get()[i] = copy_of(values[i]);
        if (copies.get()[i] == nullptr) {
            copies.reset();
        }
    }
    return copies;
}

// A copy of a record with other values, which it takes, and another mod_op. Null when memory ran out.
LDAPMod* copy_with(const LDAPMod& mod, std::int32_t op, values_guard values)
{
    heap_text type(mod.mod_type == nullptr ? nullptr : strdup(mod.mod_type));
    if (mod.mod_type != nullptr && type == nullptr) {
        return nullptr;
    }
    LDAPMod* const copy = alloc_ldapmod();
    if (copy != nullptr) {
        copy->mod_op = op;
        copy->mod_type = type.release();
        copy->mod_bvalues = values.release();
    }
    return copy;
}

LDAPMod* copy_bv_mod(const LDAPMod& mod)
{
    values_guard values(mod.mod_bvalues == nullptr ? nullptr : copy_values(mod.mod_bvalues));
    if (mod.mod_bvalues != nullptr && values == nullptr) {
        return nullptr;
    }
    return copy_with(mod, mod.mod_op, std::move(values));
}

LDAPMod* copy_as_bv_mod(const LDAPMod& mod)
{
    if (mod.mod_bvalues == nullptr || (mod.mod_op & LDAP_MOD_BVALUES) != 0) {
        LDAPMod* const copy = copy_bv_mod(mod);
        if (copy != nullptr) {
            copy->mod_op |= LDAP_MOD_BVALUES;
        }
        return copy;
    }
    values_guard values = copy_values(mod.mod_values);
    return values == nullptr ? nullptr : copy_with(mod, mod.mod_op | LDAP_MOD_BVALUES, std::move(values));
}

// Releases copies whose values are bervals, whatever mod_op says.
void free_bv_chain(LDAPMod* first)
{
    for (LDAPMod* mod = first; mod != nullptr; mod = mod->mod_next) {
        mod->mod_op |= LDAP_MOD_BVALUES;
    }
    free_ldmll(first);
}

// Copies a chain to *end, record by record; the end may be the chain's own, so its last record is found first. False
// when memory ran out, with what was copied in place.
bool append_copies(const LDAPMod* first, LDAPMod** end)
{
    const LDAPMod* last = first;
    while (last != nullptr && last->mod_next != nullptr) {
        last = last->mod_next;
    }
    for (const LDAPMod* mod = first; mod != nullptr; mod = mod == last ? nullptr : mod->mod_next) {
        *end = copy_bv_mod(*mod);
        if (*end == nullptr) {
            return false;
        }
        end = &(*end)->mod_next;
    }
    return true;
}

}  // namespace

extern "C" {

// ---- making and releasing -------------------------------------------------------------------------------------------

LDAPMod* alloc_ldapmod(void)
{
    return static_cast<LDAPMod*>(std::calloc(1, sizeof(LDAPMod)));
}

void free_ldapmod(LDAPMod* mod)
{
    if (mod == nullptr) {
        return;
    }
    std::free(mod->mod_type);
    if ((mod->mod_op & LDAP_MOD_BVALUES) != 0) {
        ber_bvecfree(mod->mod_bvalues);
    } else {
        for (char** text = mod->mod_values; text != nullptr && *text != nullptr; ++text) {
            std::free(*text);
        }
        std::free(mod->mod_values);
    }
    std::free(mod);
}

void free_ldmll(LDAPMod* first)
{
    while (first != nullptr) {
        LDAPMod* const next = first->mod_next;
        free_ldapmod(first);
        first = next;
    }
}

void free_ldmarr(LDAPMod** array)
{
    for (LDAPMod** mod = array; mod != nullptr && *mod != nullptr; ++mod) {
        free_ldapmod(*mod);
    }
    std::free(array);
}

void FreeMods(LDAPMod** array)
{
    free_ldmarr(array);
}

// ---- copying --------------------------------------------------------------------------------------------------------

LDAPMod* dup_mod(const LDAPMod* mod)
{
    LDAPMod* const copy = mod == nullptr ? nullptr : copy_bv_mod(*mod);
    if (mod != nullptr && copy == nullptr) {
        tell_no_memory("dup_mod");
    }
    return copy;
}

LDAPMod* dup_ldmll(const LDAPMod* first)
{
    LDAPMod* copies = nullptr;
    if (!append_copies(first, &copies)) {
        tell_no_memory("dup_ldmll");
        free_bv_chain(copies);
        return nullptr;
    }
    return copies;
}

int duplicateBVMod(const LDAPMod* mod, LDAPMod** copy)
{
    if (copy != nullptr) {
        *copy = nullptr;
    }
    if (mod == nullptr || copy == nullptr) {
        return LDAP_OTHER;
    }
    *copy = copy_bv_mod(*mod);
    if (*copy == nullptr) {
        tell_no_memory("duplicateBVMod");
        return LDAP_NO_MEMORY;
    }
    return LDAP_SUCCESS;
}

int duplicateAllMods(const LDAPMod* first, LDAPMod** copies)
{
    if (first == nullptr || copies == nullptr) {
        return LDAP_SUCCESS;
    }
    LDAPMod** end = copies;
    while (*end != nullptr) {
        end = &(*end)->mod_next;
    }
    if (!append_copies(first, end)) {
        tell_no_memory("duplicateAllMods");
        return LDAP_NO_MEMORY;
    }
    return LDAP_SUCCESS;
}

LDAPMod** DuplicateMods(LDAPMod* const* array)
{
    if (array == nullptr) {
        return nullptr;
    }
    const std::size_t count = count_of(array);
    mods_guard copies(static_cast<LDAPMod**>(std::calloc(count + 1, sizeof(LDAPMod*))));
    for (std::size_t i = 0; copies != nullptr && i < count; ++i) {
        LDAPMod* const copy = copies.get()[i] = copy_as_bv_mod(*array[i]);
        if (copy == nullptr) {
            copies.reset();
        } else if (i > 0) {
            copies.get()[i - 1]->mod_next = copy;
        }
    }
    if (copies == nullptr) {
        tell_no_memory("DuplicateMods");
    }
    return copies.release();
}

// ---- joining --------------------------------------------------------------------------------------------------------

int modarray_merge(LDAPMod*** array, LDAPMod** other)
{
    if (array == nullptr) {
        return LDAP_OTHER;
    }
    const std::size_t count = count_of(*array);
    const std::size_t added = count_of(other);
    if (added == 0 && *array != nullptr) {
        return LDAP_SUCCESS;
    }
    auto** const grown = static_cast<LDAPMod**>(std::realloc(*array, (count + added + 1) * sizeof(LDAPMod*)));
    if (grown == nullptr) {
        debug_error("Error - modarray_merge: realloc failed. Out of memory\n");
        return LDAP_NO_MEMORY;
    }
    if (added != 0) {
        std::memcpy(grown + count, other, added * sizeof(LDAPMod*));
    }
    grown[count + added] = nullptr;
    *array = grown;
    return LDAP_SUCCESS;
}

}  // extern "C"
