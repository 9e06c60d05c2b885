// `dirbase ldif search` over a generated file: a filter of eleven elements that asks every entry for all of them and
// selects none, by one thread and by two.
//
// `mb_a_second` is the file in wall time, the schema's loading included; `us_an_entry` is the processor time of all
// threads. `share_not_filter` is the share of it that a search by the presence of an attribute takes which no entry
// has: reading the lines and making the entries. `memory_mb` is the most that the program held. The run of two threads
// also tells how many times faster it was than the run of one before it; the goal of that holds on a machine with two
// processors that are free.
//
// The environment variable DIRBASE_BENCH_ENTRIES gives another number of entries than 100,000.
#include <benchmark/benchmark.h>

#include "bench/support/tool_cost.h"

namespace {

constexpr char simple_filter[] = "(pager=*)";

// The generated people, and nobody at the end.
constexpr char large_filter[] =
    "(|(&(objectClass=inetOrgPerson)(sn=*)(cn=*e*r*x*y*))(telephoneNumber=*x99)(sn=Nobody)(mail=x*@*.example)"
    "(manager=uid=nobody,ou=People,o=Quillhaven Works)(&(!(objectClass=groupOfNames))(ou>=Zoo)))";

bench_support::run_cost search(const std::string& file, const std::string& threads, const char* filter)
{
    // No entry matches, which is the exit status 1.
    return bench_support::cost_of_tool({"ldif", "search", "--threads", threads, "--count", file, filter}, 1);
}

void BM_LdifSearch(benchmark::State& state)
{
    static const bench_support::generated_file file;
    static double wall_of_one = 0;
    const std::string threads = std::to_string(state.range(0));
    const bench_support::run_cost simple = search(file.path(), threads, simple_filter);
    bench_support::run_cost cost;
    for (auto _ : state) {
        cost = search(file.path(), threads, large_filter);
        state.SetIterationTime(cost.wall);
    }
    state.counters["entries"] = file.entries();
    state.counters["seconds"] = cost.wall;
    state.counters["mb_a_second"] = file.megabytes() / cost.wall;
    state.counters["us_an_entry"] = cost.processor * 1e6 / file.entries();
    state.counters["share_not_filter"] = simple.processor / cost.processor;
    state.counters["share_not_filter_goal"] = 0.5;
    state.counters["memory_mb"] = cost.megabytes;
    state.counters["memory_mb_goal"] = 64;
    if (threads == "1") {
        wall_of_one = cost.wall;
    } else if (wall_of_one > 0) {
        state.counters["speedup"] = wall_of_one / cost.wall;
        state.counters["speedup_goal"] = 1.7;
    }
}
BENCHMARK(BM_LdifSearch)->Arg(1)->Arg(2)->Iterations(1)->UseManualTime()->Unit(benchmark::kMillisecond);

}  // namespace
