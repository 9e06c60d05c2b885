// Adding values to an entry by name: see attribute.h.
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <string_view>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/oid_prefix.h"
#include "servers/vrnd/libdirbase/model/attr_ids.h"
#include "servers/vrnd/libdirbase/model/attr_lookup.h"
#include "servers/vrnd/libdirbase/model/attr_names.h"
#include "servers/vrnd/libdirbase/model/attr_records.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/model/language_tag.h"
#include "servers/vrnd/libdirbase/model/value_add.h"

namespace {

// Whatever becomes of the values, the back end's count is no longer to be trusted.
void forget_count(Entry& entry, const asyntaxinfo* info)
{
    if (info != nullptr && info->attr_id == attr_id_member) {
        entry.e_member_count = -1;
    } else if (info != nullptr && info->attr_id == attr_id_uniquemember) {
        entry.e_uniquemember_count = -1;
    }
}

int tell_no_memory(const char* function)
{
    debug_error("Error - %s: malloc() failed. Out of memory\n", function);
    return LDAP_NO_MEMORY;
}

bool is_numeric_form(const char* name)
{
    return (*name >= '0' && *name <= '9') || has_oid_prefix(name);
}

// The schema's first name with a tag behind it.
heap_text first_name_with_tag(const asyntaxinfo& info, const char* tag)
{
    const std::size_t name_length = std::strlen(info.names[0]);
    const std::size_t tag_size = std::strlen(tag) + 1;
    heap_text text(static_cast<char*>(std::malloc(name_length + 1 + tag_size)));
    if (text != nullptr) {
        std::memcpy(text.get(), info.names[0], name_length);
        text.get()[name_length] = ';';
        std::memcpy(text.get() + name_length + 1, tag, tag_size);
    }
    return text;
}

// Finds or makes the record of a name whose tag has been looked at.
int insert_by_name(Entry& entry, const char* name, const char* tag, asyntaxinfo* info, Attribute** attr)
{
    heap_text made;
    if (info != nullptr && is_numeric_form(name)) {
        if (tag != nullptr) {
            made = first_name_with_tag(*info, tag);
            if (made == nullptr) {
                return tell_no_memory("attr_merge");
            }
        }
        name = tag != nullptr ? made.get() : info->names[0];
    }
    return flatattr_insert(&entry, info, name, attr, tag);
}

int refuse_tag(const char* line)
{
    debug_error("%s", line);
    return LDAP_INVALID_SYNTAX;
}

bool is_too_long(const char* tag)
{
    return tag != nullptr && std::strlen(tag) > longest_language_tag;
}

}  // namespace

int attr_merge_record(Entry& entry, const char* name, asyntaxinfo* info, Attribute** attr)
{
    forget_count(entry, info);
    const char* const tag = find_language_tag(name);
    if (is_too_long(tag)) {
        return refuse_tag("Error - attr_merge: parse_language_tags() failed.\n");
    }
    if (tag != nullptr && is_valid_language_tag(tag) == 0) {
        return refuse_tag("Error - attr_merge: invalid language tag.\n");
    }
    return insert_by_name(entry, name, tag, info, attr);
}

int attr_merge_values(Attribute& attr, berval** values, int drop_duplicates, int tree_mode)
{
    if (drop_duplicates == 0 && tree_mode == 0) {
        return value_add(&attr.a_vals, values, &attr);
    }
    return value_add_normalize(&attr.a_vals, values, static_cast<std::uint32_t>(attr.a_syntax), &attr, drop_duplicates,
                               tree_mode == 2 ? 1 : 0);
}

extern "C" {

int attr_merge(Entry* entry, const char* name, berval** values, int drop_duplicates, int tree_mode, asyntaxinfo* info)
{
    if (entry == nullptr || name == nullptr) {
        return LDAP_OTHER;
    }
    if (info == nullptr && look_up_attr(name, &info) != LDAP_SUCCESS) {
        return tell_no_memory("attr_merge");
    }
    Attribute* attr = nullptr;
    const int result = attr_merge_record(*entry, name, info, &attr);
    return result != LDAP_SUCCESS ? result : attr_merge_values(*attr, values, drop_duplicates, tree_mode);
}

int attr_merge_fast(Entry* entry, const char* name, berval** values, std::int64_t /*old_count*/, std::int64_t added,
                    std::int64_t* capacity, Attribute** attr, asyntaxinfo* info)
{
    if (entry == nullptr || name == nullptr || capacity == nullptr || attr == nullptr || added < 0 ||
        (values == nullptr && added != 0)) {
        return LDAP_OTHER;
    }
    if (*attr == nullptr) {
        if (info == nullptr && look_up_attr(name, &info) != LDAP_SUCCESS) {
            return tell_no_memory("attr_merge_fast");
        }
        const char* const tag = find_language_tag(name);
        if (is_too_long(tag)) {
            return refuse_tag("Error - attr_merge: parse_language_tags() failed.\n");
        }
        const int result = flatattr_insert(entry, info, name, attr, tag);
        if (result != LDAP_SUCCESS) {
            debug_error("Error - attr_merge_fast: flatattr_insert() failed.\n");
            return result;
        }
    }
    Attribute& record = **attr;
    forget_count(*entry, record.a_info);
    const int result = value_add_fast(&record.a_vals, values, record.a_numvals, added, &record.a_maxvals);
    *capacity = record.a_maxvals;
    if (result == LDAP_SUCCESS && added != 0) {
        record.a_numvals += added;
        attr_free_normvals(&record);
        attr_free_decodedvals(&record);
    }
    return result;
}

int do_attr_merge(Entry* entry, const char* name, const char* text, char** selected)
{
    if (name != nullptr && !attr_selected(name, selected)) {
        return LDAP_SUCCESS;
    }
    berval value = {text == nullptr ? 0 : std::strlen(text), const_cast<char*>(text)};
    berval* values[] = {&value, nullptr};
    return attr_merge(entry, name, values, 0, 0, nullptr);
}

}  // extern "C"
