// Portable text helpers.
#include "libraries/libvrnutil/vrn_text.h"

#include <algorithm>
#include <cstdio>
#include <cstring>

namespace {

// A to Z to a to z; every other byte stays.
constexpr int fold(char byte)
{
    const int value = static_cast<unsigned char>(byte);
    return value >= 'A' && value <= 'Z' ? value - 'A' + 'a' : value;
}

}  // namespace

extern "C" {

int vrn_vsnprintf(char* buffer, std::size_t size, const char* format, va_list arguments)
{
    return std::vsnprintf(buffer, size, format, arguments);
}

int vrn_snprintf(char* buffer, std::size_t size, const char* format, ...)
{
    va_list arguments;
    va_start(arguments, format);
    const int length = std::vsnprintf(buffer, size, format, arguments);
    va_end(arguments);
    return length;
}

int vrn_asprintf(char** text, const char* format, ...)
{
    va_list arguments;
    va_start(arguments, format);
    const int length = ::vasprintf(text, format, arguments);
    va_end(arguments);
    if (length < 0)
        *text = nullptr;  // the C library leaves it undefined
    return length < 0 ? -1 : length;
}

std::size_t vrn_strlcpy(char* to, const char* from, std::size_t size)
{
    const std::size_t length = std::strlen(from);
    if (size > 0) {
        const std::size_t fits = std::min(length, size - 1);
        std::memcpy(to, from, fits);
        to[fits] = '\0';
    }
    return length;
}

std::size_t vrn_strlcat(char* to, const char* from, std::size_t size)
{
    const std::size_t used = ::strnlen(to, size);
    if (used == size)
        return size + std::strlen(from);
    return used + vrn_strlcpy(to + used, from, size - used);
}

int vrn_strcasecmp(const char* a, const char* b)
{
    if (a == nullptr || b == nullptr)
        return static_cast<int>(a != nullptr) - static_cast<int>(b != nullptr);
    for (; fold(*a) == fold(*b); ++a, ++b) {
        if (*a == '\0')
            return 0;
    }
    return fold(*a) - fold(*b);
}

}  // extern "C"
