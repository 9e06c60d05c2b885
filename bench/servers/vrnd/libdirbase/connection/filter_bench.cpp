// Parsing one filter of ordinary size, from text and from BER, and writing it.
#include <cstdlib>
#include <stdexcept>
#include <string>

#include <benchmark/benchmark.h>

#include "bench/support/allocation_count.h"
#include "bench/support/generated_schema.h"
#include "servers/vrnd/libdirbase/connection/filter_ber.h"
#include "servers/vrnd/libdirbase/model/filter_guards.h"
#include "servers/vrnd/str2filter.h"
#include "tests/support/filter_encoding.h"

namespace {

constexpr char ordinary[] = "(&(objectclass=person)(|(cn=a*)(mail=b*))(!(uid=c)))";

// Runs the work, which is given nothing and leaves nothing, and tells how much it allocates.
template <typename Work>
void measure(benchmark::State& state, const Work& work)
{
    bench_support::require_shipped_schema();
    work();
    state.counters["allocs"] = bench_support::allocations_of(work);
    for (auto _ : state) {
        work();
    }
}

void from_text(benchmark::State& state)
{
    measure(state, [&] {
        const filter_guard filter(str2filter(ordinary, static_cast<int>(state.range(0))));
        benchmark::DoNotOptimize(filter.get());
    });
}
BENCHMARK(from_text)->Name("str2filter")->ArgName("normalize")->Arg(0)->Arg(1);

void measure_ber(benchmark::State& state, const Filter& filter)
{
    std::string bytes = test_support::ber_of(filter);
    measure(state, [&] {
        const berval value = {bytes.size(), bytes.data()};
        BerElement ber;
        ber_init2(&value, 0, &ber);
        Filter* read = nullptr;
        char* text = nullptr;
        if (get_filter(nullptr, &ber, &read, &text, nullptr) != 0 || read == nullptr) {
            throw std::runtime_error("the filter is refused");
        }
        std::free(text);
        filter_free(read);
    });
}

void from_ber(benchmark::State& state)
{
    measure_ber(state, *filter_guard(str2filter(ordinary, 0)));
}
BENCHMARK(from_ber)->Name("get_filter");

void to_text(benchmark::State& state)
{
    const filter_guard filter(str2filter(ordinary, 0));
    measure(state, [&] {
        char* const text = filter2str(filter.get());
        benchmark::DoNotOptimize(text);
        std::free(text);
    });
}
BENCHMARK(to_text)->Name("filter2str");

// Members of one list, and pieces of one attribute: the time for each may not grow with their number.
void members(benchmark::State& state)
{
    std::string text;
    for (std::int64_t i = 0; i < state.range(0); ++i) {
        text += "(uid=somebody)";
    }
    measure_ber(state, *filter_guard(str2filter(("(|" + text + ")").c_str(), 0)));
    state.SetItemsProcessed(state.iterations() * state.range(0));
}
BENCHMARK(members)->Name("get_filter/members")->Arg(100)->Arg(100000);

void pieces(benchmark::State& state)
{
    std::string text;
    for (std::int64_t i = 0; i < state.range(0); ++i) {
        text += "*a";
    }
    measure_ber(state, *filter_guard(str2filter(("(uid=" + text + ")").c_str(), 0)));
    state.SetItemsProcessed(state.iterations() * state.range(0));
}
BENCHMARK(pieces)->Name("get_filter/pieces")->Arg(100)->Arg(100000);

}  // namespace
