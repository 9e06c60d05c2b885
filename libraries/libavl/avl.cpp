// The tree. Insert and delete go down once, remembering the way, and up again only as far as heights change; what is
// walked as a whole is walked by recursion, whose depth is the height of the tree.
//
// Both mirror images of a step are one piece of code: a side is the sign of a balance, and child(node, side) the link
// there.
#include "libraries/libavl/avl.h"

#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <iterator>

#include "libraries/libmsg/message_log.h"

namespace {

using side_t = signed char;

constexpr side_t left = -1;
constexpr side_t even = 0;
constexpr side_t right = 1;

// No balanced tree that fits into memory is higher: one of height h has more than 1.6^h nodes.
constexpr std::size_t max_height = 96;
constexpr const char* too_high = "avl height error";

void report_damage(const char* what)
{
    PrintMessage(MSG_COMPONENT_SERVER, MSG_INFORMATION, 106, what);
}

constexpr side_t other(side_t side)
{
    return side == left ? right : left;
}

avl_node*& child(avl_node* node, side_t side)
{
    return side == left ? node->left : node->right;
}

// Asks for both children while the comparison still waits for the object: on a tree larger than the caches the way down
// takes two thirds of the time that it takes without. (A null pointer is no harm here.)
void fetch_children(const avl_node* node)
{
    __builtin_prefetch(node->left);
    __builtin_prefetch(node->right);
}

// ---- rotations
// --------------------------------------------------------------------------------------------------------

// Brings the child on the side `up` into the place of its parent: a right rotation brings the left child up. Balances
// are the caller's to set. False, with a message, when there is no such child.
bool rotate(avl_node** link, side_t up)
{
    avl_node* node = *link;
    avl_node* risen = node != nullptr ? child(node, up) : nullptr;
    if (risen == nullptr) {
        report_damage(up == left ? "avl RR error" : "avl RL error");
        return false;
    }
    child(node, up) = child(risen, other(up));
    child(risen, other(up)) = node;
    *link = risen;
    return true;
}

// For a node that is too high on a side whose child leans the same way.
bool rotate_once(avl_node** link, side_t high)
{
    avl_node* node = *link;
    if (!rotate(link, high))
        return false;
    node->balance = even;
    (*link)->balance = even;
    return true;
}

// For a node that is too high on a side whose child leans the other way: the grandchild in between becomes the top.
bool rotate_twice(avl_node** link, side_t high)
{
    avl_node* node = *link;
    avl_node* below = child(node, high);
    if (!rotate(&child(node, high), other(high)))
        return false;

    avl_node* top = child(node, high);
    node->balance = top->balance == high ? other(high) : even;
    below->balance = top->balance == other(high) ? high : even;
    top->balance = even;
    return rotate(link, high);
}

// ---- insert
// -----------------------------------------------------------------------------------------------------------

avl_node* new_node(void* data)
{
    auto* node = static_cast<avl_node*>(std::malloc(sizeof(avl_node)));
    if (node != nullptr)
        *node = avl_node{data, even, nullptr, nullptr};
    return node;
}

// Sets balances right after `leaf` was hung in. `way` are the turns from *top to the leaf; the nodes between the two
// were even and lean towards the leaf now. False when the tree is damaged at *top, with nothing changed.
bool rebalance_grown(avl_node** top, const side_t* way, const avl_node* leaf)
{
    avl_node* node = *top;
    if (node == leaf)
        return true;
    const side_t grown = *way++;
    avl_node* below = child(node, grown);
    for (avl_node* between = below; between != leaf; ++way) {
        between->balance = *way;
        between = child(between, *way);
    }

    if (node->balance != grown) {
        node->balance = node->balance == even ? grown : even;
        return true;
    }
    return below->balance == grown ? rotate_once(top, grown) : rotate_twice(top, grown);
}

// ---- delete
// -----------------------------------------------------------------------------------------------------------

// Sets the balance of *link right after its subtree on `side` has shrunk, and says whether the whole has shrunk.
bool rebalance_shrunk(avl_node** link, side_t side)
{
    avl_node* node = *link;
    const side_t high = other(side);
    if (node->balance == side) {
        node->balance = even;
        return true;
    }
    if (node->balance == even) {
        node->balance = high;
        return false;
    }

    const avl_node* below = child(node, high);
    if (below != nullptr && below->balance == side)
        return rotate_twice(link, high);
    if (below != nullptr && below->balance == high)
        return rotate_once(link, high);
    if (rotate(link, high))
        (*link)->balance = side;  // of two even subtrees the inner one changed hands; `node` stays as high as it was
    return false;
}

// ---- traversals
// -------------------------------------------------------------------------------------------------------

// Visits the node before, between or after its subtrees, and says whether the visitor stopped: ends are told apart by
// that and not by the result, so that a stopflag of AVL_NOMORE stops where any other would.
template <avl_order order>
bool stopped(const avl_node* node, avl_fn fn, void* arg, int stopflag)
{
    if (node == nullptr)
        return false;
    if (order == AVL_PREORDER && fn(node->data, arg) == stopflag)
        return true;
    if (stopped<order>(node->left, fn, arg, stopflag))
        return true;
    if (order == AVL_INORDER && fn(node->data, arg) == stopflag)
        return true;
    if (stopped<order>(node->right, fn, arg, stopflag))
        return true;
    return order == AVL_POSTORDER && fn(node->data, arg) == stopflag;
}

// The node itself, so that a null object can be told from none.
avl_node* find_lin(avl_node* node, const void* data, avl_cmp cmp)
{
    for (; node != nullptr; node = node->right) {
        if (cmp(data, node->data, 0) == 0)
            return node;
        if (avl_node* found = find_lin(node->left, data, cmp))
            return found;
    }
    return nullptr;
}

// ---- the walk without callback
// ----------------------------------------------------------------------------------------

constexpr std::size_t avl_list_step = 100;

void** avl_list = nullptr;
std::size_t avl_maxlist = 0;   // pointers in the list
std::size_t avl_nextlist = 0;  // the next to hand out
std::size_t avl_list_slots = 0;

void drop_list()
{
    std::free(avl_list);
    avl_list = nullptr;
    avl_maxlist = 0;
    avl_nextlist = 0;
    avl_list_slots = 0;
}

// Gives 0, or AVL_FAILURE, which ends the collecting, when the list can't grow.
int collect(void* data, void* /*arg*/)
{
    if (avl_maxlist == avl_list_slots) {
        const std::size_t slots = avl_list_slots + avl_list_step;
        void* grown = std::realloc(avl_list, slots * sizeof(void*));
        if (grown == nullptr)
            return AVL_FAILURE;
        avl_list = static_cast<void**>(grown);
        avl_list_slots = slots;
    }
    avl_list[avl_maxlist++] = data;
    return AVL_OK;
}

}  // namespace

