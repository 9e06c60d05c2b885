// A height-balanced tree of opaque pointers (AVL), ordered by a comparison that the caller passes at each call.
//
// A tree is a pointer to its root node; the empty tree is a null pointer. Nodes belong to the tree, the objects to the
// caller, and no two objects in a tree compare equal. Every call on one tree takes a comparison of the same order;
// avl_find_lin is there for the others.
//
// The tree has no lock: the caller serialises changes, and readers may run side by side while nobody changes it.
// Callbacks may not change the tree that they are called for, nor throw.
#pragma once

#include "libraries/dirbase_export.h"

// One node. Readers may walk the tree themselves; only the functions below change it.
typedef struct avl_node avl_node;
struct avl_node {
    void* data;           // the caller's object
    signed char balance;  // height of the right subtree less height of the left one: -1, 0 or +1
    avl_node* left;       // smaller objects
    avl_node* right;      // greater objects
};

// Result codes. -1 also is what avl_dup_error makes of an insert.
enum avl_result DIRBASE_ENUM_INT {
    AVL_OK = 0,
    AVL_FAILURE = -1,
    AVL_NOMORE = -6,  // a traversal came to its end without being stopped
};

// The orders of avl_apply.
enum avl_order DIRBASE_ENUM_INT {
    AVL_PREORDER = 1,
    AVL_INORDER = 2,
    AVL_POSTORDER = 3,
};

DIRBASE_C_BEGIN

// Compares the looked-for or new object with a stored one: negative, 0 or positive. The third argument is always 0,
// except in avl_prefixapply, which passes the caller's own.
typedef int (*avl_cmp)(const void* wanted, const void* stored, int argument);

// Says what an insert gives that meets an equal object. The new one isn't stored, whatever the result.
typedef int (*avl_dup)(void* stored, void* added);

// Visits an object with the caller's argument. The result is compared with the `stopflag` of the call.
typedef int (*avl_fn)(void* data, void* arg);

// Releases an object.
typedef void (*avl_dfree)(void* data);

// "AVL library version 1.0\n"
DIRBASE_EXPORT extern const char avl_version[];

// Stores `data` in the tree.
//
//   root  address of the tree; the root changes with the shape.
//   dup   asked when an equal object is there; the tree then stays as it is.
//
// Returns 0; or what `dup` gave, which may be 0 too, and then the tree doesn't hold `data`; or -1 when no node could be
// allocated, or when the tree is damaged on the way, which message 106 reports.
DIRBASE_EXPORT int avl_insert(avl_node** root, void* data, avl_cmp cmp, avl_dup dup);

// Duplicate rules for avl_insert: the insert fails with -1, or it succeeds with 0 and keeps the stored object.
DIRBASE_EXPORT int avl_dup_error(void* stored, void* added);
DIRBASE_EXPORT int avl_dup_ok(void* stored, void* added);

// Takes the object out of the tree that compares equal to `data`. Returns the stored pointer, which is the caller's as
// ever, or null when there is none, or when the tree is damaged on the way (message 106). The objects that stay may
// move to other nodes.
DIRBASE_EXPORT void* avl_delete(avl_node** root, const void* data, avl_cmp cmp);

// Returns the stored object that compares equal to `data`, or null.
DIRBASE_EXPORT void* avl_find(avl_node* root, const void* data, avl_cmp cmp);

// The same for a comparison that doesn't follow the tree's order: looks at every node, then at its left subtree, then
// at its right one, and returns the first object for which `cmp` gives 0.
DIRBASE_EXPORT void* avl_find_lin(avl_node* root, const void* data, avl_cmp cmp);

// Calls fn(data, arg) for each object in the order `type`, one of avl_order, until it gives `stopflag`.
//
// Returns `stopflag` after a stop and -6 at the end of the tree, so a stopflag of -6 tells nothing; or -1, with a line
// on standard error, for a `type` that is no order.
DIRBASE_EXPORT int avl_apply(avl_node* root, avl_fn fn, void* arg, int stopflag, int type);

// Calls fmatch(stored, marg) for each object that matches a key, by descending only where such objects can be.
//
//   fcmp  compares as fcmp(data, stored, carg): 0 for a match; negative or positive when all matches are to the left,
//         or to the right, of the stored object.
//
// A match is visited before those in its left subtree, and these before those in its right one. Returns `stopflag` as
// soon as fmatch gives it, else -6. A stopflag of -6 isn't to be used: the end of a left subtree stops the walk as
// well.
DIRBASE_EXPORT int avl_prefixapply(avl_node* root, void* data, avl_fn fmatch, void* marg, avl_cmp fcmp, int carg,
                                   int stopflag);

// Frees every node, children before their parent, and calls dfree(data) for each unless `dfree` is null. Returns the
// number of nodes. The caller forgets the root.
DIRBASE_EXPORT int avl_free(avl_node* root, avl_dfree dfree);

// An inorder walk without a callback: avl_getfirst makes a list of the objects and returns the first, avl_getnext
// returns the next, and null when there is none or no list. Reading past the last object frees the list.
//
// There is one list for the whole process, whichever tree it was made of: one walk at a time, on one thread. The tree
// may change during a walk. avl_getfirst returns null for an empty tree, and when there is no memory for the list.
DIRBASE_EXPORT void* avl_getfirst(avl_node* root);
DIRBASE_EXPORT void* avl_getnext(void);

DIRBASE_C_END
