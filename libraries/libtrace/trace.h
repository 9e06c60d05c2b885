// Trace runtime: which events are being traced, and where the trace goes.
//
// Every function may be called from any thread and leaves errno alone; ldtr_init reads the environment, which nobody
// changes meanwhile.
#pragma once

#include <stdint.h>

#ifdef __cplusplus
#include <atomic>
#endif

#include "libraries/dirbase_export.h"

// The classes of trace events.
DIRBASE_NUMBER(uint64_t, LDTR_FLOW, 0x01);   // entry to and exit from functions
DIRBASE_NUMBER(uint64_t, LDTR_DATA, 0x02);   // values on the way
DIRBASE_NUMBER(uint64_t, LDTR_ERROR, 0x04);  // failures

DIRBASE_C_BEGIN

// The mask of active events, 0 when tracing is off. Read before every trace call, so that a call costs one load when
// tracing is off; may be written at any time by any thread.
#ifdef __cplusplus
DIRBASE_EXPORT extern std::atomic<uint64_t> trcEvents;
#else
DIRBASE_EXPORT extern _Atomic(uint64_t) trcEvents;
#endif

// Starts the runtime: takes the mask from the environment variable "LDTR_EVENTS" (a number in C notation; absent or not
// a number means LDTR_ERROR), stores it in trcEvents and returns it. May be called again.
DIRBASE_EXPORT uint64_t ldtr_init(void);

// Writes a text of class `event` in the manner of printf to the trace (standard error, or ldtr_set_file's file), when
// trcEvents holds the class. One call is one uninterrupted write.
DIRBASE_EXPORT void ldtr_write(uint64_t event, const char* format, ...) __attribute__((format(printf, 2, 3)));

// Sends the trace to the end of a file, made with permissions 0640 when it is missing; null goes back to standard
// error. Returns 0, or the errno of the failed open, after which the trace goes where it went.
DIRBASE_EXPORT int ldtr_set_file(const char* path);

DIRBASE_C_END
