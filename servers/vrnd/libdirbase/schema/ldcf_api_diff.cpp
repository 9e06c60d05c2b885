// Differences of object classes: see ldcf_api_diff.h.
#include "servers/vrnd/libdirbase/schema/ldcf_api_diff.h"

#include <cstdlib>
#include <cstring>
#include <utility>

#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/schema/ldcf_schema.h"

namespace {

enum class place { must, may };

// OIDs in exact order, unlike the maps of the schema.
template <typename Value>
using oid_map = csgl_map<csgl_string, Value>;

struct class_pair {
    ldcf_objclass active;
    ldcf_objclass proposed;

    bool in_both() const { return active && proposed; }
};

class_pair find_both(const ldcf_objclass& objclass)
{
    if (ldcf_schema_proposed_g == nullptr) {
        return {};
    }
    return {ldcf_find(ldcf_schema_g->object_classes, objclass.oid()),
            ldcf_find(ldcf_schema_proposed_g->object_classes, objclass.oid())};
}

// What a class itself declares; MAY counts where a type stands in both lists.
oid_map<place> declared(const ldcf_objclass& objclass, const ldcf_schema& schema)
{
    oid_map<place> result;
    const auto enter = [&](const ldcf_names& names, place where) {
        for (const csgl_string& name : names) {
            if (const ldcf_attrtype found = ldcf_find(schema.attribute_types, name); found) {
                result[found.oid()] = where;
            }
        }
    };
    enter(objclass->must(), place::must);
    enter(objclass->may(), place::may);
    return result;
}

oid_map<attr_diff_state> differences(const oid_map<place>& before, const oid_map<place>& after)
{
    oid_map<attr_diff_state> result;
    for (const auto& [oid, was] : before) {
        const auto now = after.find(oid);
        if (now == after.end()) {
            result[oid] = was == place::must ? attr_diff_no_longer_must : attr_diff_no_longer_may;
        } else if (now->second != was) {
            result[oid] = was == place::must ? attr_diff_must_to_may : attr_diff_may_to_must;
        }
    }
    for (const auto& [oid, now] : after) {
        if (before.count(oid) == 0) {
            result[oid] = now == place::must ? attr_diff_newly_must : attr_diff_newly_may;
        }
    }
    return result;
}

struct delete_list {
    void operator()(ldcf_diff_node* head) const { ldcf_api_list_diff_info_delete(head); }
};

ldcf_diff_info* make_record(const oid_map<attr_diff_state>& states)
{
    heap_pointer<ldcf_diff_info> record(static_cast<ldcf_diff_info*>(std::calloc(1, sizeof(ldcf_diff_info))));
    if (record == nullptr) {
        debug_error("ldcf_api_diff new failed\n");
        return nullptr;
    }
    std::unique_ptr<ldcf_diff_node, delete_list> list;
    for (const auto& [oid, state] : states) {
        ldcf_diff_node* node = ldcf_api_list_diff_info_new(oid, state);
        if (node == nullptr) {
            debug_error("ldcf_api_list_diff_info_new failed\n");
            return nullptr;
        }
        ldcf_diff_node* head = list.release();
        ldcf_api_list_diff_info_insert(&head, node);
        list.reset(head);
    }
    record->count = static_cast<std::int32_t>(states.size());
    record->list = list.release();
    return record.release();
}

csgl_set<csgl_string> superior_oids(const ldcf_objclass& objclass)
{
    csgl_set<csgl_string> result;
    for (const ldcf_objclass& superior : objclass->superclasses()) {
        result.insert(superior.oid());
    }
    return result;
}

}  // namespace

ldcf_diff_info* ldcf_api_get_diff_info(const ldcf_objclass& objclass)
try {
    const class_pair both = find_both(objclass);
    if (!both.in_both()) {
        return nullptr;
    }
    return make_record(
        differences(declared(both.active, *ldcf_schema_g), declared(both.proposed, *ldcf_schema_proposed_g)));
} catch (const exc_not_enough_memory_t&) {
    return nullptr;
}

int ldcf_api_compare_type(const ldcf_objclass& objclass)
{
    const class_pair both = find_both(objclass);
    if (!both.in_both()) {
        return -1;
    }
    return both.active->kind() == both.proposed->kind() ? 0 : 1;
}

int ldcf_api_compare_SUP(const ldcf_objclass& objclass)
try {
    const class_pair both = find_both(objclass);
    if (!both.in_both()) {
        return -1;
    }
    return superior_oids(both.active) == superior_oids(both.proposed) ? 0 : 1;
} catch (const exc_not_enough_memory_t&) {
    return -1;
}

ldcf_diff_node* ldcf_api_list_diff_info_new(const char* oid, attr_diff_state state)
{
    heap_pointer<ldcf_diff_node> node(static_cast<ldcf_diff_node*>(std::calloc(1, sizeof(ldcf_diff_node))));
    if (node == nullptr || oid == nullptr) {
        return nullptr;
    }
    node->oid = strdup(oid);
    node->state = state;
    return node->oid == nullptr ? nullptr : node.release();
}

int ldcf_api_list_diff_info_insert(ldcf_diff_node** head, ldcf_diff_node* node)
{
    if (head == nullptr || node == nullptr) {
        return -1;
    }
    node->next = *head;
    *head = node;
    return 0;
}

void ldcf_api_list_diff_info_delete(ldcf_diff_node* head)
{
    while (head != nullptr) {
        ldcf_diff_node* node = std::exchange(head, head->next);
        std::free(node->oid);
        std::free(node);
    }
}
