// The same work on one thread and on two, by the clock on the wall.
#pragma once

#include <atomic>
#include <cstddef>
#include <thread>
#include <vector>

#include <benchmark/benchmark.h>

#include "bench/support/timing.h"

namespace bench_support {

// Measures `work`, which every thread does as a whole and which all begin together, once on one thread and once on two
// in each iteration. The counter `speedup` tells how many times the work of one thread two got done in its time.
template <typename Work>
void measure_two_threads(benchmark::State& state, const Work& work)
{
    const auto time_of = [&](std::size_t threads) {
        std::atomic<std::size_t> waiting{threads};
        const auto begin = [&] {
            --waiting;
            while (waiting != 0) {}
            work();
        };
        return elapsed_seconds_of([&] {
            std::vector<std::thread> others;
            for (std::size_t i = 1; i < threads; ++i) {
                others.emplace_back(begin);
            }
            begin();
            for (std::thread& other : others) {
                other.join();
            }
        });
    };
    best_time one;
    best_time two;
    for (auto _ : state) {
        one.add(time_of(1));
        const double seconds = time_of(2);
        state.SetIterationTime(seconds);
        two.add(seconds);
    }
    state.counters["speedup"] = 2 * one.seconds() / two.seconds();
    state.counters["goal"] = 1.8;
}

}  // namespace bench_support
