// Reading lines of LDIF: see line64.h and line_parts.h.
//
// The scans for line feeds, colons and markers are left to the C library, which looks at many bytes at a time; what
// they found is handed on, and a line without folds is never moved.
#include <cstring>

#include "libraries/libldif/line64.h"
#include "libraries/libldif/line_parts.h"
#include "libraries/libmsg/debug_log.h"

namespace {

bool is_white_space(char c)
{
    return c == ' ' || (c >= '\t' && c <= '\r');
}

// The next line feed, or the zero byte at the end. Where that is isn't known, so the search goes on by a window at a
// time.
char* find_line_feed(char* from)
{
    constexpr std::size_t window = 128;
    for (;; from += window) {
        const std::size_t length = strnlen(from, window);
        auto* const found = static_cast<char*>(std::memchr(from, '\n', length));
        if (found != nullptr) {
            return found;
        }
        if (length < window) {
            return from + length;
        }
    }
}

// Takes a line off a text in which a function finds the next line feed, or the zero byte at the end.
template <typename Find>
bool take_line(char** next, ldif_line& line, Find find_end)
{
    char* const begin = *next;
    if (begin == nullptr || *begin == '\0' || *begin == '\n') {
        return false;
    }
    line.begin = begin;
    line.folded = false;
    char* at = find_end(begin);
    while (*at != '\0') {
        if (!is_white_space(at[1]) || at[1] == '\n') {
            *at = '\0';
            *next = at + 1;
            line.end = at;
            return true;
        }
        at[0] = ldif_fold_marker;
        at[1] = ldif_fold_marker;
        line.folded = true;
        at = find_end(at + 2);
    }
    *next = nullptr;
    line.end = at;
    return true;
}

}  // namespace

bool ldif_take_line(char** next, char* end, ldif_line& line)
{
    return take_line(next, line, [end](char* from) {
        auto* const found = static_cast<char*>(std::memchr(from, '\n', static_cast<std::size_t>(end - from)));
        return found == nullptr ? end : found;
    });
}

bool ldif_has_marker(const char* text, const char* end)
{
    return std::memchr(text, ldif_fold_marker, static_cast<std::size_t>(end - text)) != nullptr;
}

char* ldif_remove_folds(char* text, char* end)
{
    char* to = text;
    while (text < end) {
        auto* const found =
            static_cast<char*>(std::memchr(text, ldif_fold_marker, static_cast<std::size_t>(end - text)));
        char* const stop = found == nullptr ? end : found;
        if (to != text) {
            std::memmove(to, text, static_cast<std::size_t>(stop - text));
        }
        to += stop - text;
        text = stop + 1;
    }
    *to = '\0';
    return to;
}

int ldif_split_line(char* line, char* end, int mode, bool marked, ldif_parts& parts)
{
    parts = {};
    // Markers fall away, so blanks at the ends of the type are looked for beyond them, too.
    const auto is_marker = [marked](char c) { return marked && c == ldif_fold_marker; };
    while (is_white_space(*line) || is_marker(*line)) {
        ++line;
    }
    auto* const colon = static_cast<char*>(std::memchr(line, ':', static_cast<std::size_t>(end - line)));
    if (colon == nullptr) {
        debug_error("parse_line missing ':'\n");
        return LDIF_LINE_BAD;
    }
    char* type_end = colon;
    while (type_end > line && (type_end[-1] == ' ' || is_marker(type_end[-1]))) {
        --type_end;
    }
    *type_end = '\0';
    if (marked) {
        type_end = ldif_remove_folds(line, type_end);
    }
    parts.type = line;
    parts.type_length = static_cast<std::size_t>(type_end - line);

    char* value = colon + 1;
    parts.is_base64 = *value == ':';
    parts.is_url = *value == '<';
    if (parts.is_base64 || parts.is_url) {
        ++value;
    }
    if (*value == ' ') {
        ++value;
        while (mode != LDIF_MODE_ENTRY && *value == ' ') {
            ++value;
        }
    }
    if (*value == '\t' || *value == '\v' || *value == '\f') {
        debug_trace("parse_line: the value of %s begins with white space 0x%x\n", line, static_cast<unsigned>(*value));
    }
    if (value == end && !parts.is_base64) {
        debug_error("parse_line missing value- setting length=0\n");
        parts.value = end;
        return LDIF_LINE_EMPTY;
    }
    if (marked) {
        end = ldif_remove_folds(value, end);
    }
    if (mode == LDIF_MODE_TRIMMED) {
        while (end > value && is_white_space(end[-1])) {
            --end;
        }
        *end = '\0';
    }
    parts.length = static_cast<std::size_t>(end - value);
    if (parts.is_base64 && base64decode(value, value, &parts.length) != 0) {
        return LDIF_LINE_BAD;
    }
    parts.value = value;
    return LDIF_LINE_OK;
}

extern "C" {

char* str_getline(char** next)
{
    ldif_line line;
    return next != nullptr && take_line(next, line, find_line_feed) ? line.begin : nullptr;
}

char* str_remove_continued_line_marker(char* text, int* removed)
{
    char* at = text == nullptr ? nullptr : std::strchr(text, ldif_fold_marker);
    if (at == nullptr) {
        return text;
    }
    char* to = at;
    for (; *at != '\0'; ++at) {
        if (*at != ldif_fold_marker) {
            *to++ = *at;
        }
    }
    *to = '\0';
    if (removed != nullptr) {
        *removed += static_cast<int>(at - to);
    }
    return text;
}

int str_parse_line_v_or_bv(char* line, char** type, char** value, std::size_t* length, int mode, int* is_url,
                           int* is_base64)
{
    ldif_parts parts = {};
    int result = LDIF_LINE_BAD;
    if (line != nullptr) {
        char* end = line + std::strlen(line);
        for (char* fold = std::strstr(line, "\n "); fold != nullptr; fold = std::strstr(fold + 2, "\n ")) {
            fold[0] = ldif_fold_marker;
            fold[1] = ldif_fold_marker;
        }
        result = ldif_split_line(line, end, mode, ldif_has_marker(line, end), parts);
    }
    *type = parts.type;
    *value = parts.value;
    *length = parts.length;
    if (is_url != nullptr) {
        *is_url = parts.is_url ? 1 : 0;
    }
    if (is_base64 != nullptr) {
        *is_base64 = parts.is_base64 ? 1 : 0;
    }
    return result;
}

int str_parse_line(char* line, char** type, char** value, std::size_t* length, int mode, int* is_url)
{
    return str_parse_line_v_or_bv(line, type, value, length, mode, is_url, nullptr);
}

}  // extern "C"
