// Counted values: a length and bytes, the form in which values travel between the client layer and the server.
//
// Records, bytes and arrays are blocks of malloc. A null-terminated array of pointers holds the values of an attribute.
#pragma once

#include "libraries/dirbase_export.h"

typedef struct berval berval;
struct berval {
    unsigned long bv_len;  // bytes, without a terminator
    char* bv_val;
};

DIRBASE_C_BEGIN

// Returns a copy for the caller to release with ber_bvfree; null when `value` is null or memory ran out (errno is
// ENOMEM then). The copy always has bytes, followed by a zero byte that doesn't count; a value whose bv_val is null is
// copied as the empty one.
DIRBASE_EXPORT berval* ber_bvdup(const berval* value);

// Release a value with its bytes, and a null-terminated array with its values. Null does nothing.
DIRBASE_EXPORT void ber_bvfree(berval* value);
DIRBASE_EXPORT void ber_bvecfree(berval** values);

DIRBASE_C_END
