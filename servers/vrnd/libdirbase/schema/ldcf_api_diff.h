// How an object class differs between the active schema and the proposed one.
#pragma once

#include <stdint.h>

#include "libraries/dirbase_export.h"

#ifdef __cplusplus
#include "servers/vrnd/libdirbase/schema/ldcf_objclass.h"
#endif

enum attr_diff_state DIRBASE_ENUM_INT {
    attr_diff_none = 1,  // start value, never reported
    attr_diff_newly_must = 2,
    attr_diff_no_longer_must = 3,
    attr_diff_newly_may = 4,
    attr_diff_no_longer_may = 5,
    attr_diff_must_to_may = 6,
    attr_diff_may_to_must = 7,
};

// One attribute whose place in a class has changed.
typedef struct ldcf_diff_node ldcf_diff_node;
struct ldcf_diff_node {
    char* oid;  // owned
    enum attr_diff_state state;
    ldcf_diff_node* next;
};

// All of them.
typedef struct ldcf_diff_info ldcf_diff_info;
struct ldcf_diff_info {
    ldcf_diff_node* list;
    int32_t count;
};

DIRBASE_C_BEGIN

#ifdef __cplusplus

// What has changed in the MUST and MAY lists of a class that exists in both schemas; inherited attributes don't count.
// Returns a new record, for the caller to take apart with ldcf_api_list_diff_info_delete on its list and free(), or
// null when memory ran out, when the class is missing in one of the schemas or there has been no change yet. After a
// change that went through both schemas are one, and nothing differs. The list runs against the order of OIDs.
DIRBASE_EXPORT ldcf_diff_info* ldcf_api_get_diff_info(const ldcf_objclass& objclass);

// 0 when the class is of one kind (abstract, structural, auxiliary) in both schemas, 1 when not, -1 when one lacks it.
DIRBASE_EXPORT int ldcf_api_compare_type(const ldcf_objclass& objclass);

// 0 when the class has the same superiors, direct and inherited, in both schemas, 1 when not, -1 when one lacks it or
// memory ran out.
DIRBASE_EXPORT int ldcf_api_compare_SUP(const ldcf_objclass& objclass);

#endif

// A node with a copy of the text; null when memory ran out.
DIRBASE_EXPORT ldcf_diff_node* ldcf_api_list_diff_info_new(const char* oid, enum attr_diff_state state);

// Puts a node ahead of a list. Returns 0, or -1 for a null argument.
DIRBASE_EXPORT int ldcf_api_list_diff_info_insert(ldcf_diff_node** head, ldcf_diff_node* node);

// Frees a list and its texts.
DIRBASE_EXPORT void ldcf_api_list_diff_info_delete(ldcf_diff_node* head);

DIRBASE_C_END
