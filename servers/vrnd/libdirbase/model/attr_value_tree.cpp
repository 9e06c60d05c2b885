// Nodes of value trees, and looking values up: see attr_value_tree.h.
#include "servers/vrnd/libdirbase/model/attr_value_tree.h"

#include <climits>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <string_view>

#include <strings.h>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/attr_ids.h"
#include "servers/vrnd/libdirbase/model/attr_node.h"
#include "servers/vrnd/libdirbase/model/short_value_text.h"
#include "servers/vrnd/libdirbase/model/syntax_value.h"
#include "servers/vrnd/libdirbase/model/value_normalize.h"

namespace {

// Null when memory ran out.
node_guard new_node(std::uint32_t syntax, std::size_t length)
{
    auto* node = static_cast<AttrvalsNorm*>(std::malloc(sizeof(AttrvalsNorm) + length + 1));
    if (node == nullptr) {
        debug_error("Error - create_normalized_berval_in_attrvalsNorm: malloc() failed. Out of memory\n");
        return nullptr;
    }
    char* const bytes = reinterpret_cast<char*>(node + 1);
    bytes[length] = '\0';
    *node = {syntax, 0, &node->stored, {length, bytes}};
    return node_guard(node);
}

int fill_text(AttrvalsNorm& node, const berval& value, bool normalize)
{
    berval& stored = node.stored;
    if (stored.bv_len != 0) {
        std::memcpy(stored.bv_val, value.bv_val, stored.bv_len);
    }
    if (!normalize) {
        return LDAP_SUCCESS;
    }
    const int result = value_normalize_berval(&stored, node.syntax, 1);
    node.owns_buffer = stored.bv_val == reinterpret_cast<char*>(&node + 1) ? 0 : 1;
    return result;
}

int fill_typed(AttrvalsNorm& node, const berval& value)
{
    int result = LDAP_SUCCESS;
    const heap_pointer<void> typed(str2syntaxvalue(short_value_text(value).c_str(), node.syntax, &result));
    if (typed == nullptr) {
        return result;
    }
    std::memcpy(node.stored.bv_val, typed.get(), node.stored.bv_len);
    return LDAP_SUCCESS;
}

// The bytes that the content of a node takes.
int content_length(const berval& value, std::uint32_t syntax, std::size_t* length)
{
    const bool text = (syntax & (SC_CIS | SC_CES)) != 0;
    const unsigned long bytes = value.bv_val == nullptr ? 0 : value.bv_len;
    if (text && bytes >= INT_MAX) {
        return LDAP_NO_MEMORY;
    }
    int found = 0;
    const int result = find_value_length(syntax, text ? static_cast<int>(bytes) : 0, &found);
    *length = static_cast<std::size_t>(found);
    return result;
}

// Looks a value that is none of a binary syntax up in the tree. Returns the failure to make a node.
template <typename Action>
int with_node(const char* function, const Attribute& attr, const berval& value, std::uint32_t syntax, bool normalize,
              Action&& action)
{
    AttrvalsNorm* made = nullptr;
    const bool as_it_is = is_default_source(attr, value);
    const int result = create_normalized_berval_in_attrvalsNorm(&made, &value, syntax, normalize && !as_it_is ? 1 : 0);
    const node_guard node(made);
    if (result != LDAP_SUCCESS) {
        debug_error("Error - %s: create_normalized_berval_in_attrvalsNorm() failed rc=%d\n", function, result);
    } else {
        action(*node);
    }
    return result;
}

}  // namespace

bool is_default_source(const Attribute& attr, const berval& value)
{
    return attr.a_info != nullptr &&
           (attr.a_info->attr_id == attr_id_ownersource || attr.a_info->attr_id == attr_id_aclsource) &&
           value.bv_val != nullptr && std::string_view(value.bv_val, value.bv_len) == "default";
}

extern "C" {

int create_normalized_berval_in_attrvalsNorm(AttrvalsNorm** node, const berval* value, std::uint32_t syntax,
                                             int normalize)
{
    *node = nullptr;
    std::size_t length = 0;
    int result = content_length(*value, syntax, &length);
    if (result != LDAP_SUCCESS) {
        debug_error("Error - create_normalized_berval_in_attrvalsNorm: find_value_length() failed rc=%d\n", result);
        return result;
    }
    node_guard made = new_node(syntax, length);
    if (made == nullptr) {
        return LDAP_NO_MEMORY;
    }
    if ((syntax & (SC_CIS | SC_CES)) != 0) {
        result = fill_text(*made, *value, (syntax & SC_CIS) != 0 && normalize != 0);
    } else if ((syntax & SC_BIN) != 0) {
        made->stored.bv_len = value->bv_val == nullptr ? 0 : value->bv_len;
        made->stored.bv_val[0] = '\0';
    } else {
        result = fill_typed(*made, *value);
    }
    if (result == LDAP_SUCCESS) {
        *node = made.release();
    }
    return result;
}

void free_AttrvalsNorm(AttrvalsNorm* node)
{
    if (node != nullptr && node->owns_buffer != 0) {
        std::free(node->stored.bv_val);
    }
    std::free(node);
}

int value_find(const Attribute* attr, const berval* value, std::uint32_t syntax, int normalize)
{
    if (attr == nullptr || value == nullptr) {
        return -1;
    }
    if ((syntax & SC_BIN) != 0) {
        for (berval** stored = attr->a_vals; stored != nullptr && *stored != nullptr; ++stored) {
            if (value_cmp(value, *stored, syntax, 0) == 0) {
                return 0;
            }
        }
        return 1;
    }
    if (attr->a_tree == nullptr) {
        return -1;
    }
    bool found = false;
    const int result = with_node("value_find", *attr, *value, syntax, normalize != 0, [&](const AttrvalsNorm& node) {
        found = avl_find(attr->a_tree, &node, value_cmp_fast) != nullptr;
    });
    return result != LDAP_SUCCESS ? -1 : (found ? 0 : 1);
}

int value_find_short_list(const Attribute* attr, const char* text, std::int64_t length)
{
    const auto wanted = static_cast<unsigned long>(length);
    for (berval** value = attr == nullptr ? nullptr : attr->a_vals; value != nullptr && *value != nullptr; ++value) {
        if ((*value)->bv_len == wanted && (wanted == 0 || strncasecmp((*value)->bv_val, text, wanted) == 0)) {
            return 0;
        }
    }
    return 1;
}

int delete_valuetree_value(Attribute* attr, const berval* value, std::uint32_t syntax)
{
    if (attr == nullptr || value == nullptr || attr->a_tree == nullptr) {
        return LDAP_SUCCESS;
    }
    return with_node("delete_valuetree_value", *attr, *value, syntax, true, [&](const AttrvalsNorm& node) {
        free_AttrvalsNorm(static_cast<AttrvalsNorm*>(avl_delete(&attr->a_tree, &node, value_cmp_fast)));
    });
}

}  // extern "C"
