// Looking attribute types up by name, the step that every attribute of every entry takes.
//
// A round looks up every name of the schema once, in random order, spelled as the schema spells it. The yardstick is
// std::unordered_map<std::string, ...>::find of the same names in the same order, already folded to upper case, in the
// same run. `ratio` is one over the other. On the large schema the fixed number of slots begins to chain, and both
// sides begin to wait for memory.
#include <benchmark/benchmark.h>

#include <random>
#include <string>
#include <unordered_map>
#include <vector>

#include "bench/support/allocation_count.h"
#include "bench/support/generated_schema.h"
#include "bench/support/timing.h"
#include "bench/support/two_threads.h"
#include "servers/vrnd/libdirbase/base/utf8_text.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"

namespace {

using bench_support::best_time;
using bench_support::seconds_of;

enum schema_kind : int { shipped, large };

// The active schema with a full cache, and its names in random order.
class active_schema {
public:
    explicit active_schema(schema_kind kind)
    {
        bench_support::provide_backend();
        ldcf_schema_g->clear();
        ldcf_api_schema_init();
        if (kind == shipped) {
            ldcf_schema_g->parse_str(bench_support::shipped_schema_text().c_str(), "shipped");
        } else {
            bench_support::parse_all(*ldcf_schema_g, bench_support::generate_schema(bench_support::large_schema));
        }
        ldcf_schema_g->complete();
        ldcf_api_schema_complete_db_names();
        for (const auto& entry : ldcf_schema_g->attribute_types) {
            names_.emplace_back(entry.first);
        }
        std::shuffle(names_.begin(), names_.end(), std::mt19937(1));
    }
    ~active_schema() { ldcf_schema_g->clear(); }
    active_schema(const active_schema&) = delete;
    active_schema& operator=(const active_schema&) = delete;

    const std::vector<std::string>& names() const { return names_; }

    std::vector<std::string> names_with(const char* tail) const
    {
        std::vector<std::string> result = names_;
        for (std::string& name : result) {
            name += tail;
        }
        return result;
    }

private:
    std::vector<std::string> names_;
};

void look_up(const std::vector<std::string>& names)
{
    for (const std::string& name : names) {
        benchmark::DoNotOptimize(ldcf_api_attr_get_info(name.c_str(), nullptr));
    }
}

// The mean number of nodes that a look-up passes, the found one included.
double mean_chain(const std::vector<std::string>& names)
{
    std::unordered_map<std::uint32_t, std::size_t> used;
    double nodes = 0;
    for (const std::string& name : names) {
        nodes += static_cast<double>(++used[ldcf_hash_name(ldcf_hash_get(name.c_str())->name)]);
    }
    return nodes / static_cast<double>(names.size());
}

void report_names(benchmark::State& state, std::size_t names, double allocations)
{
    state.SetItemsProcessed(state.iterations() * static_cast<std::int64_t>(names));
    state.counters["allocations"] = allocations / static_cast<double>(names);
}

void BM_AttrGetInfo(benchmark::State& state)
{
    const active_schema schema(static_cast<schema_kind>(state.range(0)));
    std::unordered_map<std::string, asyntaxinfo*> map;
    std::vector<std::string> folded = schema.names();
    for (std::string& name : folded) {
        utfToUpper(name.data());
        map.emplace(name, ldcf_api_attr_get_info(name.c_str(), nullptr));
    }

    best_time looking;
    best_time yardstick;
    for (auto _ : state) {
        const double seconds = seconds_of([&] { look_up(schema.names()); });
        state.SetIterationTime(seconds);
        looking.add(seconds);
        yardstick.measure([&] {
            for (const std::string& name : folded) {
                benchmark::DoNotOptimize(map.find(name)->second);
            }
        });
    }
    const auto count = static_cast<double>(schema.names().size());
    report_names(state, schema.names().size(), bench_support::allocations_of([&] { look_up(schema.names()); }));
    state.counters["ns_per_name"] = looking.seconds() * 1e9 / count;
    state.counters["map_ns_per_name"] = yardstick.seconds() * 1e9 / count;
    state.counters["chain"] = mean_chain(schema.names());
    state.counters["ratio"] = looking.seconds() / yardstick.seconds();
    state.counters["goal"] = 1.5;
}
BENCHMARK(BM_AttrGetInfo)->ArgName("large")->Arg(shipped)->Arg(large)->Iterations(200)->UseManualTime();

// What misses the cache: a copy of the name, and the map.
void look_up_with(benchmark::State& state, const char* tail)
{
    const active_schema schema(static_cast<schema_kind>(state.range(0)));
    const std::vector<std::string> names = schema.names_with(tail);
    best_time looking;
    for (auto _ : state) {
        const double seconds = seconds_of([&] { look_up(names); });
        state.SetIterationTime(seconds);
        looking.add(seconds);
    }
    report_names(state, names.size(), bench_support::allocations_of([&] { look_up(names); }));
    state.counters["ns_per_name"] = looking.seconds() * 1e9 / static_cast<double>(names.size());
}
BENCHMARK_CAPTURE(look_up_with, language_tag, ";lang-en")
    ->ArgName("large")
    ->Arg(shipped)
    ->Arg(large)
    ->Iterations(50)
    ->UseManualTime();
BENCHMARK_CAPTURE(look_up_with, binary, ";binary")
    ->ArgName("large")
    ->Arg(shipped)
    ->Arg(large)
    ->Iterations(50)
    ->UseManualTime();

// The same rounds on one thread and on two, by the clock on the wall; `speedup` is that of two.
void BM_AttrGetInfoThreads(benchmark::State& state)
{
    const active_schema schema(static_cast<schema_kind>(state.range(0)));
    const std::size_t rounds = 4'000'000 / schema.names().size();
    bench_support::measure_two_threads(state, [&] {
        for (std::size_t i = 0; i < rounds; ++i) {
            look_up(schema.names());
        }
    });
}
BENCHMARK(BM_AttrGetInfoThreads)->ArgName("large")->Arg(shipped)->Arg(large)->Iterations(5)->UseManualTime();

}  // namespace
