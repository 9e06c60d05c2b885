// `dirbase ldif check` over a generated file, by one thread and by two.
//
// `entries` are checked in `seconds` of wall time, the schema's loading included; `us_an_entry` is the processor time
// of all threads. `memory_mb` is the most that the program held. The run of two threads also tells how many times
// faster it was than the run of one before it; the goal of that holds on a machine with two processors that are free.
//
// The environment variable DIRBASE_BENCH_ENTRIES gives another number of entries than 100,000.
#include <benchmark/benchmark.h>

#include "bench/support/tool_cost.h"

namespace {

void BM_LdifCheck(benchmark::State& state)
{
    static const bench_support::generated_file file;
    static double wall_of_one = 0;
    const std::int64_t threads = state.range(0);
    bench_support::run_cost cost;
    for (auto _ : state) {
        cost = bench_support::cost_of_tool({"ldif", "check", "--threads", std::to_string(threads), file.path()}, 0);
        state.SetIterationTime(cost.wall);
    }
    state.counters["entries"] = file.entries();
    state.counters["seconds"] = cost.wall;
    state.counters["us_an_entry"] = cost.processor * 1e6 / file.entries();
    state.counters["memory_mb"] = cost.megabytes;
    state.counters["memory_mb_goal"] = 64;
    if (threads == 1) {
        wall_of_one = cost.wall;
    } else if (wall_of_one > 0) {
        state.counters["speedup"] = wall_of_one / cost.wall;
        state.counters["speedup_goal"] = 1.7;
    }
}
BENCHMARK(BM_LdifCheck)->Arg(1)->Arg(2)->Iterations(1)->UseManualTime()->Unit(benchmark::kMillisecond);

}  // namespace
