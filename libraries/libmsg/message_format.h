// Text building for the logs: bounded output, positional places, and lines that hostile input can't forge.
//
// Everything here writes into a buffer that the caller owns, allocates nothing, and counts on when the buffer is full,
// so that the caller learns how much room the whole would have taken.
#pragma once

#include <charconv>
#include <cstddef>
#include <cstdint>
#include <ctime>
#include <string_view>

#include "libraries/libmsg/message_log.h"

// A zero-terminated text under construction in a buffer of fixed size.
class bounded_text {
public:
    bounded_text(char* buffer, std::size_t size) : buffer_(buffer), size_(buffer == nullptr ? 0 : size) {}

    void put(char byte)
    {
        if (length_ < size_)
            buffer_[length_] = byte;
        ++length_;
    }

    void put(std::string_view text)
    {
        for (const char byte : text)
            put(byte);
    }

    // Decimal, with zeros in front up to `width` digits.
    void put_number(std::int64_t number, std::size_t width = 0)
    {
        char digits[24];
        const char* end = std::to_chars(digits, digits + sizeof digits, number).ptr;
        std::string_view text(digits, static_cast<std::size_t>(end - digits));
        if (number < 0) {
            put('-');
            text.remove_prefix(1);
        }
        for (std::size_t have = text.size(); have < width; ++have)
            put('0');
        put(text);
    }

    // Hexadecimal in lower case, with zeros in front up to `width` digits.
    void put_hex(std::uint64_t number, std::size_t width = 0)
    {
        char digits[24];
        const char* end = std::to_chars(digits, digits + sizeof digits, number, 16).ptr;
        const std::string_view text(digits, static_cast<std::size_t>(end - digits));
        for (std::size_t have = text.size(); have < width; ++have)
            put('0');
        put(text);
    }

    // Terminates the text, cut to the buffer at the end of a UTF-8 character, and returns the length of the uncut text.
    std::size_t finish()
    {
        if (size_ == 0)
            return length_;
        std::size_t end = length_;
        if (length_ >= size_) {
            end = size_ - 1;  // the byte there is the first that falls away
            std::size_t lead = end;
            for (int back = 0; back < 3 && lead > 0 && is_continuation(buffer_[lead]); ++back)
                --lead;
            if ((static_cast<unsigned char>(buffer_[lead]) & 0xC0u) == 0xC0u)
                end = lead;
        }
        buffer_[end] = '\0';
        return length_;
    }

private:
    static bool is_continuation(char byte) { return (static_cast<unsigned char>(byte) & 0xC0u) == 0x80u; }

    char* buffer_;
    std::size_t size_;
    std::size_t length_ = 0;
};

inline void put_argument(bounded_text& out, const message_argument& argument)
{
    switch (argument.type) {
    case message_argument::kind::text:
        if (argument.text != nullptr)
            out.put(std::string_view(argument.text));
        break;
    case message_argument::kind::integer: out.put_number(argument.integer); break;
    case message_argument::kind::pointer:
        out.put("0x");
        out.put_hex(reinterpret_cast<std::uintptr_t>(argument.pointer));
        break;
    }
}

// One place of a pattern, "%N$s" or "%N$d", at the front of `text`.
struct message_place {
    std::size_t number = 0;  // from 1; 0 when there is no place
    std::size_t length = 0;  // of the place in the pattern
};

constexpr message_place read_place(std::string_view text)
{
    if (text.empty() || text[0] != '%')
        return {};
    std::size_t number = 0;
    std::size_t at = 1;
    for (; at < text.size() && at <= 3 && text[at] >= '0' && text[at] <= '9'; ++at)
        number = number * 10 + static_cast<std::size_t>(text[at] - '0');
    if (number == 0 || at + 1 >= text.size() || text[at] != '$' || (text[at + 1] != 's' && text[at + 1] != 'd'))
        return {};
    return {number, at + 2};
}

// Puts the pattern with the arguments in its places. An argument prints by its own type, whichever letter the place
// has; a place without an argument prints nothing; "%%" prints one percent sign; any other percent sign stands for
// itself.
inline void put_pattern(bounded_text& out, std::string_view pattern, const message_argument* arguments,
                        std::size_t count)
{
    while (!pattern.empty()) {
        if (const message_place place = read_place(pattern); place.number != 0) {
            if (place.number <= count)
                put_argument(out, arguments[place.number - 1]);
            pattern.remove_prefix(place.length);
            continue;
        }
        const bool percent = pattern.substr(0, 2) == "%%";
        out.put(pattern[0]);
        pattern.remove_prefix(percent ? 2 : 1);
    }
}

// Puts a text so that it can't leave its line or move a terminal's cursor: a line feed as \n, any other control byte,
// and the control characters U+0080 to U+009F in their UTF-8 form, as \xNN.
inline void put_on_one_line(bounded_text& out, std::string_view text)
{
    const auto put_escaped = [&out](unsigned char byte) {
        out.put("\\x");
        out.put_hex(byte, 2);
    };
    for (std::size_t at = 0; at < text.size(); ++at) {
        const auto byte = static_cast<unsigned char>(text[at]);
        const unsigned next = at + 1 < text.size() ? static_cast<unsigned char>(text[at + 1]) : 0u;
        if (byte == '\n') {
            out.put("\\n");
        } else if (byte < 0x20 || byte == 0x7F) {
            put_escaped(byte);
        } else if (byte == 0xC2 && next >= 0x80 && next <= 0x9F) {
            put_escaped(byte);
            put_escaped(static_cast<unsigned char>(next));
            ++at;
        } else {
            out.put(text[at]);
        }
    }
}

// Puts a moment as local time with milliseconds and zone in the basic zone form of ISO 8601:
// 2026-11-22T20:15:03.123+0000.
inline void put_local_time(bounded_text& out, const std::timespec& moment)
{
    std::tm parts = {};
    char text[40];
    if (localtime_r(&moment.tv_sec, &parts) == nullptr) {
        out.put_number(moment.tv_sec);  // a year beyond the calendar: seconds still order the lines
        return;
    }
    out.put(std::string_view(text, std::strftime(text, sizeof text, "%Y-%m-%dT%H:%M:%S", &parts)));
    out.put('.');
    out.put_number(moment.tv_nsec / 1000000, 3);
    out.put(std::string_view(text, std::strftime(text, sizeof text, "%z", &parts)));
}

inline std::timespec current_time()
{
    std::timespec now = {};
    clock_gettime(CLOCK_REALTIME, &now);
    return now;
}
