// Loading a schema, what it takes up, and finding a definition in it.
#include <benchmark/benchmark.h>
#include <malloc.h>

#include <memory>
#include <unordered_map>

#include "bench/support/generated_schema.h"
#include "bench/support/timing.h"

namespace {

using bench_support::best_time;
using bench_support::schema_size;
using bench_support::schema_text;

struct load_times {
    best_time parse, link, check, clear, whole;
};

// Loads a schema and drops it again; gives the time of the load alone.
double load(const std::vector<schema_text>& texts, load_times& times)
{
    ldcf_schema schema;
    const double parse = bench_support::seconds_of([&] { bench_support::parse_all(schema, texts); });
    const double link = bench_support::seconds_of([&] { schema.complete_nocheck(); });
    const double check = bench_support::seconds_of([&] { schema.check(); });
    times.parse.add(parse);
    times.link.add(link);
    times.check.add(check);
    times.whole.add(parse + link + check);
    times.clear.measure([&] { schema.clear(); });
    return parse + link + check;
}

// Parse, complete and check; the yardstick is the same for a tenth of the definitions.
void BM_SchemaLoad(benchmark::State& state)
{
    const std::vector<schema_text> large = bench_support::generate_schema(bench_support::large_schema);
    const std::vector<schema_text> tenth = bench_support::generate_schema(bench_support::tenth_of_large_schema);
    load_times large_times;
    load_times tenth_times;
    for (auto _ : state) {
        for (int i = 0; i < 4; ++i) {
            load(tenth, tenth_times);
        }
        state.SetIterationTime(load(large, large_times));
    }
    bench_support::report_part(state, "parse", large_times.parse);
    bench_support::report_part(state, "link", large_times.link);
    bench_support::report_part(state, "check", large_times.check);
    bench_support::report_part(state, "clear", large_times.clear);
    bench_support::report_part(state, "tenth_parse", tenth_times.parse);
    bench_support::report_part(state, "tenth_link", tenth_times.link);
    bench_support::report_goal(state, large_times.whole, tenth_times.whole, 14);
}
BENCHMARK(BM_SchemaLoad)->Iterations(8)->UseManualTime()->Unit(benchmark::kMillisecond);

schema_size size_of_argument(const benchmark::State& state)
{
    const auto attribute_types = static_cast<std::size_t>(state.range(0));
    return {attribute_types, attribute_types / 4};
}

double heap_bytes()
{
    const struct mallinfo2 info = mallinfo2();
    return static_cast<double>(info.uordblks + info.hblkhd);
}

// What a loaded schema holds of the heap, for each attribute type and class, before and after every text form was asked
// for once. While a schema is loaded nothing else of its size is alive, so this is the peak as well.
void BM_SchemaMemory(benchmark::State& state)
{
    const schema_size size = size_of_argument(state);
    const std::vector<schema_text> texts = bench_support::generate_schema(size);
    const auto definitions = static_cast<double>(size.definitions());
    double parsed = 0;
    double loaded = 0;
    double with_texts = 0;
    for (auto _ : state) {
        ldcf_schema schema;
        const double before = heap_bytes();
        bench_support::parse_all(schema, texts);
        parsed = heap_bytes() - before;
        schema.complete();
        loaded = heap_bytes() - before;
        ldcf_for_each_definition(schema.attribute_types, [](const ldcf_attrtype& type) {
            benchmark::DoNotOptimize(type.v3_string().c_str());
            benchmark::DoNotOptimize(type.xan_string().c_str());
        });
        ldcf_for_each_definition(schema.object_classes,
                                 [](const ldcf_objclass& type) { benchmark::DoNotOptimize(type.v3_string().c_str()); });
        with_texts = heap_bytes() - before;
    }
    double text_bytes = 0;
    for (const schema_text& part : texts) {
        text_bytes += static_cast<double>(part.text.size());
    }
    state.counters["source_per_definition"] = text_bytes / definitions;
    state.counters["parsed_per_definition"] = parsed / definitions;
    state.counters["loaded_per_definition"] = loaded / definitions;
    state.counters["with_texts_per_definition"] = with_texts / definitions;
    state.counters["loaded_megabytes"] = loaded / 1e6;
    state.counters["sizeof_attrtype"] = sizeof(ldcf_attrtype_);
    state.counters["sizeof_objclass"] = sizeof(ldcf_objclass_);
    state.counters["sizeof_string"] = sizeof(csgl_string_);
}
BENCHMARK(BM_SchemaMemory)->Arg(2'000)->Arg(20'000)->Iterations(1)->Unit(benchmark::kMillisecond);

struct name_hash {
    std::size_t operator()(const csgl_string& name) const { return std::hash<std::string_view>()(name.c_str()); }
};

// Names of all parts of the schema in an order that no cache can guess.
std::vector<csgl_string> sought_names(std::size_t attribute_types)
{
    std::vector<csgl_string> names;
    for (std::size_t i = 0; i < 4096; ++i) {
        names.emplace_back(bench_support::generated_attribute_name(i * 7919 % attribute_types).c_str());
    }
    return names;
}

// One look-up by name. The yardstick is a hash table of the same names, which knows no case.
void BM_AttributeTypeByName(benchmark::State& state)
{
    const schema_size size = size_of_argument(state);
    ldcf_schema schema;
    bench_support::parse_all(schema, bench_support::generate_schema(size));
    std::unordered_map<csgl_string, ldcf_attrtype, name_hash> table(schema.attribute_types.begin(),
                                                                    schema.attribute_types.end());
    const std::vector<csgl_string> names = sought_names(size.attribute_types);
    const bool from_plain_text = state.range(1) != 0;
    best_time in_map;
    best_time in_table;
    for (auto _ : state) {
        const double seconds = bench_support::seconds_of([&] {
            for (const csgl_string& name : names) {
                const csgl_string& key = from_plain_text ? csgl_string(name.c_str()) : name;
                benchmark::DoNotOptimize(ldcf_find(schema.attribute_types, key).get());
            }
        });
        in_map.add(seconds);
        state.SetIterationTime(seconds / static_cast<double>(names.size()));
        in_table.measure([&] {
            for (const csgl_string& name : names) {
                benchmark::DoNotOptimize(ldcf_attrtype(table.find(name)->second).get());
            }
        });
    }
    state.counters["ratio"] = in_map.seconds() / in_table.seconds();
}
BENCHMARK(BM_AttributeTypeByName)
    ->ArgNames({"types", "plain_text"})
    ->ArgsProduct({{2'000, 20'000}, {0, 1}})
    ->Iterations(300)
    ->UseManualTime()
    ->Unit(benchmark::kNanosecond);

}  // namespace
