// Filters on entries in memory: equality on an attribute with very many values, and substrings over a thousand persons.
//
// Equality is held against value_find for other values of the same attribute: test_filter may take twice that.
// Substrings are held against the same walk over versions and normal forms with a regular expression in place of the
// search, compiled once for each filter: test_filter may take a third of that. The walk alone, which both share, is
// shown beside it, and as `beyond_walk` the ratio of what either takes besides. Two threads share filters and entries,
// by the clock on the wall.
#include <regex.h>

#include <benchmark/benchmark.h>

#include <cstdlib>
#include <cstring>
#include <memory>
#include <random>
#include <string>
#include <vector>

#include "bench/support/allocation_count.h"
#include "bench/support/generated_schema.h"
#include "bench/support/timing.h"
#include "bench/support/two_threads.h"
#include "servers/vrnd/libdirbase/model/attr_value_tree.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/model/entry_text.h"
#include "servers/vrnd/libdirbase/model/filter_evaluation.h"
#include "servers/vrnd/libdirbase/model/filter_guards.h"
#include "servers/vrnd/libdirbase/model/value_normalize.h"
#include "servers/vrnd/str2filter.h"

namespace {

using bench_support::best_time;

struct free_entry {
    void operator()(Entry* entry) const { entry_free(entry); }
};
using entry_guard = std::unique_ptr<Entry, free_entry>;

filter_guard filter_of(const std::string& text)
{
    filter_guard filter(str2filter(text.c_str(), 1));
    if (filter == nullptr) {
        std::abort();
    }
    return filter;
}

// ---- equality -------------------------------------------------------------------------------------------------------

constexpr std::size_t many = 100'000;
constexpr std::size_t at_a_time = 500;

std::string member(std::size_t number)
{
    return "cn=Member " + std::to_string(number) + ",ou=People,o=Acme,c=us";
}

std::string word(std::size_t number)
{
    return "word " + std::to_string(number * 7919 % many);
}

void BM_TestFilterEquality(benchmark::State& state, const char* type, std::string (*value_of)(std::size_t))
{
    bench_support::require_shipped_schema();
    Entry* made = nullptr;
    CreateEntry(&made);
    const entry_guard entry(made);
    for (std::size_t i = 0; i < many; ++i) {
        std::string text = value_of(i);
        berval value = {text.size(), text.data()};
        berval* values[] = {&value, nullptr};
        attr_merge(entry.get(), type, values, 1, 1, nullptr);
    }
    const Attribute* const attr = attr_find(entry.get(), type, 0, nullptr);
    if (attr == nullptr || attr->a_tree == nullptr || attr->a_numvals != static_cast<std::int64_t>(many)) {
        std::abort();
    }
    const auto syntax = static_cast<std::uint32_t>(attr->a_syntax);
    best_time testing;
    best_time yardstick;
    double allocations = 0;
    std::size_t first = 0;
    for (auto _ : state) {
        // Each time other values, far from each other.
        std::vector<filter_guard> filters;
        std::vector<filter_guard> others;
        for (std::size_t i = 0; i < at_a_time; ++i) {
            const std::size_t number = (first + i * (many / at_a_time)) % many;
            filters.push_back(filter_of(std::string("(") + type + "=" + value_of(number) + ")"));
            others.push_back(filter_of(std::string("(") + type + "=" + value_of((number + 1) % many) + ")"));
        }
        first += 2;
        double seconds = 0;
        allocations = bench_support::allocations_of([&] {
            seconds = bench_support::seconds_of([&] {
                for (const filter_guard& filter : filters) {
                    if (test_filter(entry.get(), filter.get()) != FILTER_TRUE) {
                        std::abort();
                    }
                }
            });
        });
        state.SetIterationTime(seconds);
        testing.add(seconds);
        yardstick.measure([&] {
            for (const filter_guard& filter : others) {
                if (value_find(attr, &filter->f_ava.ava_value, syntax, 1) != 0) {
                    std::abort();
                }
            }
        });
    }
    state.counters["us_per_test"] = testing.seconds() * 1e6 / at_a_time;
    state.counters["allocations"] = allocations / at_a_time;
    bench_support::report_goal(state, testing, yardstick, 2);
}
BENCHMARK_CAPTURE(BM_TestFilterEquality, member, "member", member)->Iterations(50)->UseManualTime();
BENCHMARK_CAPTURE(BM_TestFilterEquality, description, "description", word)->Iterations(50)->UseManualTime();

// ---- substrings -----------------------------------------------------------------------------------------------------

constexpr std::size_t persons = 1000;

std::string name(std::mt19937& random, std::size_t least, std::size_t most)
{
    std::string text(std::uniform_int_distribution<std::size_t>(least, most)(random), 'a');
    for (char& c : text) {
        c = "aaabcdeeefghiiijklmnooopqrrrsssttuvwxyz"[random() % 39];
    }
    text[0] = static_cast<char>(text[0] - 'a' + 'A');
    return text;
}

std::vector<entry_guard> make_persons()
{
    bench_support::require_shipped_schema();
    std::vector<entry_guard> entries;
    std::mt19937 random(1);
    for (std::size_t i = 0; i < persons; ++i) {
        const std::string given = name(random, 4, 9);
        const std::string last = name(random, 5, 12);
        const std::string digits = std::to_string(100'000 + i * 37);
        std::string text = "dn: cn=" + given + " " + last + ",o=Acme\nobjectClass: top\nobjectClass: person\n" +
                           "objectClass: inetOrgPerson\ncn: " + given + " " + last + "\nsn: " + last +
                           "\ngivenName: " + given + "\nuid: u" + digits + "\nmail: " + given + "." + last +
                           (i % 3 == 0 ? "@example.com" : "@example.net") + "\ntelephoneNumber: +1 512 555 " + digits +
                           "\ntitle: Head of " + name(random, 5, 9) + "\nemployeeNumber: " + digits + "\n";
        if (i % 5 == 0) {
            text += "cn;lang-en: " + name(random, 4, 9) + "\n";
        }
        entries.emplace_back(str2entry(text.data(), 0, 0));
        if (entries.back() == nullptr) {
            std::abort();
        }
    }
    return entries;
}

struct substring_filter {
    const char* text;
    const char* type;
    const char* expression;
};
constexpr substring_filter substring_filters[] = {
    {"(cn=*ar*s)", "cn", ".*AR.*S$"},
    {"(cn=a*)", "cn", "^A"},
    {"(mail=*@example.com)", "mail", ".*@EXAMPLE\\.COM$"},
};

// Calls `visit` with each value of an attribute, as test_filter comes by them, until it gives true.
template <typename Visit>
bool any_value(const Entry* entry, const char* type, const Visit& visit)
{
    int started = 0;
    int tag_state = -1;
    asyntaxinfo* info = nullptr;
    Attribute* attr = nullptr;
    attr_find_attr_or_lang_tag_version(entry, type, &started, &tag_state, &info, &attr);
    while (attr != nullptr) {
        for (berval** value = attr->a_vals; *value != nullptr; ++value) {
            if (visit(*attr, **value)) {
                return true;
            }
        }
        attr_find_next_attr_match(entry, type, &started, &tag_state, info, &attr);
    }
    return false;
}

// A copy of the value in normal form, put to a regular expression.
bool has_match(const Entry* entry, const char* type, const regex_t& expression)
{
    return any_value(entry, type, [&](const Attribute& attr, const berval& value) {
        char* copy = strndup(value.bv_val, value.bv_len);
        value_normalize(&copy, static_cast<std::uint32_t>(attr.a_syntax));
        const bool found = regexec(&expression, copy, 0, nullptr, 0) == 0;
        std::free(copy);
        return found;
    });
}

std::size_t count_matches(const std::vector<entry_guard>& entries, const Filter* filter)
{
    std::size_t matches = 0;
    for (const entry_guard& entry : entries) {
        matches += test_filter(entry.get(), filter) == FILTER_TRUE ? 1u : 0u;
    }
    return matches;
}

void BM_TestFilterSubstrings(benchmark::State& state)
{
    const std::vector<entry_guard> entries = make_persons();
    const substring_filter& wanted = substring_filters[state.range(0)];
    state.SetLabel(wanted.text);
    const filter_guard filter = filter_of(wanted.text);
    best_time testing;
    best_time yardstick;
    best_time walk;
    std::size_t matches = 0;
    double allocations = 0;
    for (auto _ : state) {
        double seconds = 0;
        allocations = bench_support::allocations_of(
            [&] { seconds = bench_support::seconds_of([&] { matches = count_matches(entries, filter.get()); }); });
        state.SetIterationTime(seconds);
        testing.add(seconds);
        std::size_t expected = 0;
        yardstick.measure([&] {
            regex_t expression;
            if (regcomp(&expression, wanted.expression, REG_NOSUB) != 0) {
                std::abort();
            }
            for (const entry_guard& entry : entries) {
                expected += has_match(entry.get(), wanted.type, expression) ? 1u : 0u;
            }
            regfree(&expression);
        });
        if (matches != expected || matches == 0) {
            std::abort();
        }
        walk.measure([&] {
            for (const entry_guard& entry : entries) {
                any_value(entry.get(), wanted.type, [](const Attribute&, const berval& value) {
                    benchmark::DoNotOptimize(value.bv_val);
                    return false;
                });
            }
        });
    }
    state.counters["matches"] = static_cast<double>(matches);
    state.counters["allocations"] = allocations / persons;
    state.counters["ns_per_entry"] = testing.seconds() * 1e9 / persons;
    bench_support::report_part(state, "walk", walk);
    state.counters["beyond_walk"] = (testing.seconds() - walk.seconds()) / (yardstick.seconds() - walk.seconds());
    bench_support::report_goal(state, testing, yardstick, 1.0 / 3);
}
BENCHMARK(BM_TestFilterSubstrings)->ArgName("filter")->DenseRange(0, 2)->Iterations(100)->UseManualTime();

// `speedup` is that of two threads.
void BM_TestFilterThreads(benchmark::State& state)
{
    constexpr std::size_t rounds = 500;
    const std::vector<entry_guard> entries = make_persons();
    std::vector<filter_guard> filters;
    for (const substring_filter& wanted : substring_filters) {
        filters.push_back(filter_of(wanted.text));
    }
    bench_support::measure_two_threads(state, [&] {
        for (std::size_t i = 0; i < rounds; ++i) {
            for (const filter_guard& filter : filters) {
                benchmark::DoNotOptimize(count_matches(entries, filter.get()));
            }
        }
    });
}
BENCHMARK(BM_TestFilterThreads)->Iterations(5)->UseManualTime();

}  // namespace
