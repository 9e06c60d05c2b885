// How far long work is: see progress.h.
#include "tools/dirbase/progress.h"

#include <unistd.h>

#include <cstdio>

namespace dirbase_tool {

namespace {

constexpr std::chrono::seconds first_line_after{1};
constexpr std::chrono::milliseconds between_lines{250};
constexpr char erase_line[] = "\r\x1b[K";

}  // namespace

progress::progress() : on_terminal_(::isatty(STDERR_FILENO) != 0), next_(clock::now() + first_line_after) {}

bool progress::is_due()
{
    return on_terminal_ && clock::now() >= next_;
}

void progress::show(const std::string& line)
{
    std::fprintf(stderr, "%s%s", erase_line, line.c_str());
    shown_ = true;
    next_ = clock::now() + between_lines;
}

void progress::clear()
{
    if (shown_) {
        std::fputs(erase_line, stderr);
        shown_ = false;
    }
}

}  // namespace dirbase_tool
