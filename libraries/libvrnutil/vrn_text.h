// Portable text helpers: what the C library offers under different names, or not at all, on the platforms of the
// server. Only vrn_strcasecmp takes null texts.
#pragma once

#include <stdarg.h>
#include <stddef.h>

#include "libraries/dirbase_export.h"

DIRBASE_C_BEGIN

// As snprintf and vsnprintf: at most size - 1 bytes and a terminator; the result is the length of the uncut text, or
// negative when the format can't be carried out.
DIRBASE_EXPORT int vrn_snprintf(char* buffer, size_t size, const char* format, ...)
    __attribute__((format(printf, 3, 4)));
DIRBASE_EXPORT int vrn_vsnprintf(char* buffer, size_t size, const char* format, va_list arguments);

// Formats into a new text of the right size, put in *text for the caller to free(). Returns its length, or -1 with
// *text null when memory ran out or the format can't be carried out.
DIRBASE_EXPORT int vrn_asprintf(char** text, const char* format, ...) __attribute__((format(printf, 2, 3)));

// Copies, or appends, as much of `from` as fits a buffer of `size` bytes and terminates it (size above 0). The result
// is the length that the whole text would have had, so a result of size or more means that it was cut. vrn_strlcat
// leaves a buffer alone that holds no terminator within size.
DIRBASE_EXPORT size_t vrn_strlcpy(char* to, const char* from, size_t size);
DIRBASE_EXPORT size_t vrn_strlcat(char* to, const char* from, size_t size);

// Compares two texts with A to Z taken as a to z and all other bytes as they are, whatever the locale: below, equal to
// or above 0. A null text sorts ahead of all others.
DIRBASE_EXPORT int vrn_strcasecmp(const char* a, const char* b);

DIRBASE_C_END
