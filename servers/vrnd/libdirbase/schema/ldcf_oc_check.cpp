// The older check of an entry: see ldcf_oc_check.h.
//
// Both of its tests resolve one side first (the attributes that have values, the lists that the classes declare) and
// then look each of the other up in that, sorted.
#include "servers/vrnd/libdirbase/schema/ldcf_oc_check.h"

#include <cstring>

#include "libraries/libvrnutil/vrn_text.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/attr_names.h"
#include "servers/vrnd/libdirbase/model/dn_check.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"
#include "servers/vrnd/libdirbase/schema/ldcf_binary_name.h"
#include "servers/vrnd/libdirbase/schema/ldcf_entry_parts.h"

namespace {

using kind = ldcf_entry_finding_kind;

// The type of an attribute of an entry, which may have ";binary" behind its name. Null for an unknown one, and for one
// with ";binary" whose syntax isn't that.
ldcf_type_pointer type_of_attribute(const ldcf_schema& schema, const char* name)
{
    const std::size_t length = std::strlen(name);
    if (!ldcf_ends_in_binary(name, length)) {
        return ldcf_type_named(schema, name);
    }
    const heap_text plain = ldcf_without_binary(name, length);
    if (plain == nullptr) {
        csgl_throw_no_memory(__FILE__, __LINE__);
    }
    const asyntaxinfo* info = ldcf_attrtype_get_info(schema.attribute_types, plain.get());
    return info != nullptr && info->syntax != SC_BIN ? nullptr : ldcf_type_named(schema, plain.get());
}

ldcf_class_pointer class_of(const ldcf_schema& schema, const ldcf_value_text& name)
{
    return name.is_whole() ? ldcf_class_named(schema, name.c_str()) : nullptr;
}

// The types of an entry's attributes that have values.
class present_types {
public:
    present_types(const ldcf_schema& schema, const Entry& entry) : schema_(schema)
    {
        for (const Attribute* attr = entry.e_attrs; attr != nullptr; attr = attr->a_next) {
            const ldcf_type_pointer type = attr->a_numvals == 0 ? nullptr : type_of_attribute(schema, attr->a_type);
            if (type != nullptr) {
                types_.push_back(type);
            }
        }
        ldcf_sort(types_);
    }

    // Whether all are there that a class requires; each that isn't is reported.
    bool satisfy(ldcf_class_pointer found, const char* objclass, const ldcf_entry_reporter& reporter) const
    {
        if (found == nullptr) {
            reporter.report(kind::class_unknown, objclass);
            return false;
        }
        bool satisfied = true;
        for (const csgl_string& name : found->must()) {
            const ldcf_type_pointer type = ldcf_type_named(schema_, name);
            if (type == nullptr || !ldcf_holds(types_, type)) {
                reporter.report(kind::attribute_missing, name);
                satisfied = false;
            }
        }
        return satisfied;
    }

private:
    const ldcf_schema& schema_;
    ldcf_pointers<ldcf_attrtype_> types_;
};

// The types that classes declare.
class declared_types {
public:
    declared_types(const ldcf_schema& schema, berval** classes) : schema_(schema)
    {
        ldcf_pointers<ldcf_objclass_> declaring;
        ldcf_visit_values(classes, [&](const berval& value) {
            const ldcf_class_pointer found = class_of(schema_, ldcf_value_text(value));
            if (found == nullptr) {
                open_ended_ = true;
                return 1;
            }
            declaring.push_back(found);
            return 0;
        });
        ldcf_sort(declaring);
        for (const ldcf_class_pointer objclass : declaring) {
            add(objclass->must());
            add(objclass->may());
        }
        ldcf_sort(types_);
    }

    // Whether an attribute is permitted; one that isn't is reported.
    bool permit(const char* name, const ldcf_entry_reporter& reporter) const
    {
        if (open_ended_ || vrn_strcasecmp(name, "objectclass") == 0) {
            return true;
        }
        const ldcf_type_pointer type = type_of_attribute(schema_, name);
        const bool permitted = type != nullptr && ldcf_holds(types_, type);
        if (!permitted) {
            reporter.report(kind::attribute_not_allowed, name);
        }
        return permitted;
    }

private:
    void add(const ldcf_names& names)
    {
        for (const csgl_string& name : names) {
            if (const ldcf_type_pointer type = ldcf_type_named(schema_, name); type != nullptr) {
                types_.push_back(type);
            }
        }
    }

