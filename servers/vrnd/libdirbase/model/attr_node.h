// A guard for nodes of value trees.
#pragma once

#include <memory>

#include "servers/vrnd/libdirbase/model/attr_value_tree.h"

struct free_node {
    void operator()(AttrvalsNorm* node) const noexcept { free_AttrvalsNorm(node); }
};
using node_guard = std::unique_ptr<AttrvalsNorm, free_node>;
