// The debug log: a mask, and a sink for the texts whose class meets it.
#include "libraries/libmsg/debug_log.h"

#include <atomic>
#include <cstdarg>
#include <string_view>

#include "libraries/libmsg/free_line.h"
#include "libraries/libmsg/log_sink.h"

namespace {

constinit std::atomic<unsigned> debug_level = 0;
constinit log_sink<debug_sink> sink;

}  // namespace

extern "C" {

unsigned read_ldap_debug(void)
{
    return debug_level.load(std::memory_order_relaxed);
}

void write_ldap_debug(unsigned level)
{
    debug_level.store(level, std::memory_order_relaxed);
}

void PrintDebug(unsigned level, const char* format, ...)
{
    if ((read_ldap_debug() & level) == 0)
        return;

    const errno_keeper keep;
    va_list arguments;
    va_start(arguments, format);
    const free_line line("DEBUG", format, arguments);
    va_end(arguments);
    sink.deliver(line.line(), level, line.text());
}

void set_debug_sink(debug_sink function, void* context)
{
    sink.set_function(function, context);
}

int set_debug_file(const char* path)
{
    return sink.set_file(path);
}

}  // extern "C"
