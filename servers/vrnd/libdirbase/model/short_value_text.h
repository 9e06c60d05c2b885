// The text of a counted value of a syntax whose texts are short, with a terminator of its own: so nothing is read
// behind the counted bytes. A longer text is cut, and is then still longer than any legal one (timestamp.h,
// syntax_value.h).
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstring>

#include "libraries/libber/berval.h"

class short_value_text {
public:
    explicit short_value_text(const berval& value)
    {
        const std::size_t length = value.bv_val == nullptr ? 0 : std::min<std::size_t>(value.bv_len, sizeof text_ - 1);
        if (length != 0) {
            std::memcpy(text_, value.bv_val, length);
        }
        text_[length] = '\0';
    }

    const char* c_str() const { return text_; }

private:
    char text_[64];
};
