// A line of free text, in the manner of printf, for the debug log and the trace. Private to the logs.
#pragma once

#include <cstdarg>
#include <cstddef>
#include <cstdio>
#include <string_view>

#include "libraries/libmsg/log_sink.h"
#include "libraries/libmsg/message_format.h"

// Formats a text once and makes a log line of it: time, `word`, and the text with its last line feed dropped and every
// other control byte escaped. Short texts stay on the stack; a long one is cut when there is no memory for it.
class free_line {
public:
    free_line(std::string_view word, const char* format, va_list arguments)
    {
        text_ =
            text_space_.fill([&](char* buffer, std::size_t size) { return print(buffer, size, format, arguments); });

        std::string_view text = text_.view();
        if (!text.empty() && text.back() == '\n')
            text.remove_suffix(1);
        const std::timespec now = current_time();
        line_ = line_space_.fill([&](char* buffer, std::size_t size) {
            bounded_text out(buffer, size);
            put_local_time(out, now);
            out.put(' ');
            out.put(word);
            out.put(' ');
            put_on_one_line(out, text);
            return out.finish();
        });
    }

    // The text as formatted, zero-terminated.
    const char* text() const { return text_.data; }

    // The line without its line feed; see log_output::write.
    const built_text& line() const { return line_; }

private:
    // A format that can't be carried out (a wide character without an encoding) stands for itself: better than nothing.
    static std::size_t print(char* buffer, std::size_t size, const char* format, va_list arguments)
    {
        va_list copy;
        va_copy(copy, arguments);
        int length = std::vsnprintf(buffer, size, format, copy);
        va_end(copy);
        if (length < 0)
            length = std::snprintf(buffer, size, "%s", format);
        return length < 0 ? 0 : static_cast<std::size_t>(length);
    }

    scratch_text<1024> text_space_;
    scratch_text<1280> line_space_;
    built_text text_ = {};
    built_text line_ = {};
};
