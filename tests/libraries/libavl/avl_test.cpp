// The tree beside std::set, and beside a slow and obvious balanced tree that measures heights instead of keeping
// balances.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstddef>
#include <cstdlib>
#include <iterator>
#include <memory>
#include <random>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "libraries/libavl/avl.h"
#include "libraries/libmsg/message_log.h"
#include "tests/support/message_catcher.h"

using test_support::message_catcher;

namespace {

struct object {
    int key;
    bool stored = false;  // lies in a tree: never the first argument of a comparison that the tree makes
};

int compare(const void* wanted, const void* stored, int argument)
{
    EXPECT_FALSE(static_cast<const object*>(wanted)->stored);
    EXPECT_EQ(argument, 0);
    const int a = static_cast<const object*>(wanted)->key;
    const int b = static_cast<const object*>(stored)->key;
    return a < b ? -7 : a > b ? 7 : 0;
}

int key_of(const void* data)
{
    return static_cast<const object*>(data)->key;
}

// ---- the slow tree
// ----------------------------------------------------------------------------------------------------

struct slow_node {
    int key;
    std::unique_ptr<slow_node> left, right;
};
using slow_tree = std::unique_ptr<slow_node>;

int height(const slow_tree& tree)
{
    return tree ? 1 + std::max(height(tree->left), height(tree->right)) : 0;
}

int lean(const slow_tree& tree)
{
    return height(tree->right) - height(tree->left);
}

void rotate_right(slow_tree& tree)
{
    slow_tree up = std::move(tree->left);
    tree->left = std::move(up->right);
    up->right = std::move(tree);
    tree = std::move(up);
}

void rotate_left(slow_tree& tree)
{
    slow_tree up = std::move(tree->right);
    tree->right = std::move(up->left);
    up->left = std::move(tree);
    tree = std::move(up);
}

void level(slow_tree& tree)
{
    if (lean(tree) < -1) {
        if (lean(tree->left) > 0)
            rotate_left(tree->left);
        rotate_right(tree);
    } else if (lean(tree) > 1) {
        if (lean(tree->right) < 0)
            rotate_right(tree->right);
        rotate_left(tree);
    }
}

void slow_insert(slow_tree& tree, int key)
{
    if (!tree) {
        tree = std::make_unique<slow_node>(slow_node{key, nullptr, nullptr});
    } else if (key != tree->key) {
        slow_insert(key < tree->key ? tree->left : tree->right, key);
        level(tree);
    }
}

void slow_delete(slow_tree& tree, int key)
{
    if (!tree)
        return;
    if (key != tree->key) {
        slow_delete(key < tree->key ? tree->left : tree->right, key);
    } else if (tree->left && tree->right) {
        const slow_node* next = tree->right.get();
        while (next->left)
            next = next->left.get();
        const int successor = next->key;
        slow_delete(tree->right, successor);
        tree->key = successor;
    } else {
        slow_tree only = std::move(tree->left ? tree->left : tree->right);
        tree = std::move(only);
    }
    if (tree)
        level(tree);
}

// One text of a whole tree: "(left key:balance right)".
std::string shape(const slow_tree& tree)
{
    if (!tree)
        return ".";
    return "(" + shape(tree->left) + std::to_string(tree->key) + ":" + std::to_string(lean(tree)) + shape(tree->right) +
           ")";
}

std::string shape(const avl_node* tree)
{
    if (tree == nullptr)
        return ".";
    return "(" + shape(tree->left) + std::to_string(key_of(tree->data)) + ":" + std::to_string(tree->balance) +
           shape(tree->right) + ")";
}

// ---- the fixture
// ------------------------------------------------------------------------------------------------------

int keep_data(void* data, void* arg)
{
    static_cast<std::vector<void*>*>(arg)->push_back(data);
    return 0;
}

class AvlTree : public testing::Test {
protected:
    ~AvlTree() override { avl_free(root, nullptr); }

    // The keys are stored as objects of the fixture, in their order.
    void fill(const std::vector<int>& keys)
    {
        pool.reserve(keys.size());
        for (const int key : keys) {
            pool.push_back(object{key});
            ASSERT_EQ(avl_insert(&root, &pool.back(), compare, avl_dup_error), 0);
            pool.back().stored = true;
        }
    }

    void* find(int key)
    {
        const object wanted{key};
        return avl_find(root, &wanted, compare);
    }

