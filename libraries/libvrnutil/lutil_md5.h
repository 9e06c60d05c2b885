// MD5 (RFC 1321), by the platform's digest library. It tells texts apart and serves for identifiers; it protects
// nothing.
#pragma once

#include <stddef.h>

#ifndef __cplusplus
#include <stdalign.h>
#endif

#include "libraries/dirbase_export.h"

// A digest being made. The room is the digest library's; a context may be dropped at any time.
typedef struct lutil_MD5Context lutil_MD5Context;
struct lutil_MD5Context {
    alignas(8) unsigned char room[96];
};

DIRBASE_C_BEGIN

// Begins a digest.
DIRBASE_EXPORT void lutil_MD5Init(lutil_MD5Context* context);

// Adds `length` bytes to a digest that was begun. `data` may be null when length is 0.
DIRBASE_EXPORT void lutil_MD5Update(lutil_MD5Context* context, const unsigned char* data, size_t length);

// Ends a digest and writes its 16 bytes. The context needs lutil_MD5Init before it is used again.
DIRBASE_EXPORT void lutil_MD5Final(unsigned char digest[16], lutil_MD5Context* context);

DIRBASE_C_END
