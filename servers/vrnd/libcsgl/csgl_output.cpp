// Character sinks and formatting: see csgl_output.h.
#include "servers/vrnd/libcsgl/csgl_output.h"

#include <charconv>
#include <cstdint>

namespace {

constexpr char hex_digits[] = "0123456789abcdef";

template <typename Number>
csgl_output& put_number(csgl_output& output, Number value)
{
    char text[24] = {};  // a 64-bit number has at most 20 characters
    std::to_chars(text, text + sizeof(text) - 1, value);
    return output << text;
}

void put_hex(csgl_output& output, std::uint32_t value)
{
    for (int shift = 28; shift >= 0; shift -= 4) {
        output.really_put_char(hex_digits[(value >> shift) & 0xf]);
    }
}

}  // namespace

void csgl_output_imp::put_chars(char c, unsigned count)
{
    for (; count > 0; --count) {
        really_put_char(c);
    }
}

void csgl_output_buffer_imp::really_put_char(char c)
{
    if (current_ == end_) {
        flush();
    }
    *current_++ = c;
}

void csgl_output_str::really_put_char(char c)
{
    const char text[] = {c, '\0'};
    *target_ = *target_ + text;
}

void csgl_output_redirector::really_put_char(char c)
{
    primary_->really_put_char(c);
    if (secondary_ != nullptr) {
        secondary_->really_put_char(c == '\0' ? '\n' : c);
    }
}

csgl_output& operator<<(csgl_output& output, const char* text)
{
    for (; text != nullptr && *text != '\0'; ++text) {
        output.really_put_char(*text);
    }
    return output;
}

csgl_output& operator<<(csgl_output& output, int value)
{
    return put_number(output, value);
}

csgl_output& operator<<(csgl_output& output, long value)
{
    return put_number(output, value);
}

csgl_output& operator<<(csgl_output& output, unsigned value)
{
    return put_number(output, value);
}

csgl_output& operator<<(csgl_output& output, unsigned long value)
{
    return put_number(output, value);
}

csgl_output& operator<<(csgl_output& output, csgl_hex value)
{
    output << "0x";
    put_hex(output, value.value);
    return output;
}

csgl_output& operator<<(csgl_output& output, csgl_output_voidp_proxy value)
{
    put_hex(output, static_cast<std::uint32_t>(reinterpret_cast<std::uintptr_t>(value.value)));
    return output;
}

csgl_output& operator<<(csgl_output& output, const csgl_str_quoted& value)
{
    output.really_put_char(value.quote);
    for (const char* text = value.text.c_str(); *text != '\0'; ++text) {
        if (*text == value.quote) {
            output.really_put_char(value.quote);
        }
        output.really_put_char(*text);
    }
    output.really_put_char(value.quote);
    return output;
}

csgl_output& operator<<(csgl_output& output, csgl_input& input)
{
    for (char c; input.get_char(c);) {
        output.really_put_char(c);
    }
    return output;
}

int csgl_output_length(int value)
{
    char text[24];
    return static_cast<int>(std::to_chars(text, text + sizeof(text), value).ptr - text);
}
