// Attributes of an entry by name: finding one, and adding a value to one, on entries of three sizes.
//
// A round takes each attribute of the entry once, in random order. The walks are over lists, until the entry is given
// an index; `growth` is the cost over that in an entry of ten attributes, measured in the same run.
#include <benchmark/benchmark.h>

#include <algorithm>
#include <cstdlib>
#include <random>
#include <string>
#include <vector>

#include "bench/support/generated_schema.h"
#include "bench/support/timing.h"
#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"

namespace {

using bench_support::best_time;
using bench_support::seconds_of;

constexpr std::size_t few = 10;
constexpr std::size_t calls = 10'000;

// A schema of its own, and entries with so many of its attributes.
class entry_of_size {
public:
    explicit entry_of_size(std::size_t count)
    {
        if (CreateEntry(&entry_) != LDAP_SUCCESS) {
            std::abort();
        }
        for (std::size_t i = 0; i < count; ++i) {
            names_.push_back(bench_support::generated_attribute_name(i));
        }
        std::shuffle(names_.begin(), names_.end(), std::mt19937(1));
        merge_all();
        std::shuffle(names_.begin(), names_.end(), std::mt19937(2));
    }
    ~entry_of_size() { entry_free(entry_); }
    entry_of_size(const entry_of_size&) = delete;
    entry_of_size& operator=(const entry_of_size&) = delete;

    // Adds the same value again, which is there from the second time on.
    void merge_all()
    {
        char text[] = "1";
        berval value = {1, text};
        berval* values[] = {&value, nullptr};
        for (const std::string& name : names_) {
            attr_merge(entry_, name.c_str(), values, 1, 1, nullptr);
        }
    }

    void find_all()
    {
        for (const std::string& name : names_) {
            if (attr_find(entry_, name.c_str(), 0, nullptr) == nullptr) {
                std::abort();
            }
        }
    }

    // The time of one call out of many.
    double seconds_per_call(void (entry_of_size::*round)())
    {
        const std::size_t rounds = calls / names_.size();
        const double seconds = seconds_of([&] {
            for (std::size_t i = 0; i < rounds; ++i) {
                (this->*round)();
            }
        });
        return seconds / static_cast<double>(rounds * names_.size());
    }

private:
    std::vector<std::string> names_;
    Entry* entry_ = nullptr;
};

void measure(benchmark::State& state, void (entry_of_size::*round)())
{
    bench_support::provide_backend();
    ldcf_api_schema_init();
    ldcf_schema_g->clear();
    bench_support::parse_all(*ldcf_schema_g, bench_support::generate_schema(bench_support::tenth_of_large_schema));
    ldcf_schema_g->complete();
    ldcf_api_schema_complete_db_names();
    {
        entry_of_size small(few);
        entry_of_size entry(static_cast<std::size_t>(state.range(0)));
        best_time of_entry;
        best_time of_small;
        for (auto _ : state) {
            const double seconds = entry.seconds_per_call(round);
            state.SetIterationTime(seconds);
            of_entry.add(seconds);
            of_small.add(small.seconds_per_call(round));
        }
        state.counters["ns"] = of_entry.seconds() * 1e9;
        state.counters["ns_of_ten"] = of_small.seconds() * 1e9;
        state.counters["growth"] = of_entry.seconds() / of_small.seconds();
    }
    ldcf_schema_g->clear();
}
BENCHMARK_CAPTURE(measure, attr_find, &entry_of_size::find_all)
    ->ArgName("attributes")
    ->Arg(10)
    ->Arg(100)
    ->Arg(1000)
    ->Iterations(20)
    ->UseManualTime();
BENCHMARK_CAPTURE(measure, attr_merge, &entry_of_size::merge_all)
    ->ArgName("attributes")
    ->Arg(10)
    ->Arg(100)
    ->Arg(1000)
    ->Iterations(20)
    ->UseManualTime();

}  // namespace
