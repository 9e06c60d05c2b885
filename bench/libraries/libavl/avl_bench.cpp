// The tree beside std::set of pointers with the same comparison, called through the same pointer.
//
// Both do the same work on the same objects within each iteration, so what disturbs one disturbs the other. An
// iteration treats all n objects in random order. The time is the tree's; `ratio` is the tree's time over the set's,
// and `goal` what it may be.
#include <benchmark/benchmark.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <random>
#include <set>
#include <vector>

#include <time.h>

#include "libraries/libavl/avl.h"

namespace {

constexpr double goal = 1.5;

struct object {
    std::uint64_t key;
};

int compare(const void* wanted, const void* stored, int /*argument*/)
{
    const std::uint64_t a = static_cast<const object*>(wanted)->key;
    const std::uint64_t b = static_cast<const object*>(stored)->key;
    return (a > b) - (a < b);
}

// Hidden from the optimiser, which must not put the comparison into one of the two and leave it out of the other.
avl_cmp volatile hidden_compare = compare;

struct less {
    avl_cmp cmp = hidden_compare;
    bool operator()(const object* a, const object* b) const { return cmp(a, b, 0) < 0; }
};

using object_set = std::set<object*, less>;

// Keys in random order, and two further random orders of the same objects: for the look-ups and for the deletes.
struct workload {
    std::vector<object> objects;
    std::vector<object*> lookups;
    std::vector<object*> deletes;

    explicit workload(std::size_t count) : objects(count)
    {
        std::mt19937_64 random(count);
        for (std::size_t i = 0; i < count; ++i)
            objects[i].key = i * 2654435761u;
        std::shuffle(objects.begin(), objects.end(), random);
        for (object& o : objects)
            lookups.push_back(&o);
        deletes = lookups;
        std::shuffle(lookups.begin(), lookups.end(), random);
        std::shuffle(deletes.begin(), deletes.end(), random);
    }
};

// Seconds of this thread's processor time that `work` takes.
template <typename Work>
double seconds(Work work)
{
    const auto now = [] {
        timespec t = {};
        clock_gettime(CLOCK_THREAD_CPUTIME_ID, &t);
        return static_cast<double>(t.tv_sec) + 1e-9 * static_cast<double>(t.tv_nsec);
    };
    const double start = now();
    work();
    return now() - start;
}

enum step { insert_step, find_step, delete_step };

double time_tree(workload& work, step what)
{
    const avl_cmp cmp = hidden_compare;
    avl_node* root = nullptr;
    const double filling = seconds([&] {
        for (object& o : work.objects)
            avl_insert(&root, &o, cmp, avl_dup_error);
    });
    double spent = filling;
    if (what == find_step) {
        spent = seconds([&] {
            for (const object* o : work.lookups)
                benchmark::DoNotOptimize(avl_find(root, o, cmp));
        });
    } else if (what == delete_step) {
        spent = seconds([&] {
            for (const object* o : work.deletes)
                benchmark::DoNotOptimize(avl_delete(&root, o, cmp));
        });
    }
    avl_free(root, nullptr);
    return spent;
}

double time_set(workload& work, step what)
{
    object_set set;
    const double filling = seconds([&] {
        for (object& o : work.objects)
            set.insert(&o);
    });
    double spent = filling;
    if (what == find_step) {
        spent = seconds([&] {
            for (object* o : work.lookups)
                benchmark::DoNotOptimize(*set.find(o));
        });
    } else if (what == delete_step) {
        spent = seconds([&] {
            for (object* o : work.deletes)
                benchmark::DoNotOptimize(set.erase(o));
        });
    }
    return spent;
}

double median(std::vector<double>& values)
{
    const auto middle = values.begin() + static_cast<std::ptrdiff_t>(values.size() / 2);
    std::nth_element(values.begin(), middle, values.end());
    return *middle;
}

void measure(benchmark::State& state, step what)
{
    workload work(static_cast<std::size_t>(state.range(0)));
    time_tree(work, what);  // warms the heap for both
    time_set(work, what);

    std::vector<double> tree;
    std::vector<double> set;
    for (auto _ : state) {
        const bool tree_first = tree.size() % 2 == 0;
        if (tree_first)
            tree.push_back(time_tree(work, what));
        set.push_back(time_set(work, what));
        if (!tree_first)
            tree.push_back(time_tree(work, what));
        state.SetIterationTime(tree.back());
    }
    state.SetItemsProcessed(state.iterations() * state.range(0));
    state.counters["ratio"] = median(tree) / median(set);
    state.counters["goal"] = goal;
}

// Few rounds where one is long.
BENCHMARK_CAPTURE(measure, avl_insert, insert_step)->Arg(1'000)->Iterations(501)->UseManualTime();
BENCHMARK_CAPTURE(measure, avl_insert, insert_step)->Arg(100'000)->Iterations(9)->UseManualTime();
BENCHMARK_CAPTURE(measure, avl_insert, insert_step)->Arg(1'000'000)->Iterations(3)->UseManualTime();
BENCHMARK_CAPTURE(measure, avl_find, find_step)->Arg(1'000)->Iterations(501)->UseManualTime();
BENCHMARK_CAPTURE(measure, avl_find, find_step)->Arg(100'000)->Iterations(9)->UseManualTime();
BENCHMARK_CAPTURE(measure, avl_find, find_step)->Arg(1'000'000)->Iterations(3)->UseManualTime();
BENCHMARK_CAPTURE(measure, avl_delete, delete_step)->Arg(1'000)->Iterations(501)->UseManualTime();
BENCHMARK_CAPTURE(measure, avl_delete, delete_step)->Arg(100'000)->Iterations(9)->UseManualTime();
BENCHMARK_CAPTURE(measure, avl_delete, delete_step)->Arg(1'000'000)->Iterations(3)->UseManualTime();

}  // namespace