    const ldcf_schema& schema_;
    ldcf_pointers<ldcf_attrtype_> types_;
    bool open_ended_ = false;  // a class is unknown, so nobody can tell what it permits
};

// Whether the entry has what its classes require, all of them, or for an alias the alias classes.
bool has_required(const ldcf_schema& schema, const Entry& entry, bool is_alias, const ldcf_entry_reporter& reporter)
{
    const present_types present(schema, entry);
    bool satisfied = true;
    ldcf_visit_values(entry.e_objectclass_attr->a_vals, [&](const berval& value) {
        if (!is_alias || ldcf_names_alias(value)) {
            const ldcf_value_text name(value);
            satisfied = present.satisfy(class_of(schema, name), name.c_str(), reporter) && satisfied;
        }
        return 0;
    });
    return satisfied;
}

bool has_only_permitted(const ldcf_schema& schema, const Entry& entry, const ldcf_entry_reporter& reporter)
{
    const declared_types declared(schema, entry.e_objectclass_attr->a_vals);
    bool permitted = true;
    ldcf_visit_attributes(entry, [&](const Attribute& attr) {
        permitted = declared.permit(attr.a_type, reporter) && permitted;
        return 0;
    });
    return permitted;
}

int check_values(const Attribute& attr, const ldcf_entry_reporter& reporter)
{
    const std::uint32_t syntax = attr_syntax(attr.a_type);
    if (syntax == (SC_DN | SC_CIS)) {
        std::int64_t place = 0;
        return ldcf_visit_values(attr.a_vals, [&](const berval& value) {
            const ldcf_value_text text(value);
            const int result = text.is_whole() ? dn_check(text.c_str(), nullptr) : LDAP_INVALID_DN_SYNTAX;
            if (result != LDAP_SUCCESS) {
                reporter.report(kind::value_dn_invalid, attr.a_type, place);
            }
            ++place;
            return result;
        });
    }
    if (syntax == SC_BOOL && attr.a_numvals > 1) {
        reporter.report(kind::boolean_exceeded, attr.a_type, attr.a_numvals);
        return LDAP_INVALID_SYNTAX;
    }
    return LDAP_SUCCESS;
}

}  // namespace

int ldcf_check_by_declarations(const ldcf_schema& schema, const Entry& entry, ldcf_entry_sink& sink)
{
    const ldcf_entry_reporter reporter(entry.e_dn, sink);
    if (entry.e_objectclass_attr == nullptr) {
        return reporter.violation(kind::no_objectclass);
    }
    const bool is_alias = ldcf_visit_values(entry.e_objectclass_attr->a_vals,
                                            [](const berval& value) { return ldcf_names_alias(value) ? 1 : 0; }) != 0;
    if (!has_required(schema, entry, is_alias, reporter) ||
        (!is_alias && !has_only_permitted(schema, entry, reporter))) {
        return LDAP_OBJECT_CLASS_VIOLATION;
    }
    const int result = dn_check(entry.e_dn, nullptr);
    if (result != LDAP_SUCCESS) {
        reporter.report(kind::entry_dn_invalid);
        return result;
    }
    return ldcf_visit_attributes(entry, [&](const Attribute& attr) { return check_values(attr, reporter); });
}

extern "C" {

int ldcf_oc_schema_check(const Entry* entry)
try {
    return entry == nullptr ? LDAP_SUCCESS : ldcf_check_by_declarations(*ldcf_schema_g, *entry, ldcf_entry_log());
} catch (const exc_not_enough_memory_t&) {
    return LDAP_NO_MEMORY;
}

int oc_check_required(const Entry* entry, const char* objclass)
try {
    const bool satisfied = entry != nullptr && objclass != nullptr &&
                           present_types(*ldcf_schema_g, *entry)
                               .satisfy(ldcf_class_named(*ldcf_schema_g, objclass), objclass,
                                        ldcf_entry_reporter(entry->e_dn, ldcf_entry_log()));
    return satisfied ? 0 : 1;
} catch (const exc_not_enough_memory_t&) {
    return 1;
}

int oc_check_allowed(const char* type, berval** values, const char* dn)
try {
    const bool permitted =
        type != nullptr &&
        declared_types(*ldcf_schema_g, values).permit(type, ldcf_entry_reporter(dn, ldcf_entry_log()));
    return permitted ? 0 : 1;
} catch (const exc_not_enough_memory_t&) {
    return 1;
}

int oc_attr_type_cmp(const char* a, const char* b)
try {
    if (a == nullptr || b == nullptr) {
        return 1;
    }
    const ldcf_type_pointer type = type_of_attribute(*ldcf_schema_g, b);
    return type != nullptr && type == ldcf_type_named(*ldcf_schema_g, a) ? 0 : 1;
} catch (const exc_not_enough_memory_t&) {
    return 1;
}

bool ldcf_api_oc_contains_attr(const char* objclass, const char* /*attribute*/, int where)
{
    constexpr char sought[] = "userpassword";
    const ldcf_class_pointer found = objclass == nullptr ? nullptr : ldcf_class_named(*ldcf_schema_g, objclass);
    if (found == nullptr) {
        return false;
    }
    const bool in_must = found->must().find(sought) != found->must().end();
    const bool in_may = found->may().find(sought) != found->may().end();
    switch (where) {
    case 0: return in_may;
    case 1: return in_must;
    case 2: return in_may || in_must;
    default: return false;
    }
}

}  // extern "C"
