// A text of malloc that grows while it is written, for texts that are handed over in the end.
#pragma once

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <string_view>
#include <utility>

#include "servers/vrnd/libdirbase/base/heap.h"

// Once memory ran out every addition fails, and so does release().
class text_builder {
public:
    // room  bytes that the first block holds, its terminator included
    explicit text_builder(std::size_t room) : size_(std::max<std::size_t>(room, 1)) {}

    bool append(std::string_view text)
    {
        if (!reserve(text.size())) {
            return false;
        }
        std::copy(text.begin(), text.end(), text_.get() + length_);
        length_ += text.size();
        return true;
    }
    bool append(char character) { return append(std::string_view(&character, 1)); }

    bool failed() const { return failed_; }
    std::size_t length() const { return length_; }

    // The text so far, without a terminator.
    std::string_view view() const { return {text_.get(), length_}; }

    // Takes back what was added behind the first `length` bytes.
    void cut(std::size_t length) { length_ = std::min(length, length_); }

    // The text, which is the caller's from then on; null when memory ran out. The builder starts anew.
    heap_text release()
    {
        if (!reserve(0)) {
            return nullptr;
        }
        text_.get()[length_] = '\0';
        length_ = 0;
        return std::move(text_);
    }

private:
    // Makes room for so many bytes more and a terminator.
    bool reserve(std::size_t more)
    {
        if (failed_ || (text_ != nullptr && size_ - length_ > more)) {
            return !failed_;
        }
        std::size_t size = size_;
        while (size - length_ <= more) {
            size *= 2;
        }
        auto* const grown = static_cast<char*>(std::realloc(text_.get(), size));
        failed_ = grown == nullptr;
        if (!failed_) {
            (void)text_.release();  // realloc has it
            text_.reset(grown);
            size_ = size;
        }
        return !failed_;
    }

    heap_text text_;
    std::size_t size_;
    std::size_t length_ = 0;
    bool failed_ = false;
};
