// The message log: numbered messages for the administrator, worded by a catalogue.
//
// A message is a component, a severity, an id and its arguments. The catalogue (catalogue.cpp) holds an English text
// for each (component, id); its places are positional ("%1$s"), so a translation may reorder them. The arguments travel
// with their types, so a text that names a place twice, skips one or asks for one that was not given prints something
// sensible and never reads what isn't there. An id that the catalogue doesn't know still prints its component,
// severity, id and arguments.
//
// Every function here may be called from any thread at any time, never throws and leaves errno alone.
#pragma once

#include <stddef.h>
#include <stdint.h>

#include "libraries/dirbase_export.h"

// The severities that messages carry.
enum message_severity DIRBASE_ENUM_INT {
    MSG_INFORMATION = 1,
    MSG_WARNING = 2,
    MSG_ERROR = 4,
    MSG_SEVERE = 8,
};

// Components, each with ids of its own.
enum message_component DIRBASE_ENUM_INT {
    MSG_COMPONENT_SERVER = 0,
    MSG_COMPONENT_OPERATION = 2,
    MSG_COMPONENT_SCHEMA = 4,
    MSG_COMPONENT_RDBM = 7,
};

// One argument of a message. Texts are borrowed for the length of the call; a null text prints as nothing. In C a
// message goes without arguments, and a sink looks at the texts.
typedef struct message_argument message_argument;
#ifdef __cplusplus
struct message_argument {
    enum class kind { text, integer, pointer };

    kind type = kind::text;
    const char* text = nullptr;
    int64_t integer = 0;
    const void* pointer = nullptr;

    message_argument(const char* value) : type(kind::text), text(value) {}
    message_argument(char* value) : type(kind::text), text(value) {}
    message_argument(int value) : type(kind::integer), integer(value) {}
    message_argument(unsigned value) : type(kind::integer), integer(value) {}
    message_argument(long value) : type(kind::integer), integer(value) {}
    message_argument(unsigned long value) : type(kind::integer), integer(static_cast<int64_t>(value)) {}
    message_argument(const void* value) : type(kind::pointer), pointer(value) {}
};
#endif

// A message as a sink sees it. Everything is borrowed for the length of the call.
typedef struct message_record message_record;
struct message_record {
    int component;
    int severity;
    int id;
    const message_argument* arguments;
    size_t argument_count;
    const char* text;  // the catalogue's text with the arguments in their places
    const char* line;  // the whole line with time, severity and id, without a line feed
};

// Takes messages in place of the built-in sinks. Called on the thread that logs, one message at a time under the log's
// own lock: it must not write messages or choose their sink, and must not throw, which ends the process. `context` is
// the pointer given with it. A reference and a pointer are passed alike.
#ifdef __cplusplus
typedef void (*message_sink)(void* context, const message_record& record);
#else
typedef void (*message_sink)(void* context, const message_record* record);
#endif

DIRBASE_C_BEGIN

// Writes one message to the current sink. `arguments` holds `count` arguments, or is null when count is 0.
DIRBASE_EXPORT void PrintMessageArguments(int component, int severity, int id, const message_argument* arguments,
                                          size_t count);

// Renders the text of a message (no time, severity or id) into `buffer`, cut to at most size - 1 bytes and always
// zero-terminated when size is above 0. A cut never splits a UTF-8 character. Returns the length of the uncut text.
DIRBASE_EXPORT size_t getPrintedMessageArguments(char* buffer, size_t size, int component, int severity, int id,
                                                 const message_argument* arguments, size_t count);

// Chooses where messages go: a function, or with a null function back to standard error, the sink at start. An open
// file is closed. When it returns the old function isn't called any more, and its context may go.
DIRBASE_EXPORT void set_message_sink(message_sink sink, void* context);

// Sends messages to the end of a file, made with permissions 0640 when it is missing. Returns 0, or the errno of the
// failed open (EINVAL for a null path), after which the sink is as it was.
DIRBASE_EXPORT int set_message_file(const char* path);

DIRBASE_C_END

#ifdef __cplusplus

// Writes the message (component, severity, id) with its arguments: texts, integers and pointers.
template <typename... Arguments>
void PrintMessage(int component, int severity, int id, const Arguments&... arguments)
{
    if constexpr (sizeof...(arguments) == 0) {
        PrintMessageArguments(component, severity, id, nullptr, 0);
    } else {
        const message_argument list[] = {message_argument(arguments)...};
        PrintMessageArguments(component, severity, id, list, sizeof...(arguments));
    }
}

// Renders the same message into a buffer; see getPrintedMessageArguments.
template <typename... Arguments>
size_t getPrintedMessage(char* buffer, size_t size, int component, int severity, int id, const Arguments&... arguments)
{
    if constexpr (sizeof...(arguments) == 0) {
        return getPrintedMessageArguments(buffer, size, component, severity, id, nullptr, 0);
    } else {
        const message_argument list[] = {message_argument(arguments)...};
        return getPrintedMessageArguments(buffer, size, component, severity, id, list, sizeof...(arguments));
    }
}

// Reports that memory ran out: the message every module uses for it. Allocates nothing.
inline void message_no_memory()
{
    PrintMessageArguments(MSG_COMPONENT_SERVER, MSG_SEVERE, 7, nullptr, 0);
}

#endif
