// Single definitions: into a schema, out of it, and one in the place of another.
#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/schema/ldcf_schema.h"

namespace {

// "[p[kind]p] [p['key']p] <fault>"
csgl_string about(const char* kind, const csgl_string& key, const char* fault)
{
    return ldcf_join("[p[", kind, "]p] ", ldcf_quoted_parameter(key), fault);
}

[[noreturn]] void throw_already_exists(const char* kind, const csgl_string& key)
{
    throw exc_ldap_rc_t(__FILE__, __LINE__, about(kind, key, " already exists").c_str(), LDAP_TYPE_OR_VALUE_EXISTS,
                        LDCF_MSG_ALREADY_EXISTS);
}

[[noreturn]] void throw_does_not_exist(const char* kind, const csgl_string& key, int message_id)
{
    throw exc_ldap_rc_t(__FILE__, __LINE__, about(kind, key, " does not exist").c_str(), LDAP_NO_SUCH_ATTRIBUTE,
                        message_id);
}

[[noreturn]] void throw_two_bodies(const char* kind, const csgl_string& oid, const csgl_string& name, int message_id)
{
    LDCF_THROW_INPUT(("[p[", kind, "]p]: OID ", ldcf_quoted_parameter(oid), " and ", ldcf_quoted_parameter(name),
                      " do not refer to the same [p[", kind, "]p]"),
                     message_id);
}

template <typename T>
void refuse_existing(const ldcf_map_name_to<T>& map, const T& definition)
{
    if (map.count(definition.oid()) != 0) {
        throw_already_exists(ldcf_kind_of(definition), definition.oid());
    }
    for (const csgl_string& name : definition->names()) {
        if (map.count(name) != 0) {
            throw_already_exists(ldcf_kind_of(definition), name);
        }
    }
}

template <typename T>
void home(T& definition, const csgl_string& file)
{
    definition.v3_file(file);
    if (!definition.xan_string().empty()) {
        definition.xan_file(file);
    }
}

// The references to a stored definition that the schema's own structure explains, beside its keys and the one that the
// erasing operation holds: its entries among its relatives.
int relatives(const ldcf_syntax&)
{
    return 0;
}
int relatives(const ldcf_matchrule&)
{
    return 0;
}
int relatives(const ldcf_attrtype& attribute)
{
    return attribute->supertype() ? 1 : 0;
}
int relatives(const ldcf_objclass& objclass)
{
    return static_cast<int>(objclass->superclasses().size());
}

// An oid among the names of an attribute type or class takes one key for both.
template <typename T>
int shared_keys(const T& definition)
{
    return definition->names().count(definition.oid()) != 0 ? 1 : 0;
}
int shared_keys(const ldcf_matchrule&)
{
    return 0;
}

void leave_relatives(const ldcf_syntax&) {}
void leave_relatives(const ldcf_matchrule&) {}
void leave_relatives(const ldcf_attrtype& attribute)
{
    if (attribute->supertype()) {
        attribute->supertype()->forget_subtype(attribute);
    }
}
void leave_relatives(const ldcf_objclass& objclass)
{
    for (const ldcf_objclass& superclass : objclass->superclasses()) {
        superclass->forget_subclass(objclass);
    }
}

// Finds the stored definition that an erase means: the one under the given oid, to which all given names lead too.
template <typename T>
T find_for_erase(const ldcf_map_name_to<T>& map, const T& given)
{
    T found = ldcf_find(map, given.oid());
    if (!found) {
        throw_does_not_exist(ldcf_kind_of(given), given.oid(), LDCF_MSG_DELETE_NOT_THERE);
    }
    for (const csgl_string& name : given->names()) {
        const T named = ldcf_find(map, name);
        if (!named) {
            throw_does_not_exist(ldcf_kind_of(given), name, LDCF_MSG_DELETE_NOT_THERE);
        }
        if (!(named == found)) {
            throw_two_bodies(ldcf_kind_of(given), given.oid(), name, LDCF_MSG_DELETE_TWO_BODIES);
        }
    }
    return found;
}

// Takes a definition out of its map; gives it back for its files to be marked. Whatever else holds a handle on it still
// uses it.
template <typename T>
T erase_from(ldcf_map_name_to<T>& map, const T& given)
{
    T found = find_for_erase(map, given);
    const ldcf_names& names = found->names();
    const int expected = 2 + static_cast<int>(names.size()) + relatives(found) - shared_keys(found);
    const int count = found->value();
    if (count != expected) {
        const csgl_string text =
            ldcf_join(about(ldcf_kind_of(found), found.oid(), " can not be deleted; its refcount is [p["),
                      ldcf_number(count), "]p].  It should be [p[", ldcf_number(expected), "]p]");
        throw exc_invalid_state_t(__FILE__, __LINE__, text.c_str(), LDCF_MSG_IN_USE);
    }
    leave_relatives(found);
    for (const csgl_string& name : names) {
        map.erase(name);
    }
    map.erase(found.oid());
    return found;
}

// Marks the home files of a definition as modified.
template <typename T>
void mark_files(ldcf_schema::file_map& files, const T& definition)
{
    files[definition->v3_file()] = ldcf_schema::modified_indicator::modified;
    if (!definition->xan_file().empty()) {
        files[definition->xan_file()] = ldcf_schema::modified_indicator::modified;
    }
}
void mark_files(ldcf_schema::file_map& files, const ldcf_objclass& definition)
{
    files[definition->v3_file()] = ldcf_schema::modified_indicator::modified;
}

}  // namespace

