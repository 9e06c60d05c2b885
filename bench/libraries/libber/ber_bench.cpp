// An entry in BER: a DN and ten attributes of eight values of 20 bytes, written and read; and a large group.
//
// The yardstick of writing is the same bytes copied value by value into one block of the right size; that of reading,
// one block for each text, two for each value and one for each array, filled and released.
#include <benchmark/benchmark.h>

#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "bench/support/allocation_count.h"
#include "bench/support/timing.h"
#include "libraries/libber/ber_element.h"

namespace {

using bench_support::best_time;

struct attribute {
    std::string type;
    std::vector<std::string> texts;
    std::vector<berval> values;
    std::vector<berval*> array;

    attribute(std::string name, std::size_t count) : type(std::move(name)), texts(count), values(count)
    {
        for (std::size_t i = 0; i < count; ++i) {
            texts[i] = std::to_string(i) + std::string(20, 'v');
            texts[i].resize(20);
            values[i] = {texts[i].size(), texts[i].data()};
            array.push_back(&values[i]);
        }
        array.push_back(nullptr);
    }
};

std::vector<attribute> make_entry(std::size_t attributes, std::size_t values)
{
    std::vector<attribute> entry;
    for (std::size_t i = 0; i < attributes; ++i)
        entry.emplace_back("attributeType" + std::to_string(i), values);
    return entry;
}

const char* const dn = "cn=Some Body,ou=Some Unit,o=Acme,c=us";

BerElement* write(const std::vector<attribute>& entry)
{
    BerElement* ber = ber_alloc_t(1);
    int result = ber_printf_w(ber, "{s{", dn);
    for (const attribute& attr : entry)
        result |= ber_printf_w(ber, "{s[V]}", attr.type.c_str(), attr.array.data());
    result |= ber_printf_w(ber, "}}");
    if (result != 0)
        std::abort();
    return ber;
}

// Writes repeatedly; the rounds within a measurement keep the clock's own cost out.
void write_entry(benchmark::State& state)
{
    const auto entry = make_entry(static_cast<std::size_t>(state.range(0)), static_cast<std::size_t>(state.range(1)));
    const int rounds = state.range(1) > 1000 ? 1 : 1000;
    BerElement* sample = write(entry);
    const auto size = static_cast<std::size_t>(sample->ber_ptr - sample->ber_buf);
    ber_free(sample, 1);
    best_time writing, copying;
    for (auto _ : state) {
        writing.measure([&] {
            for (int i = 0; i < rounds; ++i)
                ber_free(write(entry), 1);
        });
        copying.measure([&] {
            for (int i = 0; i < rounds; ++i) {
                auto* block = static_cast<char*>(std::malloc(size));
                char* to = block;
                for (const attribute& attr : entry) {
                    const std::size_t length = std::strlen(attr.type.c_str());
                    to = static_cast<char*>(std::memcpy(to, attr.type.c_str(), length)) + length;
                    for (berval* const* value = attr.array.data(); *value != nullptr; ++value)
                        to = static_cast<char*>(std::memcpy(to, (*value)->bv_val, (*value)->bv_len)) + (*value)->bv_len;
                }
                benchmark::DoNotOptimize(block);
                benchmark::ClobberMemory();
                std::free(block);
            }
        });
    }
    state.counters["bytes"] = static_cast<double>(size);
    state.counters["allocations"] = bench_support::allocations_of([&] { ber_free(write(entry), 1); });
    state.counters["write_us"] = writing.seconds() / rounds * 1e6;
    state.counters["copy_us"] = copying.seconds() / rounds * 1e6;
    state.counters["ratio"] = writing.seconds() / copying.seconds();
}

void read(BerElement* ber, std::size_t attributes)
{
    char* text = nullptr;
    if (ber_scanf(ber, "{a{", &text) == LBER_ERROR)
        std::abort();
    std::free(text);
    for (std::size_t i = 0; i < attributes; ++i) {
        berval** values = nullptr;
        if (ber_scanf(ber, "{a[V]}", &text, &values) == LBER_ERROR)
            std::abort();
        benchmark::DoNotOptimize(values);
        std::free(text);
        ber_bvecfree(values);
    }
}

void read_entry(benchmark::State& state)
{
    const auto attributes = static_cast<std::size_t>(state.range(0));
    const auto entry = make_entry(attributes, static_cast<std::size_t>(state.range(1)));
    const int rounds = state.range(1) > 1000 ? 1 : 1000;
    BerElement* written = write(entry);
    const berval value = {static_cast<unsigned long>(written->ber_ptr - written->ber_buf), written->ber_buf};
    const auto once = [&] {
        BerElement ber;
        ber_init2(&value, 0, &ber);
        read(&ber, attributes);
    };
    best_time reading, copying;
    for (auto _ : state) {
        reading.measure([&] {
            for (int i = 0; i < rounds; ++i)
                once();
        });
        copying.measure([&] {
            for (int i = 0; i < rounds; ++i) {
                for (const attribute& attr : entry) {
                    char* type = strdup(attr.type.c_str());
                    auto** copies = static_cast<berval**>(std::calloc(attr.array.size(), sizeof(berval*)));
                    for (std::size_t v = 0; v < attr.values.size(); ++v)
                        copies[v] = ber_bvdup(attr.array[v]);
                    benchmark::DoNotOptimize(copies);
                    std::free(type);
                    ber_bvecfree(copies);
                }
            }
        });
    }
    state.counters["allocations"] = bench_support::allocations_of(once);
    state.counters["read_us"] = reading.seconds() / rounds * 1e6;
    state.counters["copy_us"] = copying.seconds() / rounds * 1e6;
    state.counters["ratio"] = reading.seconds() / copying.seconds();
    ber_free(written, 1);
}

BENCHMARK(write_entry)->Name("BerPrintf/entry")->Args({10, 8})->Args({1, 1'000'000})->Unit(benchmark::kMillisecond);
BENCHMARK(read_entry)->Name("BerScanf/entry")->Args({10, 8})->Args({1, 1'000'000})->Unit(benchmark::kMillisecond);

}  // namespace
