// Values of one call on their way into the array and the value tree: see value_add.h.
//
// What has been taken in is noted until the end, so that a failure can undo it without needing memory.
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <utility>

#include "libraries/libber/ldap_result.h"
#include "libraries/libmsg/debug_log.h"
#include "libraries/libpwd/pwd_format.h"
#include "servers/vrnd/libdirbase/base/heap.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/attr_node.h"
#include "servers/vrnd/libdirbase/model/value_add.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"

namespace {

enum class inserted { taken, duplicate, no_memory };

inserted insert_node(avl_node** tree, AttrvalsNorm* node)
{
    if (avl_insert(tree, node, value_cmp_fast, avl_dup_error) == 0) {
        return inserted::taken;
    }
    return avl_find(*tree, node, value_cmp_fast) != nullptr ? inserted::duplicate : inserted::no_memory;
}

// Which nodes have gone into a tree: room for them is taken before the first does.
class node_notes {
public:
    // False when memory ran out.
    bool make_room(std::int64_t count)
    {
        if (count > few) {
            many_.reset(
                static_cast<AttrvalsNorm**>(std::malloc(static_cast<std::size_t>(count) * sizeof(AttrvalsNorm*))));
            notes_ = many_.get();
        }
        return notes_ != nullptr;
    }

    void add(AttrvalsNorm* node) { notes_[count_++] = node; }

    // Takes them out again.
    void undo(avl_node** tree)
    {
        while (count_ > 0) {
            free_AttrvalsNorm(static_cast<AttrvalsNorm*>(avl_delete(tree, notes_[--count_], value_cmp_fast)));
        }
    }

private:
    static constexpr std::int64_t few = 8;

    AttrvalsNorm* first_[few];
    heap_pointer<AttrvalsNorm*> many_;
    AttrvalsNorm** notes_ = first_;
    std::int64_t count_ = 0;
};

class value_batch {
public:
    value_batch(int mode, std::int64_t old_count, berval** array, Attribute& attr, std::uint32_t syntax,
                bool drop_duplicates)
        : mode_(mode),
          old_count_(old_count),
          array_(array),
          attr_(attr),
          syntax_(syntax),
          drop_duplicates_(drop_duplicates)
    {
        keep_tree_ = (mode & VALUES_ARE_CLEAR) != 0 || !is_encrypted();
        build_nodes_ = keep_tree_ || (drop_duplicates && !is_binary() && mode == 0);
    }

    // Takes the values in, all or none; out_count is then how many went into the array.
    int run(berval** values, std::int64_t count, std::int64_t* out_count)
    {
        const bool had_tree = attr_.a_tree != nullptr;
        int result = had_tree && !nodes_.make_room(count) ? no_memory() : LDAP_SUCCESS;
        note_nodes_ = had_tree;
        if (result == LDAP_SUCCESS && !had_tree && keep_tree_ && !is_binary() && !tree_only()) {
            result = cover_old_values();
        }
        normalize_ = count == 0 || !is_default_source(attr_, *values[0]);
        for (std::int64_t i = 0; i < count && result == LDAP_SUCCESS; ++i) {
            result = add(*values[i]);
        }
        if (result != LDAP_SUCCESS) {
            undo(had_tree);
        }
        if (result == LDAP_SUCCESS && !keep_tree_) {
            attr_free_normvals(&attr_);
        }
        *out_count = added_;
        return result;
    }

private:
    bool tree_only() const { return (mode_ & VALUES_TREE_ONLY) != 0; }
    bool is_binary() const { return (syntax_ & SC_BIN) != 0; }
    bool is_encrypted() const { return attr_.a_info != nullptr && attr_.a_info->encryption != PWD_NONE; }

    // Whether a value is in the stored form of an encrypted attribute; nothing but its bytes counts then.
    bool is_encoded(const berval& value) const
    {
        return !is_binary() && is_encrypted() && value.bv_val != nullptr &&
               check_format(value.bv_val, value.bv_len) != PWD_NONE;
    }

    static int no_memory()
    {
        debug_error("Error - create_normalized_values: malloc() failed. Out of memory\n");
        return LDAP_NO_MEMORY;
    }

    int make_node(const berval& value, node_guard& node) const
    {
        AttrvalsNorm* made = nullptr;
        const int result = create_normalized_berval_in_attrvalsNorm(&made, &value, syntax_, normalize_ ? 1 : 0);
        node.reset(made);
        if (result != LDAP_SUCCESS) {
            debug_error("Error - create_normalized_values: create_normalized_berval_in_attrvalsNorm() failed rc=%d\n",
                        result);
        }
        return result;
    }

