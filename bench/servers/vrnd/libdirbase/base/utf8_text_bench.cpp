// Case folding of directory text against a plain copying pass over the same bytes.
//
// Each call folds the other way than the one before, so that every call finds all its letters to change. `ratio` is the
// speed as a part of the copying pass's, and `goal` what the ratio has to reach on this machine: the part that 1 GB/s
// is of the copying pass, or a quarter where the machine is too slow for that.
#include <benchmark/benchmark.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <cstring>
#include <string>
#include <vector>

#include "servers/vrnd/libdirbase/base/utf8_text.h"

namespace {

constexpr double goal_speed = 1e9;
constexpr double goal_ratio = 0.25;

const char* const ascii = "cn=Barbara Jensen,ou=Product Development,o=Example, ";
const char* const latin = "stra\u00DFe m\u00FCller \u00E9l\u00E8ve gar\u00E7on ";
const char* const greek = "\u03B1\u03B8\u03B7\u03BD\u03B1 \u03B5\u03BB\u03BB\u03B1\u03B4\u03B1 ";
const char* const cyrillic = "\u043C\u043E\u0441\u043A\u0432\u0430 \u0440\u043E\u0441\u0441\u0438\u044F ";
const char* const chinese = "\u5317\u4EAC\u5E02\u6D77\u6DC0\u533A ";

// Text of whole samples, `size` bytes or a little more.
std::string text_of(const char* sample, std::size_t size)
{
    std::string text;
    while (text.size() < size)
        text += sample;
    return text;
}

// The speed of `pass` in bytes a second: the best of some rounds, because others use the machine too.
template <typename Pass>
double speed_of(std::size_t size, Pass pass)
{
    using clock = std::chrono::steady_clock;
    const std::size_t calls = std::max<std::size_t>(1, 1000000 / size);
    double best = 0;
    for (int round = 0; round < 30; ++round) {
        const clock::time_point start = clock::now();
        for (std::size_t i = 0; i < calls; ++i)
            pass(i);
        const std::chrono::duration<double> taken = clock::now() - start;
        best = std::max(best, static_cast<double>(size * calls) / taken.count());
    }
    return best;
}

void fold(char* text, std::size_t call)
{
    benchmark::DoNotOptimize(call % 2 == 0 ? utfToUpper(text) : utfToLower(text));
}

void fold_text(benchmark::State& state, const char* sample)
{
    std::string text = text_of(sample, static_cast<std::size_t>(state.range(0)));
    std::vector<char> target(text.size() + 1);
    std::size_t call = 0;
    for (auto _ : state)
        fold(text.data(), call++);
    state.SetBytesProcessed(static_cast<int64_t>(call * text.size()));

    const double folding = speed_of(text.size(), [&](std::size_t i) { fold(text.data(), i); });
    const double copying = speed_of(text.size(), [&](std::size_t) {
        std::memcpy(target.data(), text.data(), text.size() + 1);
        benchmark::ClobberMemory();
    });
    state.counters["ratio"] = folding / copying;
    if (sample == ascii)
        state.counters["goal"] = std::min(goal_ratio, goal_speed / copying);
}

BENCHMARK_CAPTURE(fold_text, ascii, ascii)->Arg(50)->Arg(1000)->Arg(64000);
BENCHMARK_CAPTURE(fold_text, latin, latin)->Arg(50)->Arg(64000);
BENCHMARK_CAPTURE(fold_text, greek, greek)->Arg(50)->Arg(64000);
BENCHMARK_CAPTURE(fold_text, cyrillic, cyrillic)->Arg(50)->Arg(64000);
BENCHMARK_CAPTURE(fold_text, chinese, chinese)->Arg(50)->Arg(64000);

}  // namespace
