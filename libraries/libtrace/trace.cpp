// Trace runtime: the mask, its start value from the environment, and the trace's own output.
#include "libraries/libtrace/trace.h"

#include <cerrno>
#include <cstdarg>
#include <cstdlib>

#include "libraries/libmsg/free_line.h"
#include "libraries/libmsg/log_sink.h"

static_assert(sizeof(std::atomic<std::uint64_t>) == sizeof(std::uint64_t), "trcEvents is read as one 64-bit word");

constinit std::atomic<std::uint64_t> trcEvents = 0;

namespace {

constinit log_output output;

// Reads a whole unsigned number in C notation (decimal, 0x..., 0...). Returns whether the text is one.
bool read_mask(const char* text, std::uint64_t& mask)
{
    const errno_keeper keep;
    if (text == nullptr || text[0] < '0' || text[0] > '9')
        return false;  // strtoull would take blanks and a sign
    char* end = nullptr;
    errno = 0;
    mask = std::strtoull(text, &end, 0);
    return errno == 0 && *end == '\0';
}

}  // namespace

extern "C" {

std::uint64_t ldtr_init(void)
{
    std::uint64_t mask = 0;
    if (!read_mask(std::getenv("LDTR_EVENTS"), mask))
        mask = LDTR_ERROR;
    trcEvents.store(mask);
    return mask;
}

void ldtr_write(std::uint64_t event, const char* format, ...)
{
    if ((trcEvents.load(std::memory_order_relaxed) & event) == 0)
        return;

    const errno_keeper keep;
    va_list arguments;
    va_start(arguments, format);
    const free_line line("TRACE", format, arguments);
    va_end(arguments);
    output.write(line.line());
}

int ldtr_set_file(const char* path)
{
    if (path != nullptr)
        return output.set_file(path);
    output.set_standard_error();
    return 0;
}

}  // extern "C"
