// Strings are passed around by their handles; this is what a handle costs.
#include <benchmark/benchmark.h>

#include <memory>
#include <string>

#include "servers/vrnd/libcsgl/csgl_string.h"

namespace {

// A copy of a handle and its end, by one thread and by two on the same body.
void BM_StringCopyAndDrop(benchmark::State& state)
{
    static const csgl_string shared("telephoneNumber");
    for (auto _ : state) {
        const csgl_string copy(shared);
        benchmark::DoNotOptimize(copy.get());
    }
}
BENCHMARK(BM_StringCopyAndDrop)->Threads(1)->Threads(2)->UseRealTime();

// The same with what the standard library offers.
void BM_SharedPointerCopyAndDrop(benchmark::State& state)
{
    static const auto shared = std::make_shared<const std::string>("telephoneNumber");
    for (auto _ : state) {
        const std::shared_ptr<const std::string> copy(shared);
        benchmark::DoNotOptimize(copy.get());
    }
}
BENCHMARK(BM_SharedPointerCopyAndDrop)->Threads(1)->Threads(2)->UseRealTime();

// A new body for a text inside it, and for one that needs a block of its own.
void BM_StringMake(benchmark::State& state)
{
    const std::string text(static_cast<std::size_t>(state.range(0)), 'x');
    for (auto _ : state) {
        const csgl_string made(text.c_str());
        benchmark::DoNotOptimize(made.c_str());
    }
}
BENCHMARK(BM_StringMake)->Arg(15)->Arg(200);

}  // namespace