    std::vector<int> applied(int order, int stop_after = 0, int* result = nullptr)
    {
        struct visit {
            std::vector<int> keys;
            std::size_t limit;
        } seen{{}, static_cast<std::size_t>(stop_after)};
        const auto fn = [](void* data, void* arg) {
            auto* v = static_cast<visit*>(arg);
            v->keys.push_back(key_of(data));
            return v->keys.size() == v->limit ? 42 : static_cast<int>(v->keys.size()) - 100;
        };
        const int rc = avl_apply(root, fn, &seen, 42, order);
        if (result != nullptr)
            *result = rc;
        return seen.keys;
    }

    std::vector<object> pool;
    avl_node* root = nullptr;
};

// ---- insert, find, delete
// ---------------------------------------------------------------------------------------------

TEST_F(AvlTree, RandomInsertsAndDeletesKeepShapeBalancesAndObjects)
{
    std::mt19937 random(7);
    for (const int keys : {4, 12, 40, 150}) {
        std::vector<object> objects;  // two of each key, so that an equal object is often another one
        for (int i = 0; i < 2 * keys; ++i)
            objects.push_back(object{i / 2});
        const auto less = [](const object* a, const object* b) { return a->key < b->key; };
        std::set<object*, decltype(less)> model(less);
        slow_tree slow;

        for (int step = 0; step < 1500; ++step) {
            object* any = &objects[std::uniform_int_distribution<std::size_t>(0, objects.size() - 1)(random)];
            object wanted{any->key};
            // Tides, so that trees grow full, shrink to nothing, and much is absent or there already.
            const bool grow = random() % 10 < (step / 250 % 2 == 0 ? 8u : 2u);
            if (grow && !any->stored) {
                const bool is_new = model.insert(any).second;
                ASSERT_EQ(avl_insert(&root, any, compare, avl_dup_error), is_new ? 0 : -1);
                any->stored = is_new;
                slow_insert(slow, any->key);
            } else if (!grow) {
                const auto found = model.find(any);
                object* expected = found == model.end() ? nullptr : *found;
                ASSERT_EQ(avl_find(root, &wanted, compare), expected);
                ASSERT_EQ(avl_delete(&root, &wanted, compare), expected);
                if (expected != nullptr) {
                    expected->stored = false;
                    model.erase(found);
                }
                slow_delete(slow, wanted.key);
            }
            ASSERT_EQ(shape(root), shape(slow)) << "after step " << step;
            std::vector<void*> in_order;
            EXPECT_EQ(avl_apply(root, keep_data, &in_order, 1, AVL_INORDER), -6);
            ASSERT_TRUE(std::equal(in_order.begin(), in_order.end(), model.begin(), model.end()));
        }
        EXPECT_EQ(avl_free(std::exchange(root, nullptr), nullptr), static_cast<int>(model.size()));
    }
}

TEST_F(AvlTree, ALargeTreeIsNoHigherThanItsBalancesAllow)
{
    std::vector<int> keys(50'000);
    for (std::size_t i = 0; i < keys.size(); ++i)
        keys[i] = static_cast<int>(i);  // rising keys: the worst for a tree without balance
    fill(keys);
    const auto depth = [](const auto& self, const avl_node* node) -> int {
        return node == nullptr ? 0 : 1 + std::max(self(self, node->left), self(self, node->right));
    };
    EXPECT_EQ(depth(depth, root), 16);
    for (const int key : keys)
        ASSERT_EQ(find(key), &pool[static_cast<std::size_t>(key)]);
    EXPECT_EQ(find(-1), nullptr);
}

TEST_F(AvlTree, AnEqualObjectIsTheDuplicateRulesToJudge)
{
    fill({4, 2, 6, 1});
    const std::string before = shape(root);
    object again{2};
    EXPECT_EQ(avl_insert(&root, &again, compare, avl_dup_error), -1);
    EXPECT_EQ(avl_insert(&root, &again, compare, avl_dup_ok), 0);

    static std::pair<void*, void*> asked;
    const auto ask = [](void* stored, void* added) {
        asked = {stored, added};
        return 17;
    };
    EXPECT_EQ(avl_insert(&root, &again, compare, ask), 17);
    EXPECT_EQ(asked, (std::pair<void*, void*>(&pool[1], &again)));
    EXPECT_EQ(find(2), &pool[1]);
    EXPECT_EQ(shape(root), before);
}

// A tree whose balances lie: the side that is said to be high has no child.
TEST(AvlDamagedTree, AMissingChildIsReportedAndNothingMoves)
{
    enum { insert, remove };
    const struct {
        const char* what;
        int action;
        signed char balance;  // of the root, 50
        int key;              // inserted, or deleted, on the other side of what the balance says when it is deleted
        const char* text;
    } cases[] = {
        {"insert left", insert, -1, 10, "avl RL error"},  // the new leaf has no right child to come up first
        {"insert right", insert, 1, 90, "avl RR error"},
        {"delete left", remove, 1, 10, "avl RL error"},
        {"delete right", remove, -1, 90, "avl RR error"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.what);
        const message_catcher messages;
        object middle{50};
        object side{c.key};
        avl_node* root = nullptr;
        ASSERT_EQ(avl_insert(&root, &middle, compare, avl_dup_error), 0);
        if (c.action == insert) {
            root->balance = c.balance;
            EXPECT_EQ(avl_insert(&root, &side, compare, avl_dup_error), -1);
        } else {
            ASSERT_EQ(avl_insert(&root, &side, compare, avl_dup_error), 0);
            root->balance = c.balance;
            EXPECT_EQ(avl_delete(&root, &side, compare), &side);
        }
        EXPECT_EQ(shape(root), "(.50:" + std::to_string(c.balance) + ".)");
        ASSERT_EQ(messages.count(), 1u);
        const auto message = messages.messages()[0];
        EXPECT_EQ(message.component, 0);
        EXPECT_EQ(message.severity, 1);
        EXPECT_EQ(message.id, 106);
        EXPECT_EQ(message.arguments, std::vector<std::string>{c.text});
        avl_free(root, nullptr);
    }
}

// ---- scans and traversals
// ---------------------------------------------------------------------------------------------

TEST_F(AvlTree, TheScanMeetsNodesBeforeTheirSubtreesAndLeftBeforeRight)
{
    fill({4, 2, 6, 1, 3, 5, 7});
    const auto ends_with = [](const void* wanted, const void* stored, int) {
        return key_of(stored) % key_of(wanted) == 0 ? 0 : 1;  // no order at all
    };
    const std::pair<int, int> cases[] = {{1, 4}, {2, 4}, {3, 3}, {5, 5}, {6, 6}, {7, 7}};
    for (const auto& [divisor, first] : cases) {
        const object wanted{divisor};
        void* found = avl_find_lin(root, &wanted, ends_with);
        ASSERT_NE(found, nullptr) << divisor;
        EXPECT_EQ(key_of(found), first) << divisor;
    }
    const object eleven{11};
    EXPECT_EQ(avl_find_lin(root, &eleven, ends_with), nullptr);
    EXPECT_EQ(avl_find_lin(nullptr, &eleven, ends_with), nullptr);
}

TEST_F(AvlTree, EachOrderVisitsAllAndStopsWhereTold)
{
    fill({4, 2, 6, 1, 3, 5, 7});
    const std::pair<int, std::vector<int>> orders[] = {
        {1, {4, 2, 1, 3, 6, 5, 7}},
        {2, {1, 2, 3, 4, 5, 6, 7}},
        {3, {1, 3, 2, 5, 7, 6, 4}},
    };
    for (const auto& [type, keys] : orders) {
        int result = 0;
        EXPECT_EQ(applied(type, 0, &result), keys);
        EXPECT_EQ(result, -6);
        for (int stop = 1; stop <= 7; ++stop) {
            EXPECT_EQ(applied(type, stop, &result), std::vector<int>(keys.begin(), keys.begin() + stop));
            EXPECT_EQ(result, 42);
        }
    }
}

TEST_F(AvlTree, AnEmptyTreeIsAtItsEndAndAnUnknownOrderIsRefused)
{
    for (const int type : {1, 2, 3})
        EXPECT_EQ(avl_apply(
                      nullptr, [](void*, void*) { return std::abort(), 0; }, nullptr, 0, type),
                  -6);

    fill({1, 2, 3});
    for (const int type : {0, 4, -1}) {
        int result = 0;
        testing::internal::CaptureStderr();
        EXPECT_TRUE(applied(type, 0, &result).empty());
        EXPECT_EQ(testing::internal::GetCapturedStderr(), "Invalid traversal type " + std::to_string(type) + "\n");
        EXPECT_EQ(result, -1);
    }
}

// Objects are their keys' decimal texts here, in the order of texts; a prefix matches what begins with it.
TEST(AvlPrefixApply, VisitsTheMatchesNodesFirstAndFewOthers)
{
    static std::size_t comparisons;
    static const auto compare_text = [](const void* wanted, const void* stored, int) {
        return static_cast<const std::string*>(wanted)->compare(*static_cast<const std::string*>(stored));
    };
    static const auto compare_prefix = [](const void* prefix, const void* stored, int length) {
        ++comparisons;
        const auto size = static_cast<std::size_t>(length);
        return static_cast<const std::string*>(prefix)->compare(0, size, *static_cast<const std::string*>(stored), 0,
                                                                size);
    };
    std::vector<std::string> texts;
    for (int i = 0; i < 1000; ++i)
        texts.push_back(std::to_string(i));
    avl_node* root = nullptr;
    for (std::string& text : texts)
        ASSERT_EQ(avl_insert(&root, &text, compare_text, avl_dup_error), 0);
    std::vector<void*> preorder;
    avl_apply(root, keep_data, &preorder, 1, AVL_PREORDER);

    for (std::string prefix : {"0", "1", "19", "27", "5", "730", "99", "x", ""}) {
        std::vector<void*> expected;
        std::copy_if(preorder.begin(), preorder.end(), std::back_inserter(expected),
                     [&](void* data) { return static_cast<std::string*>(data)->starts_with(prefix); });
        const int length = static_cast<int>(prefix.size());

        std::vector<void*> visited;
        comparisons = 0;
        EXPECT_EQ(avl_prefixapply(root, &prefix, keep_data, &visited, compare_prefix, length, 1), -6);
        EXPECT_EQ(visited, expected) << prefix;
        EXPECT_LE(comparisons, expected.size() + 30) << "the range's borders and the way to it";

        // A stop at the third match, wherever that lies.
        std::vector<void*> some;
        const auto third = [](void* data, void* arg) {
            keep_data(data, arg);
            return static_cast<std::vector<void*>*>(arg)->size() == 3 ? 1 : 0;
        };
        const int rc = avl_prefixapply(root, &prefix, third, &some, compare_prefix, length, 1);
        EXPECT_EQ(rc, expected.size() >= 3 ? 1 : -6) << prefix;
        expected.resize(std::min<std::size_t>(expected.size(), 3));
        EXPECT_EQ(some, expected) << prefix;
    }
    avl_free(root, nullptr);
}

TEST_F(AvlTree, FreeingHandsOverEachObjectChildrenFirst)
{
    static std::vector<int> freed;
    freed.clear();
    fill({4, 2, 6, 1, 3, 5, 7});
    EXPECT_EQ(avl_free(std::exchange(root, nullptr), [](void* data) { freed.push_back(key_of(data)); }), 7);
    EXPECT_EQ(freed, (std::vector<int>{1, 3, 2, 5, 7, 6, 4}));
    EXPECT_EQ(avl_free(nullptr, [](void*) { std::abort(); }), 0);
}

// ---- the walk without callback
// ----------------------------------------------------------------------------------------

TEST_F(AvlTree, AWalkHandsOutEveryObjectInOrderAndThenNull)
{
    for (const int count : {1, 99, 100, 101, 250}) {
        std::vector<int> keys;
        for (int i = 0; i < count; ++i)
            keys.push_back(i * 37 % count);  // 37 has no factor in common with any of the counts
        pool.clear();
        fill(keys);
        int expected = 0;
        for (void* data = avl_getfirst(root); data != nullptr; data = avl_getnext())
            ASSERT_EQ(key_of(data), expected++);
        EXPECT_EQ(expected, count);
        EXPECT_EQ(avl_getnext(), nullptr);
        avl_free(std::exchange(root, nullptr), nullptr);
    }
}

TEST_F(AvlTree, ANewWalkReplacesTheOldOneAndOutlivesTheTree)
{
    fill({2, 1, 3});
    EXPECT_EQ(avl_getfirst(root), &pool[1]);
    EXPECT_EQ(avl_getnext(), &pool[0]);
    EXPECT_EQ(avl_getfirst(root), &pool[1]);
    avl_free(std::exchange(root, nullptr), nullptr);
    EXPECT_EQ(avl_getnext(), &pool[0]);
    EXPECT_EQ(avl_getfirst(nullptr), nullptr);
    EXPECT_EQ(avl_getnext(), nullptr) << "an empty tree leaves nothing of the walk before";
}

}  // namespace
