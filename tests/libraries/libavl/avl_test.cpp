// The tree beside std::set, with heights measured where it keeps balances.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstddef>
#include <cstdlib>
#include <iterator>
#include <numeric>
#include <random>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "libraries/libavl/avl.h"
#include "libraries/libmsg/message_log.h"
#include "tests/support/message_catcher.h"

using test_support::message_catcher;
using keys = std::vector<int>;

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

// The height of a tree whose heights differ as its balances say, or -1000 and less.
int height(const avl_node* node)
{
    if (node == nullptr) {
        return 0;
    }
    const int left = height(node->left);
    const int right = height(node->right);
    const bool sound = right - left == node->balance && std::abs(right - left) <= 1;
    return sound ? 1 + std::max(left, right) : -1000;
}

int keep_data(void* data, void* arg)
{
    static_cast<std::vector<void*>*>(arg)->push_back(data);
    return 0;
}

class AvlTree : public testing::Test {
protected:
    ~AvlTree() override { avl_free(root, nullptr); }

    // The keys are stored as objects of the fixture, in their order, in place of what was there.
    void fill(const keys& from)
    {
        avl_free(std::exchange(root, nullptr), nullptr);
        pool.clear();
        pool.reserve(from.size());
        for (const int key : from) {
            pool.push_back(object{key});
            ASSERT_EQ(avl_insert(&root, &pool.back(), compare, avl_dup_error), 0);
            pool.back().stored = true;
        }
    }

    // What is visited up to the visit `stop_after`, and what the traversal gives then.
    std::pair<keys, int> applied(int order, std::size_t stop_after = 0)
    {
        std::pair<keys, std::size_t> seen = {{}, stop_after};
        const auto visit = [](void* data, void* arg) {
            auto& [visited, limit] = *static_cast<decltype(seen)*>(arg);
            visited.push_back(key_of(data));
            return visited.size() == limit ? 42 : static_cast<int>(visited.size()) - 100;
        };
        const int result = avl_apply(root, visit, &seen, 42, order);
        return {seen.first, result};
    }

    std::vector<object> pool;
    avl_node* root = nullptr;
};

TEST_F(AvlTree, RandomInsertsAndDeletesKeepBalancesAndObjects)
{
    std::mt19937 random(7);
    for (const int count : {4, 12, 40, 150}) {
        std::vector<object> objects;  // two of each key, so that an equal object is often another one
        for (int i = 0; i < 2 * count; ++i) {
            objects.push_back(object{i / 2});
        }
        const auto less = [](const object* a, const object* b) { return a->key < b->key; };
        std::set<object*, decltype(less)> model(less);

        for (int step = 0; step < 1500; ++step) {
            object* any = &objects[random() % objects.size()];
            const object wanted{any->key};
            // Tides, so that trees grow full, shrink to nothing, and much is absent or there already.
            const bool grow = random() % 10 < (step / 250 % 2 == 0 ? 8u : 2u);
            if (grow && !any->stored) {
                const bool is_new = model.insert(any).second;
                ASSERT_EQ(avl_insert(&root, any, compare, avl_dup_error), is_new ? 0 : -1);
                any->stored = is_new;
            } else if (!grow) {
                const auto found = model.find(any);
                object* expected = found == model.end() ? nullptr : *found;
                ASSERT_EQ(avl_find(root, &wanted, compare), expected);
                ASSERT_EQ(avl_delete(&root, &wanted, compare), expected);
                if (expected != nullptr) {
                    expected->stored = false;
                    model.erase(found);
                }
            }
            ASSERT_GE(height(root), 0) << "after step " << step;
            std::vector<void*> in_order;
            EXPECT_EQ(avl_apply(root, keep_data, &in_order, 1, AVL_INORDER), -6);
            ASSERT_TRUE(std::equal(in_order.begin(), in_order.end(), model.begin(), model.end()));
        }
        EXPECT_EQ(avl_free(std::exchange(root, nullptr), nullptr), static_cast<int>(model.size()));
    }
}

TEST_F(AvlTree, ADeletedObjectsPlaceGoesToTheNextGreaterAndRotationsAreSingleWhereThatIsEnough)
{
    const struct {
        keys before;
        int deleted;
        keys after;  // nodes before their subtrees
    } table[] = {
        {{4, 2, 6, 1, 3, 5, 7}, 4, {5, 2, 1, 3, 6, 7}},
        {{2, 1, 4, 3, 5}, 1, {4, 2, 3, 5}},
        {{4, 2, 5, 1, 3}, 5, {2, 1, 4, 3}},
    };
    for (const auto& entry : table) {
        fill(entry.before);
        const object wanted{entry.deleted};
        EXPECT_NE(avl_delete(&root, &wanted, compare), nullptr);
        EXPECT_EQ(applied(AVL_PREORDER).first, entry.after);
    }
}

