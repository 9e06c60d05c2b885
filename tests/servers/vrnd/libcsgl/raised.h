// What an action raises, as a value that tests can compare.
#pragma once

#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <typeinfo>

#include "servers/vrnd/libcsgl/csgl_exception.h"

struct raised_exception {
    const std::type_info* type = &typeid(void);  // void: nothing was raised
    std::int64_t code = 0;
    int line = 0;
    std::string text;
};

template <typename Action>
raised_exception raised_by(const Action& action)
{
    try {
        action();
    } catch (const exc_t& e) {
        return {&typeid(e), e.code(), e.line(), e.message().text()};
    }
    return {};
}

// Whether an action raises just this class with this text.
template <typename Class, typename Action>
testing::AssertionResult raises(const char* text, const Action& action)
{
    const raised_exception raised = raised_by(action);
    if (*raised.type == typeid(Class) && raised.text == text) {
        return testing::AssertionSuccess();
    }
    return testing::AssertionFailure() << "raised " << raised.type->name() << " '" << raised.text << "'";
}
