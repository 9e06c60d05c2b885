// Environment look-up of the client library.
#pragma once

#include "libraries/dirbase_export.h"

DIRBASE_C_BEGIN

// Returns a copy of the value of an environment variable for the caller to free() (an empty text for an empty value),
// or null: when memory ran out errno is ENOMEM, and when the variable is not set, or name is null, errno is as it was.
// Callers ask once and keep the answer: a look-up that meets another thread's setenv is not safe, as with getenv
// itself.
DIRBASE_EXPORT char* ldap_getenv(const char* name);

DIRBASE_C_END
