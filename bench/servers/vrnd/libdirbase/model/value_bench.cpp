// Values of a large group: adding members one at a time, duplicates dropped, and finding one.
//
// Members are DNs in random order, as a client writes them. The cost of one addition at a thousand members, measured in
// the same run, is the yardstick of the others: it may be three times that at a million. The cost of finding one is
// held against the normalisation of the same DNs and an avl_find of ready nodes, one after the other. Each round takes
// other members than the one before, so that the way to them isn't in the caches yet.
#include <malloc.h>

#include <benchmark/benchmark.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <numeric>
#include <random>
#include <string>
#include <vector>

#include "bench/support/allocation_count.h"
#include "bench/support/generated_schema.h"
#include "bench/support/timing.h"
#include "servers/vrnd/libdirbase/base/syntax_codes.h"
#include "servers/vrnd/libdirbase/model/attr_value_tree.h"
#include "servers/vrnd/libdirbase/model/value_add.h"
#include "servers/vrnd/libdirbase/model/value_normalize.h"
#include "servers/vrnd/libdirbase/schema/ldcf_api.h"

namespace {

using bench_support::best_time;
using bench_support::seconds_of;

constexpr std::size_t thousand = 1000;
constexpr std::size_t at_a_time = 500;
constexpr std::size_t rounds = 30;
constexpr std::uint32_t dn_syntax = SC_DN | SC_CIS;

std::string member(std::size_t number)
{
    return "cn=Member " + std::to_string(number) + ", ou=People, o=Acme, c=us";
}

void add(Attribute& attr, const std::string& text)
{
    berval value = {text.size(), const_cast<char*>(text.data())};
    berval* values[] = {&value, nullptr};
    if (value_add_normalize(&attr.a_vals, values, dn_syntax, &attr, 1, 0) != 0) {
        std::abort();
    }
}

// A group, and newcomers for each round.
class group {
public:
    explicit group(std::size_t count) : numbers_(count + at_a_time * rounds)
    {
        bench_support::require_shipped_schema();
        std::iota(numbers_.begin(), numbers_.end(), std::size_t{0});
        std::shuffle(numbers_.begin(), numbers_.end(), std::mt19937(1));
        flatattr_insert(&entry_, ldcf_api_attr_get_info("member", nullptr), "member", &attr_, nullptr);
        const std::size_t before = heap_in_use();
        for (std::size_t i = 0; i < count; ++i) {
            add(*attr_, member(numbers_[i]));
        }
        bytes_ = heap_in_use() - before;
        next_ = count;
        choose_newcomers();
    }
    ~group() { attr_free(attr_); }
    group(const group&) = delete;
    group& operator=(const group&) = delete;

    Attribute& attr() { return *attr_; }
    std::size_t bytes() const { return bytes_; }
    std::size_t number(std::size_t index) const { return numbers_[index]; }

    void add_newcomers()
    {
        for (const std::string& text : newcomers_) {
            add(*attr_, text);
        }
    }

    // Takes the newcomers out again, and chooses others.
    void remove_newcomers()
    {
        for (std::size_t i = 0; i < newcomers_.size(); ++i) {
            berval*& last = attr_->a_vals[--attr_->a_numvals];
            delete_valuetree_value(attr_, last, dn_syntax);
            ber_bvfree(last);
            last = nullptr;
        }
        choose_newcomers();
    }

private:
    void choose_newcomers()
    {
        newcomers_.clear();
        for (std::size_t i = 0; i < at_a_time && next_ < numbers_.size(); ++i) {
            newcomers_.push_back(member(numbers_[next_++]));
        }
    }

    static std::size_t heap_in_use()
    {
        const struct mallinfo2 info = mallinfo2();
        return info.uordblks + info.hblkhd;
    }