    inserted insert(node_guard& node)
    {
        const inserted result = insert_node(&attr_.a_tree, node.get());
        if (result == inserted::taken) {
            if (note_nodes_) {
                nodes_.add(node.get());
            }
            static_cast<void>(node.release());
        }
        return result;
    }

    // A node that is no use otherwise.
    int insert_if_new(node_guard node)
    {
        return node != nullptr && insert(node) == inserted::no_memory ? no_memory() : LDAP_SUCCESS;
    }

    int append(const berval& value)
    {
        berval* copy = ber_bvdup(&value);
        if (copy == nullptr) {
            return no_memory();
        }
        array_[old_count_ + added_++] = copy;
        return LDAP_SUCCESS;
    }

    bool is_in_array(const berval& value) const
    {
        for (std::int64_t i = 0; i < old_count_ + added_; ++i) {
            const berval& other = *array_[i];
            if (other.bv_len == value.bv_len &&
                (value.bv_len == 0 || std::memcmp(other.bv_val, value.bv_val, value.bv_len) == 0)) {
                return true;
            }
        }
        return false;
    }

    int add(const berval& value)
    {
        const bool encoded = is_encoded(value);
        bool store_normal = false;
        if (!is_binary() && is_encrypted() && !encoded && (attr_.a_info->encryption & PWD_TWO_WAY) == 0) {
            build_nodes_ = true;
            store_normal = (syntax_ & (SC_CIS | SC_CES)) != 0;
        }
        node_guard node;
        if (build_nodes_ && !encoded) {
            const int result = make_node(value, node);
            if (result != LDAP_SUCCESS) {
                return result;
            }
        }
        if (tree_only()) {
            return insert_if_new(std::move(node));
        }
        const bool binary = encoded || is_binary();
        const berval& stored = store_normal ? *node->value : value;
        if (!drop_duplicates_ || binary) {
            if (drop_duplicates_ && is_in_array(value)) {
                return LDAP_SUCCESS;
            }
            const int result = append(stored);
            return result != LDAP_SUCCESS ? result : insert_if_new(std::move(node));
        }
        if (node == nullptr) {
            debug_error("ERROR - create_normalized_values: attrvalsNorm needed but not allocated!\n");
            return LDAP_OTHER;
        }
        switch (insert(node)) {
        case inserted::taken: return append(stored);
        case inserted::duplicate: return LDAP_SUCCESS;
        default: return no_memory();
        }
    }

    // Puts the values that were added without a tree into the new one, so that it isn't taken for complete while it
    // lacks them.
    int cover_old_values()
    {
        normalize_ = old_count_ == 0 || !is_default_source(attr_, *array_[0]);
        for (std::int64_t i = 0; i < old_count_; ++i) {
            node_guard node;
            int result = is_encoded(*array_[i]) ? LDAP_SUCCESS : make_node(*array_[i], node);
            if (result == LDAP_SUCCESS) {
                result = insert_if_new(std::move(node));
            }
            if (result == LDAP_NO_MEMORY) {
                return result;
            }
        }
        return LDAP_SUCCESS;
    }

    void undo(bool had_tree)
    {
        while (added_ > 0) {
            ber_bvfree(array_[old_count_ + --added_]);
        }
        if (!tree_only()) {
            array_[old_count_] = nullptr;
        }
        if (had_tree) {
            nodes_.undo(&attr_.a_tree);
        } else {
            attr_free_normvals(&attr_);
        }
    }

    int mode_;
    std::int64_t old_count_;
    berval** array_;
    Attribute& attr_;
    std::uint32_t syntax_;
    bool drop_duplicates_;
    bool keep_tree_ = false;
    bool build_nodes_ = false;
    bool normalize_ = true;
    bool note_nodes_ = false;  // a new tree is dropped as a whole
    node_notes nodes_;
    std::int64_t added_ = 0;  // to the array
};

}  // namespace

extern "C" int create_normalized_values(int mode, std::int64_t* out_count, std::int64_t new_count,
                                        std::int64_t old_count, berval** values, berval*** array, Attribute* attr,
                                        std::uint32_t syntax, int drop_duplicates)
{
    *out_count = 0;
    if (attr == nullptr) {
        debug_error("Error - create_normalized_values: create_normalized_values() NULL attr\n");
        return LDAP_OPERATIONS_ERROR;
    }
    if (attr->a_info == nullptr) {
        attr->a_info = ldcf_api_attr_get_info(attr->a_type, nullptr);
    }
    value_batch batch(mode, old_count, array == nullptr ? nullptr : *array, *attr, syntax, drop_duplicates != 0);
    return batch.run(values, new_count, out_count);
}
