// Look-ups of the checks of an entry, and the checks of aliases and referrals: see ldcf_entry_parts.h.
#include "servers/vrnd/libdirbase/schema/ldcf_entry_parts.h"

#include <cstring>

#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"
#include "servers/vrnd/libdirbase/schema/ldcf_entry_check.h"
#include "servers/vrnd/libdirbase/schema/ldcf_hash_index.h"

namespace {

using kind = ldcf_entry_finding_kind;

template <typename T>
auto named(const ldcf_map_name_to<T>& map, const char* name) -> decltype(map.begin()->second.get())
{
    const auto found = map.find(name);
    return found == map.end() ? nullptr : found->second.get();
}

// Attributes without a record are looked up again: the schema may have come to know them.
int check_known(const Attribute& attr, const ldcf_entry_reporter& reporter)
{
    const bool known = attr.a_info != nullptr || ldcf_api_attr_get_info(attr.a_type, nullptr) != nullptr;
    return known ? LDAP_SUCCESS : reporter.violation(kind::attribute_unknown, attr.a_type);
}

}  // namespace

ldcf_type_pointer ldcf_type_named(const ldcf_schema& schema, const char* name)
{
    constexpr char folds_to_underscore = 0x7f;  // in the cache, not in the map
    if (&schema == ldcf_schema_g) {
        const std::size_t length = std::strlen(name);
        const ldcf_hash_tbl_entry* node = ldcf_find_node(name, length);
        if (node != nullptr && node->info != nullptr && node->info->type != nullptr &&
            std::strchr(name, folds_to_underscore) == nullptr) {
            return node->info->type;
        }
    }
    return named(schema.attribute_types, name);
}

ldcf_class_pointer ldcf_class_named(const ldcf_schema& schema, const char* name)
{
    return named(schema.object_classes, name);
}

bool ldcf_is_named(const berval& value, const char* name)
{
    return value.bv_len == std::strlen(name) && vrn_strcasecmp(ldcf_value_text(value).c_str(), name) == 0;
}

bool ldcf_names_alias(const berval& value)
{
    return ldcf_is_named(value, "aliasObject") || ldcf_is_named(value, "alias");
}

int ldcf_check_alias(const Entry& entry, const ldcf_entry_reporter& reporter)
{
    int targets = 0;
    std::int64_t values = 0;
    const int result = ldcf_visit_attributes(entry, [&](const Attribute& attr) {
        if (vrn_strcasecmp(attr.a_type, "aliasedObjectName") != 0 &&
            vrn_strcasecmp(attr.a_type, "aliasedEntryName") != 0) {
            return check_known(attr, reporter);
        }
        ++targets;
        values = attr.a_numvals;
        return static_cast<int>(LDAP_SUCCESS);
    });
    if (result != LDAP_SUCCESS) {
        return result;
    }
    if (targets == 0) {
        return reporter.violation(kind::alias_target_missing);
    }
    if (targets == 2) {
        return reporter.violation(kind::alias_target_twice);
    }
    return values > 1 ? reporter.violation(kind::alias_target_exceeded, nullptr, values) : LDAP_SUCCESS;
}

int ldcf_check_referral(const Entry& entry, const ldcf_entry_reporter& reporter)
{
    bool has_target = false;
    const int result = ldcf_visit_attributes(entry, [&](const Attribute& attr) {
        if (vrn_strcasecmp(attr.a_type, "ref") != 0) {
            return check_known(attr, reporter);
        }
        has_target = true;
        return static_cast<int>(LDAP_SUCCESS);
    });
    return result == LDAP_SUCCESS && !has_target ? reporter.violation(kind::referral_target_missing) : result;
}

extern "C" {

int check_aliasObject(const Entry* entry)
{
    return ldcf_check_alias(*entry, ldcf_entry_reporter(entry->e_dn, ldcf_entry_log()));
}

int check_referralObject(const Entry* entry)
{
    return ldcf_check_referral(*entry, ldcf_entry_reporter(entry->e_dn, ldcf_entry_log()));
}

}  // extern "C"
