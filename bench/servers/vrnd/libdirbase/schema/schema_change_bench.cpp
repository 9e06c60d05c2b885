// Changing a large schema that is in use: a deep copy, and one attribute type added through all phases of a change.
#include <benchmark/benchmark.h>

#include "bench/support/generated_schema.h"
#include "bench/support/timing.h"
#include "servers/vrnd/libdirbase/schema/ldcf_schema_modify.h"
#include "tests/support/temp_dir.h"

namespace {

using bench_support::best_time;
using bench_support::elapsed_seconds_of;
using bench_support::schema_text;
using bench_support::seconds_of;

// Where the definitions of the schema are at home.
enum class layout : int {
    additions_apart,  // as it ships: what is added while the server runs goes to a file of its own
    one_file,         // all in the file that takes the additions, so that each change writes all
};

// The generated schema as the active one, on files of its own; emptied and removed in the end.
class active_schema {
public:
    explicit active_schema(layout where)
    {
        bench_support::provide_backend();
        ldcf_schema_g->clear();
        std::vector<schema_text> files = bench_support::generate_schema(bench_support::large_schema);
        if (where == layout::one_file) {
            std::string all;
            for (const schema_text& file : files) {
                all += file.text;
            }
            files = {{"V3.all", std::move(all)}};
        }
        for (const schema_text& file : files) {
            ldcf_schema_g->parse(folder_.write(file.file, file.text).c_str());
        }
        ldcf_schema_g->complete();
        ldcf_schema_g->complete_db_names();
    }
    ~active_schema() { ldcf_schema_g->clear(); }
    active_schema(const active_schema&) = delete;
    active_schema& operator=(const active_schema&) = delete;

private:
    test_support::temp_dir folder_;
};

ldcf_attrtype parse_addition()
{
    ldcf_map_name_to<ldcf_attrtype> parsed;
    ldcf_token_factory factory(bench_support::additional_attribute, "request");
    ldcf_attrtype::parse_v3(factory, parsed);
    return parsed.begin()->second;
}

// A whole change, phase by phase.
struct change_times {
    best_time vote, commit, cleanup, whole;

    // Gives the time of all phases together.
    double run(ldcf_modify_op op, ldcf_attrtype& definition)
    {
        const auto phase = [&](ldcf_modify_phase which, best_time& best) {
            const double seconds =
                elapsed_seconds_of([&] { ldcf_schema_modify_attrtype(nullptr, op, which, definition); });
            best.add(seconds);
            return seconds;
        };
        double seconds = phase(ldcf_modify_vote, vote);
        seconds += phase(ldcf_modify_commit, commit);
        seconds += phase(ldcf_modify_cleanup, cleanup);
        whole.add(seconds);
        return seconds;
    }
};

void BM_SchemaCopy(benchmark::State& state)
{
    const active_schema active(layout::additions_apart);
    best_time copying;
    best_time clearing;
    for (auto _ : state) {
        ldcf_schema spare;
        const double seconds = seconds_of([&] { spare.copy(*ldcf_schema_g); });
        state.SetIterationTime(seconds);
        copying.add(seconds);
        clearing.measure([&] { spare.clear(); });
    }
    bench_support::report_part(state, "copy", copying);
    bench_support::report_part(state, "clear", clearing);
    state.counters["ns_per_definition"] =
        copying.seconds() * 1e9 / static_cast<double>(bench_support::large_schema.definitions());
}
BENCHMARK(BM_SchemaCopy)->Iterations(10)->UseManualTime()->Unit(benchmark::kMillisecond);

// The steps of a change, each measured by itself on a schema that never becomes the active one.
struct step_times {
    best_time copy, link, check, flush, rename, clear;

    void run_once()
    {
        ldcf_schema spare;
        copy.measure_elapsed([&] { spare.copy(*ldcf_schema_g); });
        ldcf_attrtype definition = parse_addition();
        link.measure_elapsed([&] { spare.insert(definition); });
        check.measure_elapsed([&] { spare.check(); });
        flush.measure_elapsed([&] { spare.flush(); });
        rename.measure_elapsed([&] { spare.flush_commit(); });
        take_back(spare, definition);
        clear.measure_elapsed([&] { spare.clear(); });
    }

    void report(benchmark::State& state) const
    {
        bench_support::report_part(state, "copy", copy);
        bench_support::report_part(state, "link", link);
        bench_support::report_part(state, "check", check);
        bench_support::report_part(state, "flush", flush);
        bench_support::report_part(state, "rename", rename);
        bench_support::report_part(state, "clear", clear);
    }

private:
    // The files must say again what the active schema says.
    static void take_back(ldcf_schema& spare, ldcf_attrtype& added)
    {
        added = parse_addition();
        spare.erase(added);
        spare.flush();
        spare.flush_commit();
    }
};

// One addition: vote, commit and cleanup. It is undone by a deletion that isn't measured. The yardstick is a copy of
// the schema, which the vote has to make in any case. All is time that passes, since a change waits for the disk.
void BM_SchemaAdd(benchmark::State& state)
{
    const active_schema active(static_cast<layout>(state.range(0)));
    step_times steps;
    change_times adding;
    change_times undoing;
    for (auto _ : state) {
        steps.run_once();
        ldcf_attrtype definition = parse_addition();
        state.SetIterationTime(adding.run(ldcf_modify_add, definition));

        definition = parse_addition();
        undoing.run(ldcf_modify_delete, definition);
    }
    steps.report(state);
    bench_support::report_part(state, "vote", adding.vote);
    bench_support::report_part(state, "commit", adding.commit);
    bench_support::report_part(state, "cleanup", adding.cleanup);
    bench_support::report_goal(state, adding.whole, steps.copy, 3);
}
BENCHMARK(BM_SchemaAdd)
    ->ArgName("one_file")
    ->Arg(static_cast<int>(layout::additions_apart))
    ->Arg(static_cast<int>(layout::one_file))
    ->Iterations(8)
    ->UseManualTime()
    ->Unit(benchmark::kMillisecond);

}  // namespace
