// Values of encrypted attributes, and the value tree as an array: see attribute.h.
#include <cstddef>
#include <cstdlib>
#include <memory>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/password_values.h"
#include "servers/vrnd/libdirbase/model/attr_records.h"
#include "servers/vrnd/libdirbase/model/attr_value_tree.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/model/value_add.h"

namespace {

bool is_encrypted(const Attribute& attr)
{
    return attr.a_info != nullptr && attr.a_info->encryption != PWD_NONE;
}

struct free_values {
    void operator()(berval** values) const noexcept { free_secret_values(values); }
};

// A copy of a value, decoded where that can be done; null when memory ran out.
berval* decoded_copy(const berval& value)
{
    berval clear = {};
    if (value.bv_val == nullptr || (check_format(value.bv_val, value.bv_len) & PWD_TWO_WAY) == 0 ||
        unformat_password(value.bv_val, value.bv_len, g_DirKeyData, &clear.bv_val, &clear.bv_len) == 0) {
        return ber_bvdup(&value);
    }
    auto* copy = static_cast<berval*>(std::malloc(sizeof(berval)));
    if (copy == nullptr) {
        wipe_and_free(clear.bv_val, clear.bv_len);
    } else {
        *copy = clear;
    }
    return copy;
}

}  // namespace

void free_secret_values(berval** values)
{
    for (berval** value = values; value != nullptr && *value != nullptr; ++value) {
        wipe_and_free((*value)->bv_val, (*value)->bv_len);
        std::free(*value);
    }
    std::free(values);
}

extern "C" {

int attr_create_decodedvals(Attribute* attr)
{
    if (attr == nullptr) {
        debug_error("ERROR - attr_create_decodedvals: NULL input pointer!\n");
        return LDAP_OTHER;
    }
    if (!is_encrypted(*attr) || attr->a_vals == nullptr || attr->a_numvals == 0 || attr->a_decoded != nullptr) {
        return LDAP_SUCCESS;
    }
    const auto count = static_cast<std::size_t>(attr->a_numvals);
    std::unique_ptr<berval*, free_values> decoded(static_cast<berval**>(std::calloc(count + 1, sizeof(berval*))));
    for (std::size_t i = 0; i < count && decoded != nullptr; ++i) {
        decoded.get()[i] = decoded_copy(*attr->a_vals[i]);
        if (decoded.get()[i] == nullptr) {
            decoded.reset();
        }
    }
    if (decoded == nullptr) {
        debug_error("ERROR - attr_create_decodedvals: memory allocation error\n");
        return LDAP_OTHER;
    }
    attr->a_decoded = decoded.release();
    return LDAP_SUCCESS;
}

int attr_encode_attribute(Attribute* attr)
{
    if (attr == nullptr || attr->a_info == nullptr) {
        return LDAP_NO_SUCH_ATTRIBUTE;
    }
    return is_encrypted(*attr) ? value_encode_values(attr->a_info->encryption, attr->a_vals, 1, nullptr) : LDAP_SUCCESS;
}

int attr_decode_and_normalize_values(Attribute* attr)
{
    if (attr == nullptr || !is_encrypted(*attr)) {
        return LDAP_SUCCESS;
    }
    attr_free_normvals(attr);
    const int result = value_decode_values(attr->a_vals);
    if (result != LDAP_SUCCESS) {
        return result;
    }
    std::int64_t ignored = 0;
    return create_normalized_values(VALUES_TREE_ONLY | VALUES_ARE_CLEAR, &ignored, attr->a_numvals, 0, attr->a_vals,
                                    &attr->a_vals, attr, static_cast<std::uint32_t>(attr->a_syntax), 0);
}

berval** attr_get_normvals_array(const Attribute* attr)
{
    if (attr == nullptr || attr->a_tree == nullptr) {
        return nullptr;
    }
    const auto count = static_cast<std::size_t>(attr->a_numvals);
    auto* const array = static_cast<berval**>(std::calloc(count + 1, sizeof(berval*)));
    if (array == nullptr) {
        return nullptr;
    }
    struct filling {
        berval** next;
        berval** end;
    } state = {array, array + count};
    avl_apply(
        attr->a_tree,
        [](void* node, void* argument) {
            auto& to = *static_cast<filling*>(argument);
            if (to.next == to.end) {
                return 1;
            }
            *to.next++ = static_cast<AttrvalsNorm*>(node)->value;
            return 0;
        },
        &state, 1, AVL_INORDER);
    return array;
}

}  // extern "C"
