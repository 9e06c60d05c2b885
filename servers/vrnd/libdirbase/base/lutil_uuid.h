// Random bytes for identifiers, and the identifiers that the server stamps on entries.
//
// An identifier has the form of a time-based UUID (RFC 4122, version 1) and is unique for its purpose, though not built
// letter by letter as the RFC has it: its time is in whole seconds, its clock sequence steps with every identifier, and
// its node address is random with the top bit of the first byte set. The sequence shows in 13 bits, so a process can
// make 8192 identifiers in a second before one comes again.
//
// A process that forks gives its child the node address and the sequence that it has: the child must not make
// identifiers unless it runs another program first.
//
// Every function may be called from any thread at any time.
#pragma once

#include <stddef.h>

#include "libraries/dirbase_export.h"

DIRBASE_C_BEGIN

// Fills a buffer with bytes that differ from call to call, thread to thread and process to process. They are made of
// counters, addresses and the time by MD5 and can be guessed: never use them as a key, a salt or a password.
//
//   buffer  takes `size` bytes. What it holds before enters into the result, so it needs a value.
//
// Returns 0. A size of 0 does nothing.
DIRBASE_EXPORT int lutil_entropy(unsigned char* buffer, size_t size);

// Returns the 6 bytes of this process's node address. They are made at the first call and stay the same, and belong to
// this module.
DIRBASE_EXPORT unsigned char* lutil_eaddr(void);

// Writes a new identifier as text: 36 characters, such as 1b21dd21-4a3c-1006-8a5f-f03c91d2a6b4, and a terminator.
//
// Returns the length, 36, or 0 when `size` bytes can't hold text and terminator: the buffer is left alone.
DIRBASE_EXPORT size_t lutil_uuidstr(char* buffer, size_t size);

DIRBASE_C_END
