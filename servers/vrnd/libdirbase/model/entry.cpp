// Making and releasing entries, and their values one by one: see entry.h.
#include "servers/vrnd/libdirbase/model/entry.h"

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <strings.h>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/model/attr_ids.h"
#include "servers/vrnd/libdirbase/model/attr_index.h"
#include "servers/vrnd/libdirbase/model/attr_value_tree.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/model/value_compare.h"

namespace {

// Both sides of a comparison are as they came.
constexpr int both_raw = 3;

// The place of the first value that is equal by the attribute's syntax; a_numvals when there is none.
std::int64_t place_of(const Attribute& attr, const berval& value)
{
    std::int64_t at = 0;
    while (at < attr.a_numvals &&
           value_cmp(attr.a_vals[at], &value, static_cast<std::uint32_t>(attr.a_syntax), both_raw) != 0) {
        ++at;
    }
    return at;
}

void remove_at(Attribute& attr, std::int64_t place)
{
    attr_free_decodedvals(&attr);
    ber_bvfree(attr.a_vals[place]);
    // The null pointer at the end moves up with the values.
    std::memmove(attr.a_vals + place, attr.a_vals + place + 1,
                 static_cast<std::size_t>(attr.a_numvals - place) * sizeof *attr.a_vals);
    --attr.a_numvals;
}

}  // namespace

extern "C" {

int CreateEntry(Entry** entry)
{
    if (entry == nullptr) {
        return LDAP_OTHER;
    }
    *entry = static_cast<Entry*>(std::calloc(1, sizeof(Entry)));
    return *entry == nullptr ? LDAP_NO_MEMORY : LDAP_SUCCESS;
}

void entry_free(Entry* entry)
{
    if (entry == nullptr) {
        return;
    }
    if ((entry->e_flag & ENTRY_IN_CACHE) != 0) {
        debug_error("Cannot free ENTRY_IN_CACHE: eid = %d, e_flag = 0x%X, dn: %s\n", entry->e_id,
                    static_cast<unsigned>(entry->e_flag), entry->e_dn == nullptr ? "(null)" : entry->e_dn);
        return;
    }
    for (Attribute* attr = entry->e_attrs; attr != nullptr;) {
        Attribute* const next = attr->a_next;
        attr_free(attr);
        attr = next;
    }
    for (berval** values : entry->e_backend_values) {
        ber_bvecfree(values);
    }
    delete entry->e_index;
    std::free(entry->e_dn);
    std::free(entry->e_norm_dn);
    std::free(entry->e_checksum);
    std::free(entry->e_checksumop);
    std::free(entry);
}

bool verify_attribute(const Entry* entry, const char* name, const char* value, std::size_t length)
{
    if (entry == nullptr || name == nullptr || value == nullptr) {
        return false;
    }
    const Attribute* const attr = attr_find(entry, name, 0, nullptr);
    if (attr == nullptr) {
        return false;
    }
    const bool is_objectclass = attr->a_info != nullptr && attr->a_info->attr_id == attr_id_objectclass;
    if (is_objectclass || attr->a_tree == nullptr) {
        return value_find_short_list(attr, value, static_cast<std::int64_t>(length)) == 0;
    }
    const berval wanted = {length, const_cast<char*>(value)};
    return value_find(attr, &wanted, static_cast<std::uint32_t>(attr->a_syntax), 1) == 0;
}

int delete_values_from_entry(Entry* entry, const LDAPMod* mod)
{
    if (entry == nullptr || mod == nullptr || mod->mod_type == nullptr) {
        return LDAP_NO_SUCH_ATTRIBUTE;
    }
    if (mod->mod_bvalues == nullptr || *mod->mod_bvalues == nullptr) {
        debug_trace("delete_values_from_entry: removing entire attribute %s\n", mod->mod_type);
        return attr_delete(entry, mod->mod_type, nullptr) == 0 ? LDAP_SUCCESS : LDAP_NO_SUCH_ATTRIBUTE;
    }
    Attribute* const attr = attr_find(entry, mod->mod_type, 0, nullptr);
    if (attr == nullptr) {
        debug_error("delete_values_from_entry: could not find attribute %s\n", mod->mod_type);
        return LDAP_NO_SUCH_ATTRIBUTE;
    }
    for (berval** value = mod->mod_bvalues; *value != nullptr; ++value) {
        const std::int64_t place = place_of(*attr, **value);
        if (place == attr->a_numvals) {
            debug_error("delete_values_from_entry: could not find value for attr %s\n", mod->mod_type);
            return LDAP_NO_SUCH_ATTRIBUTE;
        }
        remove_at(*attr, place);
    }
    return LDAP_SUCCESS;
}

int free_attrtree(avl_node* node)
{
    avl_free(node, [](void* value) { free_AttrvalsNorm(static_cast<AttrvalsNorm*>(value)); });
    return 0;
}

}  // extern "C"
