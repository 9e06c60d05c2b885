// The allocation and comparison services of plug-ins: the C library under the names that plug-ins know.
//
// Plug-ins and the library may release each other's memory, whichever family made it. Any thread may call any of them.
#pragma once

#include <stddef.h>

#include "libraries/dirbase_export.h"

DIRBASE_C_BEGIN

// As malloc, calloc and realloc: null when memory ran out, and a failed realloc leaves the block as it was.
DIRBASE_EXPORT void* slapi_ch_malloc(size_t size);
DIRBASE_EXPORT void* slapi_ch_calloc(size_t count, size_t size);
DIRBASE_EXPORT void* slapi_ch_realloc(void* block, size_t size);

// Releases a block; null does nothing.
DIRBASE_EXPORT void slapi_ch_free(void* block);

// Returns a copy of `text` for the caller to free, or null when `text` is null or memory ran out.
DIRBASE_EXPORT char* slapi_ch_strdup(const char* text);

// As strcmp and strncmp; the texts must not be null.
DIRBASE_EXPORT int slapi_ch_strcmp(const char* a, const char* b);
DIRBASE_EXPORT int slapi_ch_strncmp(const char* a, const char* b, size_t length);

DIRBASE_C_END
