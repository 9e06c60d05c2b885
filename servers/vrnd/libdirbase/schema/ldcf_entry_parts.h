// What the checks of an entry share: reporting, and looking up by plain texts.
//
// Definitions are held as plain pointers: the schema lock keeps them alive, and a handle would be counted.
//
// Private to this folder.
#pragma once

#include <algorithm>
#include <cstring>
#include <functional>

#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/schema/ldcf_entry_finding.h"
#include "servers/vrnd/libdirbase/schema/ldcf_schema.h"

using ldcf_type_pointer = const ldcf_attrtype_*;
using ldcf_class_pointer = const ldcf_objclass_*;

// Definitions in the order of their handles, each once, after ldcf_sort.
template <typename T>
using ldcf_pointers = csgl_vector<const T*>;

template <typename T>
void ldcf_sort(ldcf_pointers<T>& pointers)
{
    std::sort(pointers.begin(), pointers.end(), std::less<const T*>());
    pointers.erase(std::unique(pointers.begin(), pointers.end()), pointers.end());
}

template <typename T>
bool ldcf_holds(const ldcf_pointers<T>& sorted, const T* pointer)
{
    return std::binary_search(sorted.begin(), sorted.end(), pointer, std::less<const T*>());
}

// A sink for one entry.
class ldcf_entry_reporter {
public:
    ldcf_entry_reporter(const char* dn, ldcf_entry_sink& sink) : dn_(dn), sink_(sink) {}

    void report(ldcf_entry_finding_kind kind, const char* name = nullptr, std::int64_t count = 0) const
    {
        sink_.report({kind, name, count, dn_});
    }

    // Reports a fault and gives its result.
    int violation(ldcf_entry_finding_kind kind, const char* name = nullptr, std::int64_t count = 0) const
    {
        report(kind, name, count);
        return LDAP_OBJECT_CLASS_VIOLATION;
    }

private:
    const char* dn_;
    ldcf_entry_sink& sink_;
};

// The text of a value, which need not have a byte 0 behind it; one inside ends the text. Raises
// exc_not_enough_memory_t.
class ldcf_value_text {
public:
    explicit ldcf_value_text(const berval& value)
    {
        const std::size_t length = value.bv_val == nullptr ? 0 : value.bv_len;
        if (length >= sizeof(short_)) {
            long_.resize(length + 1);
        }
        char* text = long_.empty() ? short_ : long_.data();
        std::copy_n(value.bv_val, length, text);
        text[length] = '\0';
        is_whole_ = std::strlen(text) == length;
    }
    const char* c_str() const { return long_.empty() ? short_ : long_.data(); }

    // Whether no byte 0 cuts it: names and DNs have none.
    bool is_whole() const { return is_whole_; }

private:
    bool is_whole_ = true;
    char short_[128];
    csgl_vector<char> long_;
};

// Whether a value is this name, without regard to the case of ASCII letters.
bool ldcf_is_named(const berval& value, const char* name);

// Whether a value names one of the alias classes.
bool ldcf_names_alias(const berval& value);

// Visits the values of an attribute, or of none, up to the first for which the function doesn't give LDAP_SUCCESS, and
// returns what that gave.
template <typename Visit>
int ldcf_visit_values(berval** values, Visit&& visit)
{
    int result = LDAP_SUCCESS;
    for (; values != nullptr && *values != nullptr && result == LDAP_SUCCESS; ++values) {
        result = visit(**values);
    }
    return result;
}

// The same for the attributes of an entry, in order of arrival.
template <typename Visit>
int ldcf_visit_attributes(const Entry& entry, Visit&& visit)
{
    int result = LDAP_SUCCESS;
    for (const Attribute* attr = entry.e_attrs; attr != nullptr && result == LDAP_SUCCESS; attr = attr->a_next) {
        result = visit(*attr);
    }
    return result;
}

// The definition under a name or OID, without any handling of the name; null when there is none. For the active schema
// the name cache answers.
ldcf_type_pointer ldcf_type_named(const ldcf_schema& schema, const char* name);
ldcf_class_pointer ldcf_class_named(const ldcf_schema& schema, const char* name);

// The parts of the check.
int ldcf_check_alias(const Entry& entry, const ldcf_entry_reporter& reporter);
int ldcf_check_referral(const Entry& entry, const ldcf_entry_reporter& reporter);
int ldcf_check_by_declarations(const ldcf_schema& schema, const Entry& entry, ldcf_entry_sink& sink);
