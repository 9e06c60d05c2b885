// Shared texts: see csgl_string.h.
#include "servers/vrnd/libcsgl/csgl_string.h"

#include <algorithm>
#include <cctype>
#include <cstring>

namespace {

// Lengths and capacities are 32-bit; a text longer than this has no capacity class.
constexpr std::size_t longest_text = 0xffffffffu - 2 * 1024;

unsigned checked_size(std::size_t length1, std::size_t length2)
{
    if (length1 + length2 > longest_text) {
        csgl_throw_no_memory(__FILE__, __LINE__);
    }
    return static_cast<unsigned>(length1 + length2 + 1);
}

// Bytes of `text` that count: up to its first byte 0 and at most `length`.
unsigned bounded_length(const char* text, unsigned length)
{
    return text == nullptr ? 0 : static_cast<unsigned>(strnlen(text, length));
}

const csgl_string& empty_string()
{
    static const csgl_string empty("");
    return empty;
}

// So that it is there before the program's own static objects, and goes after them.
[[maybe_unused]] const csgl_string& empty_made_at_load = empty_string();

}  // namespace

csgl_string_::~csgl_string_()
{
    if (capacity_ != 0) {
        csgl_free(heap_);
    }
}

unsigned csgl_string_::allocation_size(unsigned needed)
{
    if (needed <= inline_size) {
        return 0;
    }
    for (unsigned size = 64; size <= 1024; size *= 2) {
        if (needed <= size) {
            return size;
        }
    }
    return needed - needed % 1024 + 1024;
}

// Moves the storage to a block that the caller has filled, and frees the old one.
void csgl_string_::use_block(char* block, unsigned capacity)
{
    char* old = capacity_ == 0 ? nullptr : heap_;
    heap_ = block;
    capacity_ = capacity;
    csgl_free(old);
}

void csgl_string_::init(const char* text, unsigned length)
{
    init(text, length, nullptr, 0);
}

void csgl_string_::init(const char* text1, unsigned length1, const char* text2, unsigned length2)
{
    const unsigned size = allocation_size(checked_size(length1, length2));
    if (size != 0) {
        heap_ = static_cast<char*>(csgl_allocate(size, __FILE__, __LINE__));
        capacity_ = size;
    }
    char* to = storage();
    const unsigned count1 = bounded_length(text1, length1);
    const unsigned count2 = bounded_length(text2, length2);
    std::copy_n(text1, count1, to);
    std::copy_n(text2, count2, to + count1);
    length_ = count1 + count2;
    to[length_] = '\0';
}

void csgl_string_::assign(const char* text, unsigned length)
{
    const unsigned needed = checked_size(length, 0);
    const unsigned count = bounded_length(text, length);
    if (!fits(needed)) {
        const unsigned size = allocation_size(needed);
        char* block = static_cast<char*>(csgl_allocate(size, __FILE__, __LINE__));
        std::copy_n(text, count, block);
        use_block(block, size);
    } else if (capacity_ != 0 && allocation_size(needed) == 0) {
        char* block = heap_;  // the text may lie in it, so it goes last
        char copy[inline_size];
        std::copy_n(text, count, copy);
        std::copy_n(copy, count, inline_);
        capacity_ = 0;
        csgl_free(block);
    } else if (count != 0) {
        std::memmove(storage(), text, count);
    }
    length_ = count;
    storage()[length_] = '\0';
}

void csgl_string_::append(const char* text, unsigned length)
{
    const unsigned needed = checked_size(length_, length);
    const unsigned count = bounded_length(text, length);
    if (!fits(needed)) {
        const unsigned size = allocation_size(needed);
        char* block = static_cast<char*>(csgl_allocate(size, __FILE__, __LINE__));
        std::copy_n(storage(), length_, block);
        std::copy_n(text, count, block + length_);
        use_block(block, size);
    } else if (count != 0) {
        std::memmove(storage() + length_, text, count);
    }
    length_ += count;
    storage()[length_] = '\0';
}

csgl_string::csgl_string() : csgl_refcounted_pointer_to(empty_string()) {}

csgl_string::csgl_string(const char* text) : csgl_string(text, csgl_str_length(text), nullptr, 0) {}

csgl_string::csgl_string(const char* text, unsigned length) : csgl_string(text, length, nullptr, 0) {}

csgl_string::csgl_string(const char* text1, unsigned length1, const char* text2, unsigned length2)
    : csgl_refcounted_pointer_to(new csgl_string_)
{
    get()->init(text1, length1, text2, length2);
}

void csgl_string::assign(const char* text, unsigned length)
{
    if (get()->value() < 2) {
        get()->assign(text, length);
    } else {
        *this = csgl_string(text, length);
    }
}

csgl_string& csgl_string::append(const char* text, unsigned length)
{
    if (get()->value() < 2) {
        get()->append(text, length);
    } else {
        *this = csgl_string(c_str(), this->length(), text, length);
    }
    return *this;
}

csgl_string& csgl_string::append(const char* text)
{
    return append(text, csgl_str_length(text));
}

int csgl_string::find(char c, unsigned start) const
{
    const char* text = c_str();
    for (unsigned i = start; i <= length(); ++i) {
        if (text[i] == c) {
            return static_cast<int>(i);
        }
    }
    return -1;
}

int csgl_string::rfind(char c, unsigned start) const
{
    const char* text = c_str();
    for (unsigned i = std::min(start, length()) + 1; i > 0; --i) {
        if (text[i - 1] == c) {
            return static_cast<int>(i - 1);
        }
    }
    return -1;
}

int csgl_string::compare(const char* a, const char* b)
{
    while (*a == *b && *a != '\0') {
        ++a;
        ++b;
    }
    const auto left = static_cast<signed char>(*a);
    const auto right = static_cast<signed char>(*b);
    return left < right ? -1 : left > right ? 1 : 0;
}

csgl_string operator+(const csgl_string& a, const csgl_string& b)
{
    return {a.c_str(), a.length(), b.c_str(), b.length()};
}

csgl_string operator+(const csgl_string& a, const char* b)
{
    return {a.c_str(), a.length(), b, csgl_str_length(b)};
}

csgl_string operator+(const char* a, const csgl_string& b)
{
    return {a, csgl_str_length(a), b.c_str(), b.length()};
}

int csgl_str_ci_compare(const char* a, const char* b)
{
    for (;; ++a, ++b) {
        if (*a == *b) {  // most bytes of most names, without asking the locale
            if (*a == '\0') {
                return 0;
            }
            continue;
        }
        const auto left = static_cast<signed char>(std::tolower(static_cast<unsigned char>(*a)));
        const auto right = static_cast<signed char>(std::tolower(static_cast<unsigned char>(*b)));
        if (left != right || *a == '\0') {
            return left - right;
        }
    }
}

void csgl_str_zero(void* p, unsigned n)
{
    std::memset(p, 0, n);
}

unsigned csgl_str_length(const char* text)
{
    const std::size_t length = text == nullptr ? 0 : std::strlen(text);
    return checked_size(length, 0) - 1;
}
