// The message inside an exception: a readable sentence and a list of catalogue parameters in one text.
//
// A message is given with markers. "[p[" and "]p]" stand around a parameter, which also stays part of the sentence.
// "[v[" and "]v]" at the very start set a variable part aside, and "[v[=v=VAR=v=]v]" puts it into the sentence as a
// parameter. So "[v['a b']v]expected [p[oid]p] at [v[=v=VAR=v=]v]" reads: expected oid at 'a b', with the parameters
// oid and 'a b'.
#pragma once

#include "servers/vrnd/libcsgl/csgl_refcounted.h"

// The body. It holds all its texts in one block of three areas: the sentence, the parameters, the catalogue's
// rendering.
class DIRBASE_EXPORT csgl_message_ : public csgl_refcounted<csgl_message_> {
public:
    static constexpr int parameter_limit = 10;

    csgl_message_() = default;
    ~csgl_message_();
    csgl_message_(const csgl_message_&) = delete;
    csgl_message_& operator=(const csgl_message_&) = delete;

    // Takes a message apart. `text` holds at most `length` bytes (null counts as empty) and is copied; `file`, which is
    // kept, must outlive the message or its use. Raises exc_not_enough_memory_t.
    void init(const char* text, unsigned length, int number, const char* file, int line);

    // The same, but false when memory ran out.
    bool try_init(const char* text, unsigned length, int number, const char* file, int line) noexcept;

    // Writes the message to the message log and keeps its rendering, unless the number is 0. A number below 0 names a
    // catalogue text with the parameters alone, one above 0 a text with place and line ahead of them. Called once,
    // after the message was taken apart.
    void log(int severity, int catalogue);

    const char* text() const { return text_; }
    const char* variable() const { return variable_; }
    const char* printed() const { return printed_; }
    int number() const { return number_; }
    int line() const { return line_; }
    const char* file() const { return file_; }
    int parameter_count() const { return parameter_count_; }

    // From 0 to parameter_limit - 1; null from parameter_count() on.
    const char* parameter(int index) const { return parameters_[index]; }

    // The unit of a block's size for `n` bytes.
    static std::size_t allocation_size(std::size_t n);

private:
    DIRBASE_HIDDEN void take_apart(const char* text, const char* end) noexcept;
    DIRBASE_HIDDEN void add_parameter(const char* start) noexcept;

    unsigned block_size_ = 0;
    int number_ = 0;
    int line_ = 0;
    int parameter_count_ = 0;
    const char* file_ = nullptr;
    char* text_ = nullptr;      // the sentence; start of the block
    char* variable_ = nullptr;  // the variable part, then the parameters
    char* printed_ = nullptr;   // the catalogue's rendering; null when it could not be found behind its place
    const char* parameters_[parameter_limit] = {};
};

class DIRBASE_EXPORT csgl_message : public csgl_refcounted_pointer_to<csgl_message_> {
public:
    // No message: all texts are empty.
    csgl_message() = default;

    // Takes the message apart; see csgl_message_::init.
    csgl_message(const char* text, int number, const char* file, int line);

    // The same, but no message when memory ran out; `text` isn't null.
    static csgl_message make_or_none(const char* text, int number, const char* file, int line) noexcept;

    // The sentence without markers.
    const char* text() const { return get() == nullptr ? "" : get()->text(); }

    // The catalogue's rendering; empty when the message has no number or no rendering.
    const char* printed() const { return get() == nullptr || get()->printed() == nullptr ? "" : get()->printed(); }
};

// A message id is a message number, or with bit 30 of its magnitude set a catalogue (bits 16 to 29) and a number (bits
// 0 to 15). Its sign goes with the number. Without a catalogue of its own an id belongs to the schema's, 4.
DIRBASE_EXPORT int csgl_get_catid(int id);
DIRBASE_EXPORT int csgl_get_msgid(int id);
