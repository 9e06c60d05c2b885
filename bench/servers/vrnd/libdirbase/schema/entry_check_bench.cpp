// Checking an entry against the schema, the step that every addition and modification takes.
//
// The entry is that of a person, an inetOrgPerson of 15 attributes and its four classes, of which `dns` attributes
// have a DN for their value. The large schema is the shipped one with 20,000 attribute types and 5,000 classes more;
// `growth` is over the same entry in the shipped schema. The long entries have so many values, or one value of so many
// attributes, and `growth` then is that of one of these over the entry with a tenth of them.
#include <benchmark/benchmark.h>

#include <cstdlib>
#include <string>
#include <utility>

#include "bench/support/allocation_count.h"
#include "bench/support/generated_schema.h"
#include "bench/support/timing.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"
#include "servers/vrnd/libdirbase/schema/ldcf_entry_check.h"

namespace {

using bench_support::best_time;
using bench_support::seconds_of;

// The shipped schema as the active one, with or without many more definitions.
class active_schema {
public:
    explicit active_schema(bool large)
    {
        bench_support::provide_backend();
        ldcf_schema_g->clear();
        ldcf_api_schema_init();
        ldcf_schema_g->parse_str(bench_support::shipped_schema_text().c_str(), "shipped");
        if (large) {
            for (const auto& [file, text] : bench_support::generate_schema(bench_support::large_schema)) {
                if (file.find(".part") != std::string::npos) {
                    ldcf_schema_g->parse_str(text.c_str(), file.c_str());
                }
            }
        }
        if (ldcf_api_schema_complete() != 0 || ldcf_api_schema_complete_db_names() != 0) {
            std::abort();
        }
    }
    ~active_schema() { ldcf_schema_g->clear(); }
    active_schema(const active_schema&) = delete;
    active_schema& operator=(const active_schema&) = delete;
};

class built_entry {
public:
    built_entry()
    {
        entry_.e_dn = dn_;
        entry_.e_norm_dn = norm_dn_;
        for (const char* name : {"top", "person", "organizationalPerson", "inetOrgPerson"}) {
            add("objectClass", name);
        }
    }
    ~built_entry()
    {
        while (entry_.e_attrs != nullptr) {
            attr_free(std::exchange(entry_.e_attrs, entry_.e_attrs->a_next));
        }
    }
    built_entry(const built_entry&) = delete;
    built_entry& operator=(const built_entry&) = delete;

    void add(const std::string& name, std::string text)
    {
        berval value = {text.size(), text.data()};
        berval* values[] = {&value, nullptr};
        if (attr_merge(&entry_, name.c_str(), values, 0, 0, nullptr) != 0) {
            std::abort();
        }
    }

    void check()
    {
        if (ldcf_api_schema_check(&entry_, nullptr, false) != 0) {
            std::abort();
        }
    }

    // The time of one check out of many.
    double seconds(int rounds)
    {
        return seconds_of([&] {
                   for (int i = 0; i < rounds; ++i) {
                       check();
                   }
               }) /
               rounds;
    }

private:
    char dn_[40] = "uid=jdoe,ou=people,o=site";
    char norm_dn_[40] = "UID=JDOE,OU=PEOPLE,O=SITE";
    Entry entry_ = {};
};

void fill_person(built_entry& entry, std::int64_t dns)
{
    for (const char* name : {"cn", "sn", "givenName", "uid", "mail", "telephoneNumber", "title", "ou", "l",
                             "description", "employeeNumber", "displayName"}) {
        entry.add(name, "text");
    }
    entry.add(dns > 0 ? "manager" : "initials", "uid=boss,ou=people,o=site");
    entry.add(dns > 1 ? "secretary" : "roomNumber", "uid=desk,ou=people,o=site");
}

void report_times(benchmark::State& state, const best_time& time, const best_time& reference, double share)
{
    state.counters["us"] = time.seconds() * 1e6;
    state.counters["growth"] = time.seconds() / reference.seconds() * share;
}

void BM_CheckPerson(benchmark::State& state)
{
    constexpr int rounds = 1000;
    best_time shipped;
    {
        const active_schema schema(false);
        built_entry entry;
        fill_person(entry, state.range(1));
        for (int i = 0; i < 20; ++i) {
            shipped.add(entry.seconds(rounds));
        }
    }
    const active_schema schema(state.range(0) != 0);
    built_entry entry;
    fill_person(entry, state.range(1));
    best_time time;
    for (auto _ : state) {
        const double seconds = entry.seconds(rounds);
        state.SetIterationTime(seconds);
        time.add(seconds);
    }
    report_times(state, time, shipped, 1);
    state.counters["allocations"] = bench_support::allocations_of([&] { entry.check(); });
}
BENCHMARK(BM_CheckPerson)
    ->ArgNames({"large", "dns"})
    ->ArgsProduct({{0, 1}, {0, 1, 2}})
    ->Iterations(50)
    ->UseManualTime();

void fill_values(built_entry& entry, std::int64_t count)
{
    entry.add("cn", "text");
    entry.add("sn", "text");
    for (std::int64_t i = 0; i < count; ++i) {
        entry.add("description", std::to_string(i));
        entry.add("objectClass", "person");
    }
}

void fill_attributes(built_entry& entry, std::int64_t count)
{
    entry.add("cn", "text");
    entry.add("sn", "text");
    entry.add("objectClass", "extensibleObject");
    for (std::int64_t i = 0; i < count; ++i) {
        entry.add(bench_support::generated_attribute_name(static_cast<std::size_t>(i)), "cn=1");  // some take DNs
    }
}

void measure(benchmark::State& state, void (*fill)(built_entry&, std::int64_t))
{
    const active_schema schema(true);
    built_entry tenth;
    fill(tenth, state.range(0) / 10);
    built_entry entry;
    fill(entry, state.range(0));
    best_time time;
    best_time reference;
    for (auto _ : state) {
        const double seconds = entry.seconds(1);
        state.SetIterationTime(seconds);
        time.add(seconds);
        reference.add(tenth.seconds(1));
    }
    report_times(state, time, reference, 0.1);
    state.counters["allocations"] = bench_support::allocations_of([&] { entry.check(); });
}
BENCHMARK_CAPTURE(measure, check_many_values, &fill_values)
    ->ArgName("values")
    ->Arg(100'000)
    ->Iterations(10)
    ->UseManualTime();
BENCHMARK_CAPTURE(measure, check_many_attributes, &fill_attributes)
    ->ArgName("attributes")
    ->Arg(20'000)
    ->Iterations(10)
    ->UseManualTime();

}  // namespace
