// The text type of the foundation and the schema engine.
//
// A csgl_string is a handle on a shared body; copying it shares the text, and appending to a shared text makes a new
// body for this handle alone. Texts up to 31 bytes lie inside the body, longer ones in one heap block whose sizes grow
// in steps (csgl_string_::allocation_size). A text never holds a byte 0: all copying stops there.
#pragma once

#include <cstdint>

#include "servers/vrnd/libcsgl/csgl_refcounted.h"

// The body. Only its handle changes it, and only while the handle is alone on it.
class DIRBASE_EXPORT csgl_string_ : public csgl_refcounted<csgl_string_> {
public:
    csgl_string_() : capacity_(0), length_(0) { inline_[0] = '\0'; }
    ~csgl_string_();
    csgl_string_(const csgl_string_&) = delete;
    csgl_string_& operator=(const csgl_string_&) = delete;

    // Fill a new body with at most the stated counts of bytes. A null text counts as empty.
    void init(const char* text, unsigned length);
    void init(const char* text1, unsigned length1, const char* text2, unsigned length2);

    // Replace, or extend, the text; `text` may point into this body. A block that has become too large for a text that
    // fits inside the body is given back, any other is kept.
    void assign(const char* text, unsigned length);
    void append(const char* text, unsigned length);

    const char* text() const { return capacity_ == 0 ? inline_ : heap_; }
    unsigned length() const { return length_; }
    unsigned capacity() const { return capacity_; }

    // Size of the heap block for `needed` bytes, terminator included; 0 means the 32 bytes inside the body.
    static unsigned allocation_size(unsigned needed);

private:
    static constexpr unsigned inline_size = 32;

    char* storage() { return capacity_ == 0 ? inline_ : heap_; }
    bool fits(unsigned needed) const { return needed <= (capacity_ == 0 ? inline_size : capacity_); }
    DIRBASE_HIDDEN void use_block(char* block, unsigned capacity);

    unsigned capacity_;  // size of the heap block, 0 while the text lies inline
    unsigned length_;
    union {
        char inline_[inline_size];
        char* heap_;
    };
};

class DIRBASE_EXPORT csgl_string : public csgl_refcounted_pointer_to<csgl_string_> {
public:
    // Shares the one empty body of the process.
    csgl_string();

    // A new body with a copy of a zero-terminated text; null gives the empty text.
    csgl_string(const char* text);

    // A new body with at most `length` bytes of a text.
    csgl_string(const char* text, unsigned length);

    // Copies share the body. There is no move: a string always has a text.
    csgl_string(const csgl_string&) = default;
    csgl_string& operator=(const csgl_string&) = default;
    ~csgl_string() = default;

    const char* c_str() const { return get()->text(); }
    operator const char*() const { return c_str(); }
    unsigned length() const { return get()->length(); }
    bool empty() const { return length() == 0; }

    // Replaces the text: in place when this handle is alone on its body, else in a new one. The constructor's rules
    // hold.
    void assign(const char* text, unsigned length);

    // Adds at most `length` bytes; all other handles on the body keep the old text.
    csgl_string& append(const char* text, unsigned length);
    csgl_string& append(const csgl_string& other) { return append(other.c_str(), other.length()); }
    csgl_string& append(const char* text);

    // Index of the first `c` at or behind `start`, the terminator included (a search for 0 finds the length), or -1.
    int find(char c, unsigned start = 0) const;

    // Index of the last `c` at or ahead of `start`, or -1. A start at or beyond the length means the length.
    int rfind(char c, unsigned start = 0xffffffff) const;

    // Compares byte by byte with the bytes taken as signed: -1, 0 or 1.
    static int compare(const char* a, const char* b);  // neither null

    friend bool operator==(const csgl_string& a, const csgl_string& b)
    {
        return a.get() == b.get() || compare(a.c_str(), b.c_str()) == 0;
    }
    friend bool operator==(const csgl_string& a, const char* b) { return compare(a.c_str(), b) == 0; }
    friend bool operator<(const csgl_string& a, const csgl_string& b) { return compare(a.c_str(), b.c_str()) < 0; }
    friend bool operator>(const csgl_string& a, const csgl_string& b) { return b < a; }
    friend bool operator<=(const csgl_string& a, const csgl_string& b) { return !(b < a); }
    friend bool operator>=(const csgl_string& a, const csgl_string& b) { return !(a < b); }

    // A new text; neither operand changes, and a null text counts as empty.
    friend DIRBASE_EXPORT csgl_string operator+(const csgl_string& a, const csgl_string& b);
    friend DIRBASE_EXPORT csgl_string operator+(const csgl_string& a, const char* b);
    friend DIRBASE_EXPORT csgl_string operator+(const char* a, const csgl_string& b);

    // Would otherwise step along the text behind the conversion to const char*.
    friend csgl_string operator+(const csgl_string& a, int b) = delete;

private:
    DIRBASE_HIDDEN csgl_string(const char* text1, unsigned length1, const char* text2, unsigned length2);
};

// A text to be written to a csgl_output between quotes; a quote inside the text is doubled.
struct csgl_str_quoted {
    csgl_str_quoted(const csgl_string& quoted_text, char quote_character) : text(quoted_text), quote(quote_character) {}

    const csgl_string& text;
    char quote;
};

// Compares by the C library's tolower of each byte: the difference of the first two lowered bytes that differ, each
// taken as signed, or 0.
DIRBASE_EXPORT int csgl_str_ci_compare(const char* a, const char* b);

// The order of all schema names and OIDs. Containers in this order can be asked for a plain text, without a copy of it.
struct csgl_str_ci_less {
    using is_transparent = void;

    bool operator()(const csgl_string& a, const csgl_string& b) const
    {
        return a.get() != b.get() && csgl_str_ci_compare(a.c_str(), b.c_str()) < 0;
    }
    bool operator()(const csgl_string& a, const char* b) const { return csgl_str_ci_compare(a.c_str(), b) < 0; }
    bool operator()(const char* a, const csgl_string& b) const { return csgl_str_ci_compare(a, b.c_str()) < 0; }
    bool operator()(const char* a, const char* b) const { return csgl_str_ci_compare(a, b) < 0; }
};

// Fills `n` bytes at `p` with zero.
DIRBASE_EXPORT void csgl_str_zero(void* p, unsigned n);

// The length of a text as the strings here count it; raises exc_not_enough_memory_t for one too long for them.
DIRBASE_EXPORT unsigned csgl_str_length(const char* text);
