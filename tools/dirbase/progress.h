// How far long work is, on a terminal.
#pragma once

#include <chrono>
#include <string>

namespace dirbase_tool {

// Shows one line on standard error, if that is a terminal, from the second second of its life on, and takes it away
// in the end.
class progress {
public:
    progress();
    ~progress() { clear(); }
    progress(const progress&) = delete;
    progress& operator=(const progress&) = delete;

    // Whether it is time for another line; a look at the clock.
    bool is_due();
    void show(const std::string& line);

    // Takes the line away, ahead of other output.
    void clear();

private:
    using clock = std::chrono::steady_clock;

    bool on_terminal_;
    bool shown_ = false;
    clock::time_point next_;
};

}  // namespace dirbase_tool
