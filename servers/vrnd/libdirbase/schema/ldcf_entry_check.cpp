// The check of an entry against the whole schema: see ldcf_entry_check.h.
//
// Instead of building the sets of required and permitted attributes, the check marks what is permitted among the
// attributes that are present. The ranges that it sorts are as long as the entry, not as the schema.
#include "servers/vrnd/libdirbase/schema/ldcf_entry_check.h"

#include <cstring>
#include <iterator>
#include <numeric>

#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/oid_prefix.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/dn_esc_records.h"
#include "servers/vrnd/libdirbase/model/language_tag.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"
#include "servers/vrnd/libdirbase/schema/ldcf_binary_name.h"
#include "servers/vrnd/libdirbase/schema/ldcf_entry_parts.h"
#include "servers/vrnd/libdirbase/schema/ldcf_oc_check.h"

namespace {

using kind = ldcf_entry_finding_kind;

constexpr char oid_of_top[] = "2.5.6.0";
constexpr char objectclass[] = "objectclass";

// What the password policy keeps in the entry of a user.
constexpr const char* policy_attributes[] = {
    "pwdChangedTime",  "pwdAccountLockedTime", "pwdExpirationWarned",   "pwdReset", "pwdFailureTime", "pwdHistory",
    "pwdGraceUseTime", "pwdGroupPoliceDN",     "pwdIndividualPolicyDN",
};

bool is_protected(const asyntaxinfo* info)
{
    constexpr int restricted = 8;
    constexpr int system = 16;
    return info != nullptr && (info->access_class == restricted || info->access_class == system);
}

bool is_structural(ldcf_class_pointer objclass)
{
    return objclass->kind() == ldcf_objclass_kind::structural;
}

// The result of normalising a DN; `without_record` when that gave no record.
int normalize_result(const char* dn, int without_record)
{
    const escDN_guard record(dn_normalize_esc(dn));
    return record == nullptr ? without_record : record->result;
}

// The place of the first value that is no DN, with the result; the count of values and LDAP_SUCCESS when all are.
int check_dn_values(const Attribute& attr, std::int64_t& place)
{
    place = 0;
    if (attr.a_info == nullptr || (attr.a_info->syntax & SC_DN) == 0) {
        return LDAP_SUCCESS;
    }
    return ldcf_visit_values(attr.a_vals, [&](const berval& value) {
        const ldcf_value_text text(value);
        const int result = text.is_whole() ? normalize_result(text.c_str(), LDAP_NO_MEMORY) : LDAP_INVALID_DN_SYNTAX;
        place += result == LDAP_SUCCESS ? 1 : 0;
        return result;
    });
}

class entry_check {
public:
    entry_check(const ldcf_schema& schema, Entry& entry, int mode, bool policy, bool* added, ldcf_entry_sink& sink)
        : schema_(schema), entry_(entry), mode_(mode), policy_(policy), added_(added), log_(entry.e_dn, sink)
    {
    }

    int run()
    {
        int result = find_policy_attributes();
        if (result == LDAP_SUCCESS) {
            result = entry_.e_objectclass_attr == nullptr ? log_.violation(kind::no_objectclass) : check_entry_dn();
        }
        if (result == LDAP_SUCCESS) {
            result = take_attributes();
        }
        if (result == LDAP_SUCCESS) {
            result = take_classes();
        }
        if (result != LDAP_SUCCESS) {
            return result;
        }
        if (std::none_of(classes_.begin(), classes_.end(), is_structural)) {
            fault(kind::structural_class_missing);
        }
        if (is_alias_) {
            return ldcf_check_alias(entry_, log_);
        }
        if (is_referral_) {
            return ldcf_check_referral(entry_, log_);
        }
        check_superclasses();
        check_required();
        check_allowed();
        return result_;
    }

private:
    struct present_type {
        ldcf_type_pointer type;
        bool allowed;

        friend bool operator<(const present_type& a, const present_type& b)
        {
            return std::less<ldcf_type_pointer>()(a.type, b.type);
        }
    };

    void fault(ldcf_entry_finding_kind what, const char* name = nullptr, std::int64_t count = 0)
    {
        result_ = log_.violation(what, name, count);
    }

    int find_policy_attributes()
    {
        if (!policy_) {
            return LDAP_SUCCESS;
        }
        policy_types_.reserve(std::size(policy_attributes));
        for (const char* name : policy_attributes) {
            policy_types_.push_back(ldcf_type_named(schema_, name));
            if (policy_types_.back() == nullptr) {
                return log_.violation(kind::policy_undefined, name);
            }
        }
        return LDAP_SUCCESS;
    }

