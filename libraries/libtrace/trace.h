// Trace runtime: which events are being traced, and where the trace goes.
#pragma once

#include <atomic>
#include <cstdint>

#include "libraries/dirbase_export.h"

// The classes of trace events.
constexpr std::uint64_t LDTR_FLOW = 0x01;   // entry to and exit from functions
constexpr std::uint64_t LDTR_DATA = 0x02;   // values on the way
constexpr std::uint64_t LDTR_ERROR = 0x04;  // failures

extern "C" {

// The mask of active events, 0 when tracing is off. Read before every trace call, so that a call costs one load when
// tracing is off; may be written at any time by any thread.
DIRBASE_EXPORT extern std::atomic<std::uint64_t> trcEvents;

// Starts the runtime: takes the mask from the environment variable "LDTR_EVENTS" (a number in C notation; absent or not
// a number means LDTR_ERROR), stores it in trcEvents and returns it. May be called again.
DIRBASE_EXPORT std::uint64_t ldtr_init(void);

// Writes a text of class `event` in the manner of printf to the trace (standard error, or ldtr_set_file's file), when
// trcEvents holds the class. One call is one uninterrupted write.
DIRBASE_EXPORT void ldtr_write(std::uint64_t event, const char* format, ...) __attribute__((format(printf, 2, 3)));

// Sends the trace to the end of a file, made with permissions 0640 when it is missing; null goes back to standard
// error. Returns 0, or the errno of the failed open, after which the trace goes where it went.
DIRBASE_EXPORT int ldtr_set_file(const char* path);

}  // extern "C"
