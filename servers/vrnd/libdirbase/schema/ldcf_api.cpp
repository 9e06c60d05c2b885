// Life cycle, look-ups and access: see ldcf_api.h. Predicates and lists stand in ldcf_api_lists.cpp.
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"

#include <cstring>
#include <mutex>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/oid_prefix.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/language_tag.h"
#include "servers/vrnd/libdirbase/schema/ldcf_binary_name.h"
#include "servers/vrnd/libdirbase/schema/ldcf_hash_index.h"
#include "servers/vrnd/libdirbase/schema/ldcf_rdbm.h"

rdbm_lock_t ldcf_api_modify_attr_info_lock_g;
std::int32_t ldcf_api_schema_check_g = 2;
Entry* ldcf_api_schema_entry_g = nullptr;

namespace {

// Runs one step of the life cycle; whatever goes wrong in it ends here.
template <typename Step>
int guarded(const char* failure, Step&& step)
{
    try {
        step();
        return 0;
    } catch (...) {  // the exceptions of the tree have told the message log; the caller only needs to stop
        debug_error("%s", failure);
        return 1;
    }
}

const char* skip_oid_prefix(const char* name)
{
    return has_oid_prefix(name) ? name + oid_prefix_length : name;
}

// Looks a name up in a map; a handle is never made for it, so that readers don't meet in its counter.
template <typename T>
const T* find(const ldcf_map_name_to<T>& map, const char* name)
{
    const auto found = name == nullptr ? map.end() : map.find(name);
    return found == map.end() ? nullptr : &found->second;
}

// The record of the type whose name is the first `length` bytes of a text. Nothing is allocated for names of ordinary
// length, so that a lack of memory doesn't look like an unknown type.
asyntaxinfo* info_of_front(const char* name, std::size_t length)
{
    if (const ldcf_hash_tbl_entry* node = ldcf_find_node(name, length); node != nullptr) {
        return node->info;
    }
    char shorter[256];
    heap_text longer(length < sizeof shorter ? nullptr : static_cast<char*>(std::malloc(length + 1)));
    char* const front = length < sizeof shorter ? shorter : longer.get();
    if (front == nullptr) {
        return nullptr;
    }
    std::memcpy(front, name, length);
    front[length] = '\0';
    return ldcf_attrtype_get_info(ldcf_schema_g->attribute_types, front);
}

// The record of the type of a name with ";binary", if its syntax is that.
[[gnu::noinline]] asyntaxinfo* binary_info(const char* name, std::size_t length)
{
    asyntaxinfo* info = info_of_front(name, length - ldcf_binary_ending_length);
    return info != nullptr && info->syntax == SC_BIN ? info : nullptr;
}

// What the cache doesn't hold. Kept apart from the common look-up, which is a few steps without it.
[[gnu::noinline]] asyntaxinfo* uncached_info(const char* name, char** base_out)
{
    const char* const tag = find_language_tag(name);
    if (base_out != nullptr) {
        *base_out = nullptr;
    }
    if (tag != nullptr && std::strlen(tag) > longest_language_tag) {
        debug_error("ldcf_api_attr_get_info(): parse_language_tags() failed.\n");
        return nullptr;
    }
    if (tag == nullptr) {
        return ldcf_attrtype_get_info(ldcf_schema_g->attribute_types, name);
    }
    const auto base_length = static_cast<std::size_t>(tag - 1 - name);
    if (base_out != nullptr) {
        *base_out = strndup(name, base_length);
        if (*base_out == nullptr) {
            debug_error("ldcf_api_attr_get_info(): parse_language_tags() failed.\n");
            return nullptr;
        }
    }
    return info_of_front(name, base_length);
}

}  // namespace

// ---- life cycle ---------------------------------------------------------------------------------------------------

int ldcf_api_schema_init(void)
{
    static std::once_flag first_call;
    ldcf_api_schema_entry_g = nullptr;
    rdbm_lock_init(&ldcf_api_modify_attr_info_lock_g, "ldcf_modify_attr_info_lock");
    std::call_once(first_call, ldcf_hash_flush);
    return 0;
}

int ldcf_api_schema_parse(const char* file)
{
    return guarded("ldcf_api_schema_parse(): unknown exception thrown!\n", [file] {
        exc_t::be_quiet(false);
        ldcf_schema_g->parse(file);
    });
}

int ldcf_api_schema_complete(void)
{
    return guarded("ldcf_api_schema_complete(): exception thrown!\n", [] { ldcf_schema_g->complete(); });
}

int ldcf_api_schema_complete_db_names(void)
{
    return guarded("ldcf_api_schema_complete_db_names(): exception thrown!\n", [] {
        ldcf_schema_g->complete_db_names();
        ldcf_hash_flush();
        ldcf_api_load_attr_hash();
    });
}

// ---- the schemas and their lock -----------------------------------------------------------------------------------

ldcf_schema* ldcf_api_get_schema_g(void)
{
    return ldcf_schema_g;
}

ldcf_schema* ldcf_api_get_schema_proposed_g(void)
{
    return ldcf_schema_proposed_g;
}

rdbm_lock_t* ldcf_api_get_modify_attr_info_lock_g(void)
{
    return &ldcf_api_modify_attr_info_lock_g;
}

void ldcf_api_set_schema_check(std::int32_t mode)
{
    ldcf_api_schema_check_g = mode;
}

std::int32_t ldcf_api_get_schema_check(void)
{
    return ldcf_api_schema_check_g;
}

