// Time taken inside a benchmark: the parts of one run, and the yardstick that a goal is held against.
//
// Both sides of a ratio are the best of their runs. The best run is the one that the rest of the machine disturbed
// least, so a ratio of two of them holds still where a ratio of means would not.
#pragma once

#include <time.h>

#include <algorithm>
#include <chrono>
#include <limits>
#include <string>

#include <benchmark/benchmark.h>

namespace bench_support {

// The processor time that `work` takes on this thread, in seconds: what else runs on the machine isn't counted.
template <typename Work>
double seconds_of(Work&& work)
{
    const auto now = [] {
        timespec time{};
        clock_gettime(CLOCK_THREAD_CPUTIME_ID, &time);
        return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) * 1e-9;
    };
    const double start = now();
    work();
    return now() - start;
}

// The time that passes meanwhile, in seconds: for work that waits for a disk.
template <typename Work>
double elapsed_seconds_of(Work&& work)
{
    const auto start = std::chrono::steady_clock::now();
    work();
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

class best_time {
public:
    void add(double seconds) { best_ = std::min(best_, seconds); }
    template <typename Work>
    void measure(Work&& work)
    {
        add(seconds_of(work));
    }
    template <typename Work>
    void measure_elapsed(Work&& work)
    {
        add(elapsed_seconds_of(work));
    }
    double seconds() const { return best_; }

private:
    double best_ = std::numeric_limits<double>::infinity();
};

// Shows a part of the run, in microseconds, as a counter of its own.
inline void report_part(benchmark::State& state, const std::string& name, const best_time& part)
{
    state.counters[name + "_us"] = part.seconds() * 1e6;
}

// Shows how many times the yardstick the measured work takes, and how many it may.
inline void report_goal(benchmark::State& state, const best_time& measured, const best_time& yardstick, double goal)
{
    report_part(state, "yardstick", yardstick);
    state.counters["ratio"] = measured.seconds() / yardstick.seconds();
    state.counters["goal"] = goal;
}

}  // namespace bench_support