TEST_F(AvlTree, AnEqualObjectIsTheDuplicateRulesToJudge)
{
    fill({4, 2, 6, 1});
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
    EXPECT_EQ(avl_find(root, &again, compare), &pool[1]);
    EXPECT_EQ(applied(AVL_PREORDER).first, (keys{4, 2, 1, 6}));
}

// A tree whose balances lie: the side that is said to be high has no child.
TEST(AvlDamagedTree, AMissingChildIsReportedAndNothingMoves)
{
    const struct {
        bool insert;
        signed char balance;  // of the root, 50
        int key;              // inserted, or deleted, on the other side of what the balance says when it is deleted
        const char* text;
    } cases[] = {
        {true, -1, 10, "avl RL error"},  // the new leaf has no right child to come up first
        {true, 1, 90, "avl RR error"},
        {false, 1, 10, "avl RL error"},
        {false, -1, 90, "avl RR error"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE((c.insert ? "insert " : "delete ") + std::to_string(c.key));
        const message_catcher messages;
        object middle{50};
        object side{c.key};
        avl_node* root = nullptr;
        ASSERT_EQ(avl_insert(&root, &middle, compare, avl_dup_error), 0);
        if (!c.insert) {
            ASSERT_EQ(avl_insert(&root, &side, compare, avl_dup_error), 0);
        }
        root->balance = c.balance;
        if (c.insert) {
            EXPECT_EQ(avl_insert(&root, &side, compare, avl_dup_error), -1);
        } else {
            EXPECT_EQ(avl_delete(&root, &side, compare), &side);
        }
        EXPECT_EQ(root->data, &middle);
        EXPECT_EQ(root->balance, c.balance);
        ASSERT_EQ(messages.count(), 1u);
        ASSERT_EQ(messages.count(MSG_COMPONENT_SERVER, 106), 1u);
        EXPECT_EQ(messages.messages()[0].severity, 1);
        EXPECT_EQ(messages.messages()[0].arguments, std::vector<std::string>{c.text});
        EXPECT_EQ(avl_free(root, nullptr), 1);
    }
}

TEST(AvlDamagedTree, AWayThatIsLongerThanABalancedTreeIsHighEndsThere)
{
    std::vector<object> objects(400);
    avl_node* root = nullptr;
    for (avl_node** link = &root; object & o : objects) {
        o.key = static_cast<int>(&o - objects.data());
        *link = static_cast<avl_node*>(std::malloc(sizeof(avl_node)));
        **link = avl_node{&o, 0, nullptr, nullptr};
        link = &(*link)->right;
    }
    const message_catcher messages;
    object last{1000};
    EXPECT_EQ(avl_insert(&root, &last, compare, avl_dup_error), -1);
    EXPECT_EQ(avl_delete(&root, &objects[399], compare), nullptr);
    EXPECT_EQ(messages.count(MSG_COMPONENT_SERVER, 106), 2u);
    EXPECT_EQ(avl_free(root, nullptr), 400);
}

TEST_F(AvlTree, TheScanMeetsNodesBeforeTheirSubtreesAndLeftBeforeRight)
{
    fill({4, 2, 6, 1, 3, 5, 7});
    const auto divides = [](const void* wanted, const void* stored, int) {
        return key_of(stored) % key_of(wanted) == 0 ? 0 : 1;  // no order at all
    };
    for (const auto& [divisor, place] : {std::pair(2, 0), {3, 4}, {7, 6}}) {
        const object wanted{divisor};
        EXPECT_EQ(avl_find_lin(root, &wanted, divides), &pool[static_cast<std::size_t>(place)]) << divisor;
    }
    const object eleven{11};
    EXPECT_EQ(avl_find_lin(root, &eleven, divides), nullptr);
}

TEST_F(AvlTree, EachOrderVisitsAllAndStopsWhereToldAndAnUnknownOrderIsRefused)
{
    const std::pair<int, keys> orders[] = {
        {1, {4, 2, 1, 3, 6, 5, 7}}, {2, {1, 2, 3, 4, 5, 6, 7}}, {3, {1, 3, 2, 5, 7, 6, 4}}};
    for (const auto& [type, visited] : orders) {
        fill({});
        EXPECT_EQ(applied(type), std::pair(keys(), -6));
        fill({4, 2, 6, 1, 3, 5, 7});
        EXPECT_EQ(applied(type), std::pair(visited, -6));
        for (int stop = 1; stop <= 7; ++stop) {
            EXPECT_EQ(applied(type, static_cast<std::size_t>(stop)),
                      std::pair(keys(visited.begin(), visited.begin() + stop), 42));
        }
    }
    for (const int type : {0, 4, -1}) {
        testing::internal::CaptureStderr();
        EXPECT_EQ(applied(type), std::pair(keys(), -1));
        EXPECT_EQ(testing::internal::GetCapturedStderr(), "Invalid traversal type " + std::to_string(type) + "\n");
    }
}

// An object matches the one that its key is divided by the argument to.
TEST_F(AvlTree, APrefixScanVisitsTheMatchesNodesFirstAndFewOthers)
{
    static std::size_t comparisons;
    const auto compare_quotient = [](const void* wanted, const void* stored, int divisor) {
        ++comparisons;
        return key_of(wanted) - key_of(stored) / divisor;
    };
    const auto third = [](void* data, void* arg) {
        keep_data(data, arg);
        return static_cast<std::vector<void*>*>(arg)->size() == 3 ? 1 : 0;
    };
    keys all(1000);
    std::iota(all.begin(), all.end(), 0);
    fill(all);
    std::vector<void*> preorder;
    avl_apply(root, keep_data, &preorder, 1, AVL_PREORDER);
    for (const auto& [key, divisor] : {std::pair(0, 10), {0, 1000}, {3, 100}, {730, 1}, {499, 2}, {10, 100}}) {
        object wanted{key};
        std::vector<void*> expected;
        std::copy_if(preorder.begin(), preorder.end(), std::back_inserter(expected),
                     [&, d = divisor](void* data) { return key_of(data) / d == wanted.key; });
        std::vector<void*> visited;
        comparisons = 0;
        EXPECT_EQ(avl_prefixapply(root, &wanted, keep_data, &visited, compare_quotient, divisor, 1), -6);
        EXPECT_EQ(visited, expected) << key;
        EXPECT_LE(comparisons, expected.size() + 30) << "the range's borders and the way to it";

        visited.clear();
        const int rc = avl_prefixapply(root, &wanted, third, &visited, compare_quotient, divisor, 1);
        EXPECT_EQ(rc, expected.size() >= 3 ? 1 : -6) << key;
        expected.resize(std::min<std::size_t>(expected.size(), 3));
        EXPECT_EQ(visited, expected) << key;
    }
}

TEST_F(AvlTree, FreeingHandsOverEachObjectChildrenFirst)
{
    static keys freed;
    freed.clear();
    fill({4, 2, 6, 1, 3, 5, 7});
    EXPECT_EQ(avl_free(std::exchange(root, nullptr), [](void* data) { freed.push_back(key_of(data)); }), 7);
    EXPECT_EQ(freed, (keys{1, 3, 2, 5, 7, 6, 4}));
    EXPECT_EQ(avl_free(nullptr, [](void*) { std::abort(); }), 0);
}

TEST_F(AvlTree, AWalkHandsOutEveryObjectInOrderAndThenNull)
{
    for (const int count : {1, 100, 101, 250}) {
        keys mixed;
        for (int i = 0; i < count; ++i) {
            mixed.push_back(i * 37 % count);  // 37 has no factor in common with any of the counts
        }
        fill(mixed);
        int expected = 0;
        for (void* data = avl_getfirst(root); data != nullptr; data = avl_getnext()) {
            ASSERT_EQ(key_of(data), expected++);
        }
        EXPECT_EQ(expected, count);
        EXPECT_EQ(avl_getnext(), nullptr);
    }
}

TEST_F(AvlTree, ANewWalkReplacesTheOldOneAndOutlivesTheTree)
{
    fill({2, 1, 3});
    for (int walk = 0; walk < 2; ++walk) {
        EXPECT_EQ(avl_getfirst(root), &pool[1]);
    }
    avl_free(std::exchange(root, nullptr), nullptr);
    EXPECT_EQ(avl_getnext(), &pool[0]);
    EXPECT_EQ(avl_getfirst(nullptr), nullptr);
    EXPECT_EQ(avl_getnext(), nullptr) << "an empty tree leaves nothing of the walk before";
}

}  // namespace
