// The debug log: free text for the developer, off until a level is set.
//
// The level is a mask of classes. PrintDebug writes a text when its class meets the mask; the helpers below stand in
// front of it so that nothing is formatted while the log is off. Every function may be called from any thread, never
// throws and leaves errno alone.
#pragma once

#include <stdbool.h>

#include "libraries/dirbase_export.h"

// The classes of debug texts.
DIRBASE_NUMBER(unsigned, LDAP_DEBUG_TRACE, 0x00000001u);    // what happens, step by step
DIRBASE_CONSTANT(unsigned, LDAP_DEBUG_ERROR, 0xC8110000u);  // something failed

// Takes debug texts in place of the built-in sinks. Called on the thread that logs, one text at a time under the log's
// own lock: it must not write debug texts or choose their sink, and must not throw, which ends the process. `text` is
// borrowed for the call and is as the caller formatted it, line feed included.
typedef void (*debug_sink)(void* context, unsigned level, const char* text);

DIRBASE_C_BEGIN

// The current mask; 0, the value at start, turns the log off.
DIRBASE_EXPORT unsigned read_ldap_debug(void);
DIRBASE_EXPORT void write_ldap_debug(unsigned level);

// Writes a text of class `level` in the manner of printf; nothing happens when the class is not in the mask.
DIRBASE_EXPORT void PrintDebug(unsigned level, const char* format, ...) __attribute__((format(printf, 2, 3)));

// Chooses where debug texts go: a function, or with a null function back to standard error, the sink at start. An open
// file is closed. When it returns the old function isn't called any more, and its context may go.
DIRBASE_EXPORT void set_debug_sink(debug_sink sink, void* context);

// Sends debug texts to the end of a file, made with permissions 0640 when it is missing. Returns 0, or the errno of the
// failed open (EINVAL for a null path), after which the sink is as it was.
DIRBASE_EXPORT int set_debug_file(const char* path);

DIRBASE_C_END

// A failure, told at the place that knows: debug_error("Error - dn_check: %s\n", text). By custom an error text begins
// with "Error - " and ends with a line feed.
#define debug_error(...)                                 \
    do {                                                 \
        if ((read_ldap_debug() & LDAP_DEBUG_ERROR) != 0) \
            PrintDebug(LDAP_DEBUG_ERROR, __VA_ARGS__);   \
    } while (false)

// A step worth following.
#define debug_trace(...)                                 \
    do {                                                 \
        if ((read_ldap_debug() & LDAP_DEBUG_TRACE) != 0) \
            PrintDebug(LDAP_DEBUG_TRACE, __VA_ARGS__);   \
    } while (false)