    int check_entry_dn()
    {
        const int result = entry_.e_norm_dn != nullptr ? LDAP_SUCCESS : normalize_result(entry_.e_dn, LDAP_SUCCESS);
        if (result != LDAP_SUCCESS && result != LDAP_NO_MEMORY) {
            log_.report(kind::entry_dn_invalid);
        }
        return result;
    }

    // ---- one attribute, one class -----------------------------------------------------------------------------------

    int take_attributes()
    {
        std::size_t count = 0;
        for (const Attribute* attr = entry_.e_attrs; attr != nullptr; attr = attr->a_next) {
            ++count;
        }
        present_.reserve(count);
        const int result = ldcf_visit_attributes(entry_, [this](const Attribute& attr) { return take(attr); });
        sort_present();
        return result;
    }

    int take(const Attribute& attr)
    {
        std::int64_t place = 0;
        int result = check_dn_values(attr, place);
        if (result != LDAP_SUCCESS) {
            if (result != LDAP_NO_MEMORY) {
                log_.report(kind::value_dn_invalid, attr.a_type, place);
            }
            return result;
        }
        ldcf_type_pointer type = nullptr;
        result = find_type(attr, type);
        if (result != LDAP_SUCCESS) {
            return result;
        }
        if (type == nullptr) {
            return log_.violation(kind::attribute_undefined, attr.a_type);
        }
        if (type->single_value() && attr.a_numvals > 1) {
            return log_.violation(kind::single_value_exceeded, attr.a_type, attr.a_numvals);
        }
        if (attr.a_numvals > 0) {
            present_.push_back({type, policy_ && is_protected(attr.a_info)});
        }
        return LDAP_SUCCESS;
    }

    // The type of an attribute by its name; null for an unknown one.
    int find_type(const Attribute& attr, ldcf_type_pointer& type) const
    {
        const std::size_t length = std::strlen(attr.a_type);
        const std::size_t skipped = has_oid_prefix(attr.a_type) ? oid_prefix_length : 0;
        const char* name = attr.a_type + skipped;
        heap_text plain;
        if (ldcf_ends_in_binary(attr.a_type, length)) {
            plain = ldcf_without_binary(name, length - skipped);
            if (plain == nullptr) {
                return LDAP_NO_MEMORY;
            }
            name = plain.get();
            const asyntaxinfo* info = ldcf_attrtype_get_info(schema_.attribute_types, name);
            if (info != nullptr && info->syntax != SC_BIN) {
                return log_.violation(kind::not_binary, attr.a_type);
            }
        }
        const bool by_record = attr.a_info != nullptr && contains_valid_language_tag(name);
        type = ldcf_type_named(schema_, by_record ? attr.a_info->names[0] : name);
        return LDAP_SUCCESS;
    }

    // Brings the types into order, each once; a type is allowed when one of its versions is.
    void sort_present()
    {
        std::sort(present_.begin(), present_.end());
        auto last = present_.begin();
        for (auto at = present_.begin(); at != present_.end(); ++at) {
            if (at->type == last->type) {
                last->allowed = last->allowed || at->allowed;
            } else {
                *++last = *at;
            }
        }
        if (!present_.empty()) {
            present_.erase(std::next(last), present_.end());
        }
    }

    int take_classes()
    {
        const Attribute& attr = *entry_.e_objectclass_attr;
        classes_.reserve(static_cast<std::size_t>(attr.a_numvals));
        const int result = ldcf_visit_values(attr.a_vals, [this](const berval& value) { return take(value); });
        ldcf_sort(classes_);
        return result;
    }

    int take(const berval& value)
    {
        const ldcf_value_text name(value);
        const ldcf_class_pointer objclass = name.is_whole() ? ldcf_class_named(schema_, name.c_str()) : nullptr;
        if (objclass == nullptr) {
            return log_.violation(kind::class_undefined, name.c_str());
        }
        classes_.push_back(objclass);
        is_alias_ = is_alias_ || ldcf_names_alias(value);
        is_extensible_ = is_extensible_ || ldcf_is_named(value, "extensibleObject");
        is_referral_ = is_referral_ || ldcf_is_named(value, "referral");
        return LDAP_SUCCESS;
    }

    // ---- the tests by sets: each runs whatever the others found -----------------------------------------------------

    void check_superclasses()
    {
        if (mode_ != ldcf_check_strict && mode_ != ldcf_check_lenient) {
            log_.report(kind::mode_invalid);
            return;
        }
        ldcf_pointers<ldcf_objclass_> superclasses;
        superclasses.reserve(std::accumulate(
            classes_.begin(), classes_.end(), std::size_t{0},
            [](std::size_t sum, const auto* objclass) { return sum + objclass->superclasses().size(); }));
        for (const ldcf_class_pointer objclass : classes_) {
            for (const ldcf_objclass& superclass : objclass->superclasses()) {
                superclasses.push_back(superclass.get());
            }
        }
        ldcf_sort(superclasses);

        if (mode_ == ldcf_check_strict) {
            const auto count = std::count_if(classes_.begin(), classes_.end(), [&](ldcf_class_pointer objclass) {
                return is_structural(objclass) && !ldcf_holds(superclasses, objclass);
            });
            if (count != 1) {
                fault(kind::structural_class_count, nullptr, count);
            }
        }
        for (const ldcf_class_pointer superclass : superclasses) {
            if (!ldcf_holds(classes_, superclass)) {
                superclass_is_missing(*superclass);
            }
        }
    }

