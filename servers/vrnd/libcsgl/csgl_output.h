// Character sinks and the operators that format values into them.
//
// A stream object belongs to one thread at a time.
#pragma once

#include <cstdint>

#include "servers/vrnd/libcsgl/csgl_string.h"

// The root of all sinks.
class DIRBASE_EXPORT csgl_output {
public:
    // Writes a character `count` times.
    virtual void put_chars(char c, unsigned count) = 0;

    // Hands on what a sink has kept back.
    virtual void flush() = 0;
    virtual ~csgl_output() = default;

    // Writes one character.
    virtual void really_put_char(char c) = 0;

protected:
    csgl_output() = default;
    csgl_output(const csgl_output&) = default;
    csgl_output& operator=(const csgl_output&) = default;
};

// A sink that keeps nothing back.
class DIRBASE_EXPORT csgl_output_imp : public csgl_output {
public:
    void put_chars(char c, unsigned count) override;
    void flush() override {}
};

// A sink that collects bytes in a buffer of the caller and hands on the full buffer by flush.
class DIRBASE_EXPORT csgl_output_buffer_imp : public csgl_output_imp {
public:
    csgl_output_buffer_imp(const csgl_output_buffer_imp&) = delete;
    csgl_output_buffer_imp& operator=(const csgl_output_buffer_imp&) = delete;

    void flush() override = 0;
    void really_put_char(char c) override;

    // Hands on `size` bytes at once and gives the count that was taken.
    virtual unsigned write(void* data, unsigned size) = 0;

protected:
    csgl_output_buffer_imp(char* buffer, unsigned size) : begin_(buffer), current_(buffer), end_(buffer + size) {}

    char* begin_;
    char* current_;
    char* end_;
};

// The same with a buffer of its own.
class DIRBASE_EXPORT csgl_output_buffer_imp_of_512 : public csgl_output_buffer_imp {
protected:
    csgl_output_buffer_imp_of_512() : csgl_output_buffer_imp(buffer_, sizeof(buffer_)) {}

private:
    char buffer_[512];
};

// Appends to a string of the caller, which must outlive the stream. Meant for short texts: every byte makes a new body.
class DIRBASE_EXPORT csgl_output_str : public csgl_output_imp {
public:
    explicit csgl_output_str(csgl_string& target) : target_(&target) {}
    void really_put_char(char c) override;

private:
    csgl_string* target_;
};

// Takes everything and keeps nothing.
class DIRBASE_EXPORT csgl_output_black_hole : public csgl_output_imp {
public:
    void really_put_char(char) override {}
};

// Writes to two streams of the caller, with byte 0 as a line feed in the second, until halt_redirection ends the
// second.
class DIRBASE_EXPORT csgl_output_redirector : public csgl_output_imp {
public:
    csgl_output_redirector(csgl_output& primary, csgl_output& secondary) : primary_(&primary), secondary_(&secondary) {}
    void really_put_char(char c) override;
    void halt_redirection() { secondary_ = nullptr; }

private:
    csgl_output* primary_;
    csgl_output* secondary_;
};

// A source of characters.
class DIRBASE_EXPORT csgl_input {
public:
    // Puts the next character in `c`, or gives false at the end.
    virtual bool get_char(char& c) = 0;
    virtual ~csgl_input() = default;
};

// A number to be written as "0x" and exactly 8 lower-case hexadecimal digits.
struct csgl_hex {
    explicit csgl_hex(std::uint32_t number) : value(number) {}
    std::uint32_t value;
};

// A pointer to be written as exactly 8 lower-case hexadecimal digits of its low 32 bits.
struct csgl_output_voidp_proxy {
    explicit csgl_output_voidp_proxy(const void* address) : value(address) {}
    const void* value;
};

// Write a value and give the stream back. A null text writes nothing.
DIRBASE_EXPORT csgl_output& operator<<(csgl_output& output, const char* text);
DIRBASE_EXPORT csgl_output& operator<<(csgl_output& output, int value);
DIRBASE_EXPORT csgl_output& operator<<(csgl_output& output, long value);
DIRBASE_EXPORT csgl_output& operator<<(csgl_output& output, unsigned value);
DIRBASE_EXPORT csgl_output& operator<<(csgl_output& output, unsigned long value);
DIRBASE_EXPORT csgl_output& operator<<(csgl_output& output, csgl_hex value);
DIRBASE_EXPORT csgl_output& operator<<(csgl_output& output, csgl_output_voidp_proxy value);
DIRBASE_EXPORT csgl_output& operator<<(csgl_output& output, const csgl_str_quoted& value);
DIRBASE_EXPORT csgl_output& operator<<(csgl_output& output, csgl_input& input);

// The number of characters that `value` prints, its sign included.
DIRBASE_EXPORT int csgl_output_length(int value);
