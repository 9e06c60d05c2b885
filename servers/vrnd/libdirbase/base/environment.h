// Settings of the server that are in the process's environment.
#pragma once

#include <cerrno>

#include "libraries/libber/ldap_env.h"
#include "libraries/libmsg/message_log.h"
#include "servers/vrnd/libdirbase/base/heap.h"

// The value of a variable, or null when it isn't set. Where memory ran out, the message log is told, since the caller
// will keep the answer for the life of the process.
inline heap_text environment_value(const char* name)
{
    const int before = errno;
    errno = 0;
    heap_text value(ldap_getenv(name));
    if (value == nullptr && errno == ENOMEM) {
        message_no_memory();
    } else {
        errno = before;
    }
    return value;
}