    std::vector<std::size_t> numbers_;
    std::size_t next_ = 0;
    std::vector<std::string> newcomers_;
    Entry entry_ = {};
    Attribute* attr_ = nullptr;
    std::size_t bytes_ = 0;
};

double block_size(void* block)
{
    return static_cast<double>(malloc_usable_size(block) + sizeof(std::size_t));
}

// What one value takes, and where: the blocks of the value at the root of the tree stand for all.
void report_bytes(benchmark::State& state, group& members)
{
    Attribute& attr = members.attr();
    const auto count = static_cast<double>(attr.a_numvals);
    state.counters["bytes"] = static_cast<double>(members.bytes()) / count;
    state.counters["bytes_array"] = block_size(attr.a_vals) / count;
    state.counters["bytes_copy"] = block_size(attr.a_vals[0]) + block_size(attr.a_vals[0]->bv_val);
    state.counters["bytes_node"] = block_size(attr.a_tree->data);
    state.counters["bytes_tree"] = block_size(attr.a_tree);
    state.counters["bytes_text"] = static_cast<double>(attr.a_vals[0]->bv_len);
}

void BM_ValueAddNormalize(benchmark::State& state)
{
    group few(thousand);
    group members(static_cast<std::size_t>(state.range(0)));
    report_bytes(state, members);
    best_time adding;
    best_time yardstick;
    double allocations = 0;
    for (auto _ : state) {
        double seconds = 0;
        allocations = bench_support::allocations_of([&] { seconds = seconds_of([&] { members.add_newcomers(); }); });
        state.SetIterationTime(seconds);
        adding.add(seconds);
        members.remove_newcomers();
        yardstick.measure([&] { few.add_newcomers(); });
        few.remove_newcomers();
    }
    state.counters["allocations"] = allocations / at_a_time;
    state.counters["us_per_value"] = adding.seconds() * 1e6 / at_a_time;
    state.counters["us_at_thousand"] = yardstick.seconds() * 1e6 / at_a_time;
    bench_support::report_goal(state, adding, yardstick, 3);
}
BENCHMARK(BM_ValueAddNormalize)
    ->ArgName("members")
    ->Arg(1'000)
    ->Arg(100'000)
    ->Arg(1'000'000)
    ->Iterations(rounds)
    ->UseManualTime();

// Members to look for: as written, and for the yardstick in buffers to normalise and as nodes.
class sought {
public:
    sought(const group& members, std::size_t first, std::size_t count)
    {
        for (std::size_t i = 0; i < at_a_time; ++i) {
            texts.push_back(member(members.number((first + i * (count / at_a_time)) % count)));  // far from each other
            const berval value = value_of(texts.back());
            nodes.push_back(nullptr);
            create_normalized_berval_in_attrvalsNorm(&nodes.back(), &value, dn_syntax, 1);
        }
        buffers = texts;
    }
    ~sought() { std::for_each(nodes.begin(), nodes.end(), free_AttrvalsNorm); }
    sought(const sought&) = delete;
    sought& operator=(const sought&) = delete;

    static berval value_of(std::string& text) { return {text.size(), text.data()}; }

    std::vector<std::string> texts;
    std::vector<std::string> buffers;
    std::vector<AttrvalsNorm*> nodes;
};

void BM_ValueFind(benchmark::State& state)
{
    const auto count = static_cast<std::size_t>(state.range(0));
    group members(count);
    const Attribute& attr = members.attr();
    best_time finding;
    best_time normalizing;
    best_time looking_up;
    double allocations = 0;
    std::size_t first = 0;
    for (auto _ : state) {
        sought wanted(members, first, count);
        sought others(members, first + 1, count);
        first += 2;
        const auto find_all = [&] {
            for (std::string& text : wanted.texts) {
                const berval value = sought::value_of(text);
                if (value_find(&attr, &value, dn_syntax, 1) != 0) {
                    std::abort();
                }
            }
        };
        double seconds = 0;
        allocations = bench_support::allocations_of([&] { seconds = seconds_of(find_all); });
        state.SetIterationTime(seconds);
        finding.add(seconds);
        normalizing.measure([&] {
            for (std::string& text : others.buffers) {
                berval value = sought::value_of(text);
                value_normalize_berval(&value, dn_syntax, 1);
            }
        });
        looking_up.measure([&] {
            for (const AttrvalsNorm* node : others.nodes) {
                benchmark::DoNotOptimize(avl_find(attr.a_tree, node, value_cmp_fast));
            }
        });
    }
    best_time yardstick;
    yardstick.add(normalizing.seconds() + looking_up.seconds());
    state.counters["allocations"] = allocations / at_a_time;
    state.counters["us_per_value"] = finding.seconds() * 1e6 / at_a_time;
    state.counters["us_normalize"] = normalizing.seconds() * 1e6 / at_a_time;
    state.counters["us_avl_find"] = looking_up.seconds() * 1e6 / at_a_time;
    bench_support::report_goal(state, finding, yardstick, 2);
}
BENCHMARK(BM_ValueFind)->ArgName("members")->Arg(1'000)->Arg(1'000'000)->Iterations(rounds)->UseManualTime();

}  // namespace
