// Normalising DNs with the shipped schema, against folding the same text and taking one block of memory a pair.
//
// `allocations` is of one DN, and at most `allocations_goal`: four, one a pair and one an RDN. `ns` is the best time of
// one normalisation with the release of its record.
#include <benchmark/benchmark.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "bench/support/allocation_count.h"
#include "bench/support/generated_schema.h"
#include "bench/support/timing.h"
#include "libraries/libber/ldap_result.h"
#include "servers/vrnd/libdirbase/base/utf8_text.h"
#include "servers/vrnd/libdirbase/model/dn_esc.h"
#include "servers/vrnd/libdirbase/model/dn_plain.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"

namespace {

constexpr int calls = 1000;

void report(benchmark::State& state, const bench_support::best_time& measured)
{
    state.counters["ns"] = measured.seconds() * 1e9 / calls;
}

void BM_DnNormalizeEsc(benchmark::State& state, const char* dn, std::size_t rdns, std::size_t pairs)
{
    bench_support::require_shipped_schema();
    std::string folded = dn;
    bench_support::best_time normalising;
    bench_support::best_time yardstick;
    std::size_t taken = 0;
    for (auto _ : state) {
        yardstick.measure([&] {
            for (int i = 0; i < calls; ++i) {
                benchmark::DoNotOptimize(utfToUpper(folded.data()));
                for (std::size_t pair = 0; pair < pairs; ++pair) {
                    void* block = std::malloc(64);
                    benchmark::DoNotOptimize(block);
                    std::free(block);
                }
            }
        });
        const std::size_t before = bench_support::allocation_count();
        const double seconds = bench_support::seconds_of([&] {
            for (int i = 0; i < calls; ++i) {
                ldap_escDN* normal = dn_normalize_esc(dn);
                if (normal == nullptr || normal->result != LDAP_SUCCESS) {
                    std::abort();
                }
                free_ldap_escDN(&normal);
            }
        });
        taken = (bench_support::allocation_count() - before) / calls;
        state.SetIterationTime(seconds);
        normalising.add(seconds);
    }
    report(state, normalising);
    state.counters["allocations"] = static_cast<double>(taken);
    state.counters["allocations_goal"] = static_cast<double>(4 + pairs + rdns);
    bench_support::report_goal(state, normalising, yardstick, 12);
}

#define DN_BENCHMARK(name, ...) \
    BENCHMARK_CAPTURE(BM_DnNormalizeEsc, name, __VA_ARGS__)->UseManualTime()->Unit(benchmark::kMicrosecond)
DN_BENCHMARK(three_rdns, "cn=Barbara Jensen,ou=People,o=Example", 3, 3);
DN_BENCHMARK(four_rdns, "uid=bjensen42,ou=Product Development,o=Example Industries,c=us", 4, 4);
DN_BENCHMARK(five_rdns, "CN = Barbara Jensen , ou=Research, ou=Labs; o=\"Example, Inc.\", c=us", 5, 5);
DN_BENCHMARK(compound, "sn=Jensen+cn=Barbara Jensen,ou=People,o=Example", 3, 4);

// The older normaliser, on a text of any size: twice the size must take twice the time.
void BM_DnNormalizeLight(benchmark::State& state)
{
    const auto size = static_cast<std::size_t>(state.range(0));
    std::string text;
    while (text.size() < size) {
        text += "cn = Barbara Jensen , ou=\"Product, Development\" ; o=Example\\, Inc.,";
    }
    std::string copy;
    bench_support::best_time cleaning;
    bench_support::best_time folding;
    for (auto _ : state) {
        copy = text;
        folding.measure([&] { benchmark::DoNotOptimize(utfToUpper(copy.data())); });
        copy = text;
        const double seconds =
            bench_support::seconds_of([&] { benchmark::DoNotOptimize(dn_normalize_light(copy.data(), 0)); });
        state.SetIterationTime(seconds);
        cleaning.add(seconds);
    }
    state.SetBytesProcessed(static_cast<std::int64_t>(text.size()) * state.iterations());
    bench_support::report_goal(state, cleaning, folding, 30);
}
BENCHMARK(BM_DnNormalizeLight)->Arg(2'000)->Arg(100'000)->UseManualTime()->Unit(benchmark::kMicrosecond);

}  // namespace