// ---- the functions
// ----------------------------------------------------------------------------------------------------

extern "C" {

const char avl_version[] = "AVL library version 1.0\n";

int avl_insert(avl_node** root, void* data, avl_cmp cmp, avl_dup dup)
{
    // The deepest node on the way that leans: nothing above it grows. Where every node is even, the root.
    avl_node** top = root;
    side_t way[max_height];
    side_t* turn = way;

    avl_node** link = root;
    while (avl_node* node = *link) {
        fetch_children(node);
        const int order = cmp(data, node->data, 0);
        if (order == 0)
            return dup(node->data, data);
        const bool leans = node->balance != even;
        top = leans ? link : top;
        turn = leans ? way : turn;
        if (turn == std::end(way)) {
            report_damage(too_high);
            return AVL_FAILURE;
        }
        *turn++ = order < 0 ? left : right;
        link = order < 0 ? &node->left : &node->right;
    }

    avl_node* leaf = new_node(data);
    if (leaf == nullptr)
        return AVL_FAILURE;
    *link = leaf;
    if (!rebalance_grown(top, way, leaf)) {
        *link = nullptr;
        std::free(leaf);
        return AVL_FAILURE;
    }
    return AVL_OK;
}

int avl_dup_error(void* /*stored*/, void* /*added*/)
{
    return AVL_FAILURE;
}

int avl_dup_ok(void* /*stored*/, void* /*added*/)
{
    return AVL_OK;
}

void* avl_delete(avl_node** root, const void* data, avl_cmp cmp)
{
    struct turn_t {
        avl_node** link;
        side_t side;
    };
    turn_t way[max_height];
    turn_t* turn = way;
    const auto remember = [&](avl_node** link, side_t side) {
        if (turn == std::end(way)) {
            report_damage(too_high);
            return false;
        }
        *turn++ = {link, side};
        return true;
    };

    avl_node** link = root;
    avl_node* found = *link;
    for (; found != nullptr; found = *link) {
        fetch_children(found);
        const int order = cmp(data, found->data, 0);
        if (order == 0)
            break;
        if (!remember(link, order < 0 ? left : right))
            return nullptr;
        link = order < 0 ? &found->left : &found->right;
    }
    if (found == nullptr)
        return nullptr;

    // With two children, the node of the next greater object goes, and this one takes over that object.
    void* removed = found->data;
    if (found->left != nullptr && found->right != nullptr) {
        if (!remember(link, right))
            return nullptr;
        for (link = &found->right; (*link)->left != nullptr; link = &(*link)->left) {
            if (!remember(link, left))
                return nullptr;
        }
        found->data = (*link)->data;
    }
    avl_node* gone = *link;
    *link = gone->left != nullptr ? gone->left : gone->right;
    std::free(gone);

    bool shrunk = true;
    while (shrunk && turn != way) {
        --turn;
        shrunk = rebalance_shrunk(turn->link, turn->side);
    }
    return removed;
}

void* avl_find(avl_node* root, const void* data, avl_cmp cmp)
{
    while (root != nullptr) {
        fetch_children(root);
        const int order = cmp(data, root->data, 0);
        if (order == 0)
            return root->data;
        root = order < 0 ? root->left : root->right;
    }
    return nullptr;
}

void* avl_find_lin(avl_node* root, const void* data, avl_cmp cmp)
{
    const avl_node* found = find_lin(root, data, cmp);
    return found != nullptr ? found->data : nullptr;
}

int avl_apply(avl_node* root, avl_fn fn, void* arg, int stopflag, int type)
{
    bool stop = false;
    switch (type) {
    case AVL_PREORDER: stop = stopped<AVL_PREORDER>(root, fn, arg, stopflag); break;
    case AVL_INORDER: stop = stopped<AVL_INORDER>(root, fn, arg, stopflag); break;
    case AVL_POSTORDER: stop = stopped<AVL_POSTORDER>(root, fn, arg, stopflag); break;
    default: std::fprintf(stderr, "Invalid traversal type %d\n", type); return AVL_FAILURE;
    }
    return stop ? stopflag : AVL_NOMORE;
}

int avl_prefixapply(avl_node* root, void* data, avl_fn fmatch, void* marg, avl_cmp fcmp, int carg, int stopflag)
{
    while (root != nullptr) {
        const int order = fcmp(data, root->data, carg);
        if (order == 0) {
            if (fmatch(root->data, marg) == stopflag)
                return stopflag;
            if (avl_prefixapply(root->left, data, fmatch, marg, fcmp, carg, stopflag) == stopflag)
                return stopflag;
        }
        root = order < 0 ? root->left : root->right;
    }
    return AVL_NOMORE;
}

int avl_free(avl_node* root, avl_dfree dfree)
{
    if (root == nullptr)
        return 0;
    const int on_the_left = avl_free(root->left, dfree);
    const int on_the_right = avl_free(root->right, dfree);
    if (dfree != nullptr)
        dfree(root->data);
    std::free(root);
    return on_the_left + on_the_right + 1;
}

void* avl_getfirst(avl_node* root)
{
    drop_list();
    if (root == nullptr)
        return nullptr;
    if (avl_apply(root, collect, nullptr, AVL_FAILURE, AVL_INORDER) != AVL_NOMORE) {
        drop_list();
        return nullptr;
    }
    return avl_getnext();
}

void* avl_getnext(void)
{
    if (avl_list == nullptr)
        return nullptr;
    if (avl_nextlist == avl_maxlist) {
        drop_list();
        return nullptr;
    }
    return avl_list[avl_nextlist++];
}

}  // extern "C"