const csgl_set<ldcf_attrtype>& ldcf_api_get_must_set_from_objclass(const ldcf_objclass& objclass)
{
    return objclass->complete_must();
}

const csgl_set<ldcf_attrtype>& ldcf_api_get_may_set_from_objclass(const ldcf_objclass& objclass)
{
    return objclass->complete_may();
}

const ldcf_attrtype& ldcf_api_get_attrtype_from_schema_g(const char* name)
{
    return *find(ldcf_schema_g->attribute_types, name);
}

const ldcf_attrtype& ldcf_api_get_attrtype_from_proposed_schema_g(const char* name)
{
    return *find(ldcf_schema_proposed_g->attribute_types, name);
}

const ldcf_objclass& ldcf_api_get_objclass_from_schema_g(const char* name)
{
    return *find(ldcf_schema_g->object_classes, name);
}

const ldcf_objclass& ldcf_api_get_objclass_from_proposed_schema_g(const char* name)
{
    return *find(ldcf_schema_proposed_g->object_classes, name);
}

// ---- look-ups -----------------------------------------------------------------------------------------------------

asyntaxinfo* ldcf_attrtype_get_info(const ldcf_map_name_to<ldcf_attrtype>& map, const char* name)
{
    const ldcf_attrtype* found = find(map, name);
    return found == nullptr ? nullptr : found->info();
}

asyntaxinfo* ldcf_attrtype_get_info_based_on_table(const ldcf_map_name_to<ldcf_attrtype>& map, const char* table)
{
    for (const auto& entry : map) {
        if (table != nullptr && csgl_str_ci_compare(entry.second->table(), table) == 0) {
            return entry.second.info();
        }
    }
    return nullptr;
}

objectclassinfo* ldcf_objectclass_get_info(const ldcf_map_name_to<ldcf_objclass>& map, const char* name)
{
    const ldcf_objclass* found = find(map, name);
    return found == nullptr ? nullptr : found->info();
}

asyntaxinfo* ldcf_api_attr_get_info(const char* name, char** base_out)
{
    if (name == nullptr || *name == '\0') {
        return nullptr;
    }
    name = skip_oid_prefix(name);
    const std::size_t length = std::strlen(name);
    if (ldcf_ends_in_binary(name, length)) {
        return binary_info(name, length);
    }
    if (const ldcf_hash_tbl_entry* node = ldcf_find_node(name, length); node != nullptr) {
        return node->info;
    }
    return uncached_info(name, base_out);
}

const char* ldcf_api_attr_get_oid(const char* name)
{
    if (name == nullptr || *name == '\0') {
        debug_error("ldcf_api_attr_get_oid(): name is NULL!\n");
        return nullptr;
    }
    name = skip_oid_prefix(name);
    const auto& map = ldcf_schema_g->attribute_types;
    const std::size_t length = std::strlen(name);
    if (!ldcf_ends_in_binary(name, length)) {
        return ldcf_attrtype_get_oid(map, name);
    }
    const heap_text plain = ldcf_without_binary(name, length);
    return plain == nullptr ? nullptr : ldcf_attrtype_get_oid(map, plain.get());
}

asyntaxinfo* ldcf_api_attr_get_info_from_proposed_schema(const char* name)
{
    return ldcf_schema_proposed_g == nullptr ? nullptr
                                             : ldcf_attrtype_get_info(ldcf_schema_proposed_g->attribute_types, name);
}

asyntaxinfo* ldcf_api_attr_get_info_based_on_table(const char* table)
{
    return ldcf_attrtype_get_info_based_on_table(ldcf_schema_g->attribute_types, table);
}

objectclassinfo* ldcf_api_objectclass_get_info(const char* name)
{
    return ldcf_objectclass_get_info(ldcf_schema_g->object_classes, name);
}

int ldcf_api_attrtype_apply(ldcf_attrtype_function function, void* argument)
{
    int result = LDAP_SUCCESS;
    ldcf_for_each_definition(ldcf_schema_g->attribute_types, [&](const ldcf_attrtype& attribute) {
        if (result == LDAP_SUCCESS) {
            asyntaxinfo* info = attribute.info();
            result = info == nullptr || function(info, argument) != 0 ? LDAP_OTHER : LDAP_SUCCESS;
        }
    });
    return result;
}

void ldcf_api_delete_asyntaxinfo(asyntaxinfo* info)
{
    ldcf_rdbm::delete_asyntaxinfo(info);
}

void ldcf_api_delete_objectclassinfo(objectclassinfo* info)
{
    ldcf_rdbm::delete_objectclassinfo(info);
}

void ldcf_api_attrtype_reset_info(const char* name)
{
    if (const ldcf_attrtype* found = find(ldcf_schema_g->attribute_types, name); found != nullptr) {
        found->reset_info();
    }
}

char* get_qualified_table_name(asyntaxinfo* info)
{
    return info->table;
}

void free_qualified_table_name(char* /*name*/) {}

void ldcf_api_load_attr_hash(void)
{
    debug_trace("ldcf_api_load_attr_hash: begin\n");
    for (const auto& entry : ldcf_schema_g->attribute_types) {
        const ldcf_attrtype& attribute = entry.second;
        asyntaxinfo* info = ldcf_hash_get(attribute.name()) == nullptr ? attribute.info() : nullptr;
        if (info != nullptr) {
            for (char** name = info->names; *name != nullptr; ++name) {
                ldcf_hash_put(*name, info);
            }
        }
    }
    debug_trace("ldcf_api_load_attr_hash: done\n");
}
