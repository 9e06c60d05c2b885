// The lexical layer against a pass that only touches every byte once.
#include <benchmark/benchmark.h>

#include "bench/support/generated_schema.h"
#include "bench/support/timing.h"
#include "servers/vrnd/libdirbase/schema/ldcf_token.h"

namespace {

std::size_t read_all_tokens(const std::string& text)
{
    ldcf_token_factory factory(text.c_str(), "shipped");
    std::size_t count = 0;
    if (!factory.empty()) {
        ldcf_token token(factory);
        for (count = 1; !factory.empty(); ++count) {
            token.assign(factory);
        }
    }
    return count;
}

// Not inlined: the loop that is measured must be the one of the plain optimisation level, whatever stands around it.
[[gnu::noinline]] std::uint64_t sum_of_bytes(const std::string& text)
{
    std::uint64_t sum = 0;
    for (const char c : text) {
        sum += static_cast<unsigned char>(c);
    }
    return sum;
}

// Every token of the shipped schema's text, repeated up to the given number of bytes.
void BM_TokensOfSchemaText(benchmark::State& state)
{
    const std::string shipped = bench_support::shipped_schema_text();
    std::string text;
    while (text.size() < static_cast<std::size_t>(state.range(0))) {
        text += shipped;
    }
    bench_support::best_time tokens;
    bench_support::best_time plain_pass;
    std::size_t count = 0;
    for (auto _ : state) {
        plain_pass.measure([&] { benchmark::DoNotOptimize(sum_of_bytes(text)); });
        const double seconds = bench_support::seconds_of([&] { count = read_all_tokens(text); });
        state.SetIterationTime(seconds);
        tokens.add(seconds);
    }
    state.SetBytesProcessed(static_cast<std::int64_t>(text.size()) * state.iterations());
    state.counters["ns_per_token"] = tokens.seconds() * 1e9 / static_cast<double>(count);
    state.counters["bytes_per_token"] = static_cast<double>(text.size()) / static_cast<double>(count);
    bench_support::report_goal(state, tokens, plain_pass, 20);
}
BENCHMARK(BM_TokensOfSchemaText)->Arg(1'000'000)->Arg(10'000'000)->UseManualTime()->Unit(benchmark::kMillisecond);

}  // namespace
