// What the foundation and the schema engine owe their callers when memory runs out: one class of exception.
#pragma once

#include <gtest/gtest.h>

#include <functional>
#include <string_view>

#include "servers/vrnd/libcsgl/csgl_exception.h"
#include "tests/support/alloc_fault.h"

namespace test_support {

// Runs the action, which must raise the exception for memory if an allocation has failed, and nothing otherwise.
inline void expect_clean(const std::function<void()>& action)
{
    bool refused = false;
    try {
        action();
    } catch (const exc_not_enough_memory_t& e) {
        refused = std::string_view(e.message().text()) == "not enough memory" && *e.message().printed() == '\0';
    }
    EXPECT_EQ(refused, allocation_failed());
}

}  // namespace test_support