void ldcf_schema::insert(ldcf_syntax& definition)
{
    refuse_existing(syntaxes, definition);
    home(definition, current_file);
    ldcf_enter(syntaxes, definition.oid(), definition->names(), definition);
    files[current_file] = modified_indicator::modified;
}

void ldcf_schema::insert(ldcf_matchrule& definition)
{
    refuse_existing(matching_rules, definition);
    home(definition, current_file);
    ldcf_enter(matching_rules, definition.oid(), definition->names(), definition);
    definition->complete(syntaxes);
    files[current_file] = modified_indicator::modified;
}

void ldcf_schema::insert(ldcf_attrtype& definition)
{
    refuse_existing(attribute_types, definition);
    home(definition, current_file);
    ldcf_enter(attribute_types, definition.oid(), definition->names(), definition);
    definition->complete(attribute_types, matching_rules, syntaxes);
    definition->complete_db_names();
    files[current_file] = modified_indicator::modified;
}

void ldcf_schema::insert(ldcf_objclass& definition)
{
    refuse_existing(object_classes, definition);
    definition.v3_file(current_file);
    ldcf_enter(object_classes, definition.oid(), definition->names(), definition);
    definition->complete(object_classes, attribute_types);
    files[current_file] = modified_indicator::modified;
}

void ldcf_schema::erase(ldcf_syntax& definition)
{
    mark_files(files, erase_from(syntaxes, definition));
}

void ldcf_schema::erase(ldcf_matchrule& definition)
{
    mark_files(files, erase_from(matching_rules, definition));
}

void ldcf_schema::erase(ldcf_attrtype& definition)
{
    mark_files(files, erase_from(attribute_types, definition));
}

void ldcf_schema::erase(ldcf_objclass& definition)
{
    mark_files(files, erase_from(object_classes, definition));
}

template <typename T, typename Map>
void ldcf_schema::replace_in(const char* kind, T& definition, Map& map)
{
    T found = ldcf_find(map, definition.oid());
    // The map knows names as well: a definition that only has the given oid as a name is another one.
    if (!found || csgl_str_ci_compare(found.oid(), definition.oid()) != 0) {
        throw_does_not_exist(kind, definition.oid(), LDCF_MSG_REPLACE_NOT_THERE);
    }
    for (const csgl_string& name : definition->names()) {
        const auto [entry, added] = map.try_emplace(name, found);
        if (!added && !(entry->second == found)) {
            throw_two_bodies(kind, definition.oid(), name, LDCF_MSG_REPLACE_TWO_BODIES);
        }
    }
    for (const csgl_string& name : found->names()) {
        if (definition->names().count(name) == 0 && csgl_str_ci_compare(name, found.oid()) != 0) {
            map.erase(name);
        }
    }
    incomplete();
    const csgl_string key = found.oid();
    found.replace(definition);
    // Walks know a definition by the key that is its oid to the letter, which may be in another case now.
    auto entry = map.extract(key);
    entry.key() = found.oid();
    map.insert(std::move(entry));
    complete();
    complete_db_names();
    mark_files(files, definition);
}

void ldcf_schema::replace(ldcf_syntax& definition)
{
    replace_in(ldcf_kind_of(definition), definition, syntaxes);
}

void ldcf_schema::replace(ldcf_matchrule& definition)
{
    replace_in(ldcf_kind_of(definition), definition, matching_rules);
}

void ldcf_schema::replace(ldcf_attrtype& definition)
{
    replace_in(ldcf_kind_of(definition), definition, attribute_types);
}

void ldcf_schema::replace(ldcf_objclass& definition)
{
    replace_in(ldcf_kind_of(definition), definition, object_classes);
}
