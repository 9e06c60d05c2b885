// Entries and their text: reading and writing entries of persons, and a group of a million members.
//
// Reading is held against a memchr pass over the lines of the same texts, writing against a copy of what is written.
// The entries differ from each other in lengths and values, and a round takes all of them.
#include <benchmark/benchmark.h>

#include <cstdlib>
#include <cstring>
#include <memory>
#include <numeric>
#include <random>
#include <string>
#include <utility>
#include <vector>

#include "bench/support/allocation_count.h"
#include "bench/support/generated_schema.h"
#include "bench/support/timing.h"
#include "libraries/libldif/line64.h"
#include "servers/vrnd/libdirbase/model/attribute.h"
#include "servers/vrnd/libdirbase/model/entry_ber.h"
#include "servers/vrnd/libdirbase/model/entry_text.h"

namespace {

using bench_support::best_time;
using bench_support::elapsed_seconds_of;
using bench_support::seconds_of;

constexpr std::size_t persons = 4;  // so few that all they are made of stays in the first-level cache
constexpr std::size_t repeats = 1000;

struct free_entry {
    void operator()(Entry* entry) const { entry_free(entry); }
};
using entry_guard = std::unique_ptr<Entry, free_entry>;

std::string word(std::mt19937& random, std::size_t least, std::size_t most)
{
    std::string text(std::uniform_int_distribution<std::size_t>(least, most)(random), 'a');
    for (char& c : text) {
        c = static_cast<char>('a' + random() % 26);
    }
    text[0] = static_cast<char>(text[0] - 'a' + 'A');
    return text;
}

std::string phrase(std::mt19937& random, const char* start, std::size_t length)
{
    std::string text = start;
    while (text.size() < length) {
        text += " " + word(random, 3, 10);
    }
    return text;
}

// As the server writes it.
std::string line(const std::string& type, const std::string& value)
{
    char* text = ldif_type_and_value(type.c_str(), value.data(), value.size());
    const std::string made = text;
    std::free(text);
    return made;
}

// Fifteen values and the DN; the description is folded twice.
std::string person(std::size_t number)
{
    std::mt19937 random(static_cast<unsigned>(number));
    const std::string given = word(random, 4, 9);
    const std::string last = word(random, 5, 12);
    const std::string digits = std::to_string(100'000 + number * 37);
    const std::string base = ",ou=" + word(random, 6, 12) + ",o=Acme,c=us";
    return line("dn", "cn=" + given + " " + last + base) +
           "objectClass: top\nobjectClass: person\nobjectClass: organizationalPerson\nobjectClass: inetOrgPerson\n" +
           line("cn", given + " " + last) + line("sn", last) + line("givenName", given) +
           line("uid", given.substr(0, 1) + last) + line("mail", given + "." + last + "@example.com") +
           line("telephoneNumber", "+1 512 555 " + digits) + line("employeeNumber", digits) +
           line("title", phrase(random, "Head of", 16)) +
           line("postalAddress",
                digits.substr(2) + " " + word(random, 6, 12) + " Street$" + word(random, 6, 12) + "$" + digits) +
           line("manager", "cn=" + word(random, 4, 9) + " " + word(random, 5, 12) + base) +
           line("description", phrase(random, "Looks after", 160));
}

// The texts of some persons, one after the other.
struct person_texts {
    person_texts()
    {
        bench_support::require_shipped_schema();
        for (std::size_t i = 0; i < persons; ++i) {
            texts.push_back(person(i));
            bytes += texts.back().size();
        }
        copies = texts;
    }

    // Reading spoils a text, so each is read from a copy.
    void restore()
    {
        for (std::size_t i = 0; i < persons; ++i) {
            std::memcpy(copies[i].data(), texts[i].data(), texts[i].size());
        }
    }

    std::vector<std::string> texts;
    std::vector<std::string> copies;
    std::size_t bytes = 0;
};

void report_speed(benchmark::State& state, const best_time& time, std::size_t bytes)
{
    state.counters["us_per_entry"] = time.seconds() * 1e6 / persons;
    state.counters["MB_per_s"] = static_cast<double>(bytes) / time.seconds() / 1e6;
}

std::size_t count_lines(const std::string& text)
{
    std::size_t lines = 0;
    const char* at = text.data();
    const char* const end = at + text.size();
    while ((at = static_cast<const char*>(std::memchr(at, '\n', static_cast<std::size_t>(end - at)))) != nullptr) {
        ++lines;
        ++at;
    }
    return lines;
}

// Each person is read by himself, right after the one before was released.
void BM_Str2Entry(benchmark::State& state)
{
    person_texts data;
    const int flag = static_cast<int>(state.range(0));
    std::vector<best_time> each(persons);
    best_time yardstick;
    double allocations = 0;
    for (auto _ : state) {
        double total = 0;
        for (std::size_t i = 0; i < repeats; ++i) {
            data.restore();
            for (std::size_t n = 0; n < persons; ++n) {
                entry_guard entry;
                double seconds = 0;
                allocations = bench_support::allocations_of([&] {
                    seconds = elapsed_seconds_of([&] { entry.reset(str2entry(data.copies[n].data(), flag, flag)); });
                });
                if (entry == nullptr) {
                    std::abort();
                }
                each[n].add(seconds);
                total += seconds;
            }
        }
        std::size_t lines = 0;
        yardstick.add(seconds_of([&] {
                          for (std::size_t i = 0; i < repeats; ++i) {
                              for (const std::string& text : data.texts) {
                                  benchmark::DoNotOptimize(lines += count_lines(text));
                              }
                          }
                      }) /
                      repeats);
        state.SetIterationTime(total);
    }
    best_time reading;
    reading.add(std::accumulate(each.begin(), each.end(), 0.0,
                                [](double sum, const best_time& time) { return sum + time.seconds(); }));
    state.counters["allocations"] = allocations;
    report_speed(state, reading, data.bytes);
    bench_support::report_goal(state, reading, yardstick, 25);
}
BENCHMARK(BM_Str2Entry)->ArgName("flags")->Arg(0)->Arg(1)->Iterations(30)->UseManualTime();

void BM_Entry2Str(benchmark::State& state)
{
    person_texts data;
    std::vector<entry_guard> entries;
    std::string copy(data.bytes, '\0');
    for (std::string& text : data.copies) {
        entries.emplace_back(str2entry(text.data(), 0, 0));
    }
    initEnt2StrMutex();
    best_time writing;
    best_time copying;
    best_time encoding;
    double allocations = 0;
    std::size_t written = 0;
    for (auto _ : state) {
        double seconds = 0;
        allocations = bench_support::allocations_of([&] {
            seconds = seconds_of([&] {
                for (std::size_t i = 0; i < repeats; ++i) {
                    written = 0;
                    for (const entry_guard& entry : entries) {
                        std::size_t length = 0;
                        benchmark::DoNotOptimize(entry2str(entry.get(), &length, 0));
                        written += length;
                    }
                }
            });
        });
        state.SetIterationTime(seconds);
        writing.add(seconds / repeats);
        copying.add(seconds_of([&] {
                        for (std::size_t i = 0; i < repeats; ++i) {
                            for (const std::string& text : data.texts) {
                                std::memcpy(copy.data(), text.data(), text.size());
                                benchmark::ClobberMemory();
                            }
                        }
                    }) /
                    repeats);
        encoding.add(seconds_of([&] {
                         for (std::size_t i = 0; i < repeats; ++i) {
                             for (const entry_guard& entry : entries) {
                                 char* ber = nullptr;
                                 std::size_t length = 0;
                                 entry2ber(entry.get(), &ber, &length);
                                 std::free(ber);
                             }
                         }
                     }) /
                     repeats);
    }
    if (written != data.bytes) {
        std::abort();
    }
    state.counters["allocations"] = allocations / static_cast<double>(persons * repeats);
    state.counters["us_entry2ber"] = encoding.seconds() * 1e6 / persons;
    report_speed(state, writing, data.bytes);
    bench_support::report_goal(state, writing, copying, 10);
}
BENCHMARK(BM_Entry2Str)->Iterations(100)->UseManualTime();

// A group, written with its members and without.
void BM_WriteGroup(benchmark::State& state)
{
    bench_support::require_shipped_schema();
    const auto members = static_cast<std::size_t>(state.range(0));
    const bool all = state.range(1) != 0;
    std::string text = "dn: cn=Group,o=Acme\nobjectClass: groupOfNames\ncn: Group\n";
    for (std::size_t i = 0; i < members; ++i) {
        text += "member: cn=Member " + std::to_string(i) + ",ou=People,o=Acme,c=us\n";
    }
    entry_guard entry;
    best_time reading;
    reading.measure([&] { entry.reset(str2entry(text.data(), 0, 0)); });
    best_time writing;
    double allocations = 0;
    std::size_t length = 0;
    for (auto _ : state) {
        char* buffer = nullptr;
        std::size_t size = 0;
        std::free(std::exchange(ebuf_global, nullptr));
        const double seconds = seconds_of([&] {
            allocations = bench_support::allocations_of([&] {
                char* made = all ? entry2str(entry.get(), &length, 0)
                                 : entry2str_wo_members(entry.get(), &length, 0, &buffer, &size, 0);
                if (made == nullptr) {
                    std::abort();
                }
            });
        });
        std::free(buffer);
        state.SetIterationTime(seconds);
        writing.add(seconds);
    }
    state.counters["us"] = writing.seconds() * 1e6;
    state.counters["us_reading"] = reading.seconds() * 1e6;
    state.counters["allocations"] = allocations;
    state.counters["bytes"] = static_cast<double>(length);
}
BENCHMARK(BM_WriteGroup)
    ->ArgNames({"members", "all"})
    ->Args({1'000'000, 1})
    ->Args({10, 0})
    ->Args({1'000'000, 0})
    ->Iterations(5)
    ->UseManualTime();

// An entry with so many attributes that the schema doesn't know, in random order of names.
void BM_ReadManyAttributes(benchmark::State& state)
{
    bench_support::require_shipped_schema();
    std::mt19937 random(1);
    std::string text = "dn: cn=a\n";
    for (std::int64_t i = 0; i < state.range(0); ++i) {
        text += "x" + std::to_string(random()) + "-" + std::to_string(i) + ": value\n";
    }
    for (auto _ : state) {
        std::string copy = text;
        entry_guard entry;
        state.SetIterationTime(seconds_of([&] { entry.reset(str2entry(copy.data(), 0, 0)); }));
    }
}
BENCHMARK(BM_ReadManyAttributes)
    ->ArgName("attributes")
    ->Arg(1'000)
    ->Arg(10'000)
    ->Arg(100'000)
    ->Iterations(1)
    ->UseManualTime()
    ->Unit(benchmark::kMillisecond);

}  // namespace