    void superclass_is_missing(const ldcf_objclass_& superclass)
    {
        if (mode_ == ldcf_check_lenient) {
            log_.report(kind::superclass_added, superclass.name());
            add_class(superclass.name());
        } else if (superclass.oid() == oid_of_top) {
            log_.report(kind::top_added, "top");
            add_class("top");
        } else {
            fault(kind::superclass_missing, superclass.name());
        }
    }

    // Without memory the class stays missing, which nobody has to know: the next check adds it.
    void add_class(const char* name)
    {
        add_attr_to_entry(&entry_, objectclass, name, 1);
        if (added_ != nullptr) {
            *added_ = true;
        }
    }

    void check_required()
    {
        ldcf_pointers<ldcf_attrtype_> missing;
        for (const ldcf_class_pointer objclass : classes_) {
            mark_allowed(objclass->complete_must(), &missing);
        }
        ldcf_sort(missing);
        for (const ldcf_type_pointer type : missing) {
            fault(kind::attribute_missing, type->name());
        }
    }

    // Behind check_required, which has allowed what is required.
    void check_allowed()
    {
        if (is_extensible_) {
            return;
        }
        for (const ldcf_class_pointer objclass : classes_) {
            mark_allowed(objclass->complete_may(), nullptr);
        }
        for (const ldcf_type_pointer type : policy_types_) {
            mark_allowed(type);
        }
        for (const present_type& present : present_) {
            if (!present.allowed) {
                fault(kind::attribute_not_allowed, present.type->name());
            }
        }
    }

    // Marks a type among those that are present. False when it isn't one of them.
    bool mark_allowed(ldcf_type_pointer type)
    {
        const auto place = std::lower_bound(present_.begin(), present_.end(), present_type{type, false});
        const bool found = place != present_.end() && place->type == type;
        if (found) {
            place->allowed = true;
        }
        return found;
    }

    // The same for each of a set; those that aren't there go to `missing`, unless that is null.
    void mark_allowed(const csgl_set<ldcf_attrtype>& types, ldcf_pointers<ldcf_attrtype_>* missing)
    {
        for (const ldcf_attrtype& type : types) {
            if (!mark_allowed(type.get()) && missing != nullptr) {
                missing->push_back(type.get());
            }
        }
    }

    const ldcf_schema& schema_;
    Entry& entry_;
    int mode_;
    bool policy_;
    bool* added_;
    ldcf_entry_reporter log_;

    int result_ = LDAP_SUCCESS;
    csgl_vector<present_type> present_;  // the types that have values, sorted
    ldcf_pointers<ldcf_attrtype_> policy_types_;
    ldcf_pointers<ldcf_objclass_> classes_;  // the classes that the entry names, sorted
    bool is_alias_ = false;
    bool is_extensible_ = false;
    bool is_referral_ = false;
};

}  // namespace

int ldcf_check_entry(const ldcf_schema& schema, Entry* entry, int mode, bool policy, bool* added, ldcf_entry_sink& sink)
{
    if (added != nullptr) {
        *added = false;
    }
    if (entry == nullptr || mode == ldcf_check_none) {
        return LDAP_SUCCESS;
    }
    if (mode == ldcf_check_declared) {
        return ldcf_check_by_declarations(schema, *entry, sink);
    }
    return entry_check(schema, *entry, mode, policy, added, sink).run();
}

extern "C" {

int ldcf_api_schema_check(Entry* entry, bool* added, bool policy)
try {
    if (ldcf_api_schema_check_g == ldcf_check_declared) {
        if (added != nullptr) {
            *added = false;
        }
        return ldcf_oc_schema_check(entry);
    }
    return ldcf_check_entry(*ldcf_schema_g, entry, ldcf_api_schema_check_g, policy, added, ldcf_entry_log());
} catch (...) {  // memory ran out: the exception has told the message log
    debug_error("Error - ldcf_api_schema_check: unknown exception thrown!\n");
    return LDAP_OPERATIONS_ERROR;
}

int check_dn_in_attr(const ldcf_schema* /*schema*/, const Attribute* attr)
try {
    std::int64_t place = 0;
    return check_dn_values(*attr, place);
} catch (const exc_not_enough_memory_t&) {
    return LDAP_NO_MEMORY;
}

}  // extern "C"
