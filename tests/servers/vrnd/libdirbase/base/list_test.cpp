// The list: its chain, who frees what, whom it wakes, and many threads that add to it.
#include <gtest/gtest.h>

#include <cstddef>
#include <memory>
#include <thread>
#include <vector>

#include <dlfcn.h>
#include <pthread.h>

#include "servers/vrnd/libdirbase/base/list.h"

// The list's broadcasts come through here, so that they can be counted. ThreadSanitizer has to see the real call.
#if !defined(__SANITIZE_THREAD__)
namespace {
thread_local int broadcasts = 0;
}

extern "C" __attribute__((visibility("default"))) int pthread_cond_broadcast(pthread_cond_t* cond)
{
    ++broadcasts;
    using broadcast_function = int (*)(pthread_cond_t*);
    static const auto real = reinterpret_cast<broadcast_function>(dlsym(RTLD_NEXT, "pthread_cond_broadcast"));
    return real(cond);
}
#endif

namespace {

// Counts those that are alive.
struct value {
    explicit value(int* counter) : alive(counter) { ++*alive; }
    ~value() { --*alive; }
    value(const value&) = delete;
    value& operator=(const value&) = delete;
    int* alive;
};

TEST(List, AdditionsMakeAChainThatReadsBothWays)
{
    List<int*> list(0, true);
    EXPECT_EQ(list.getHead(), nullptr);
    EXPECT_EQ(list.tail, nullptr);
    std::vector<int> values(5);
    for (int& v : values) {
        EXPECT_EQ(list.add(&v), 0);
        EXPECT_EQ(list.tail->value, &v);
    }
    const ListEntry<int*>* before = nullptr;
    const ListEntry<int*>* entry = list.getHead();
    for (int& v : values) {
        ASSERT_NE(entry, nullptr);
        EXPECT_EQ(entry->value, &v);
        EXPECT_EQ(entry->previous, before);
        before = entry;
        entry = entry->next;
    }
    EXPECT_EQ(entry, nullptr);
    EXPECT_EQ(list.tail, before);
}

TEST(List, ClearingDeletesTheValuesOnlyWhenAsked)
{
    int alive = 0;
    value* a = new value(&alive);
    value* b = new value(&alive);
    {
        List<value*> list(1, false);
        list.add(a);
        list.add(nullptr);
        list.add(b);
        list.clear(false);
        EXPECT_EQ(alive, 2);
        EXPECT_EQ(list.head, nullptr);
        EXPECT_EQ(list.tail, nullptr);

        list.add(a);
        list.add(nullptr);
        list.clear(true);
        EXPECT_EQ(alive, 1);
        EXPECT_EQ(list.head, nullptr);
        list.clear(true);  // nothing twice
        list.add(b);
    }
    EXPECT_EQ(alive, 1) << "a list that goes leaves its values";
    delete b;
}

TEST(List, OnlyTheArgumentOneMakesACondition)
{
    for (const int with : {-1, 0, 1, 2}) {
        List<int*> list(with, true);
        EXPECT_EQ(list.getCondition() != nullptr, with == 1) << with;
    }
}

#if !defined(__SANITIZE_THREAD__)
TEST(List, OnlyTheStepFromEmptyToOneWakes)
{
    int v = 0;
    for (const int with : {1, 0}) {
        List<int*> list(with, false);
        for (int round = 0; round < 2; ++round) {
            broadcasts = 0;
            list.add(&v);
            EXPECT_EQ(broadcasts, with);
            list.add(&v);
            list.addNoLock(&v);
            EXPECT_EQ(broadcasts, with);
            list.clear(false);
        }
    }
}
#endif

TEST(List, AConsumerMeetsEveryValueOfManyProducersInTheirOrder)
{
    constexpr std::size_t producers = 4;
    constexpr std::size_t each = 3000;
    struct item {
        std::size_t producer;
        std::size_t number;
    };
    List<item*> list(1, false);

    std::vector<std::thread> threads;
    for (std::size_t p = 0; p < producers; ++p) {
        threads.emplace_back([&list, p] {
            for (std::size_t i = 0; i < each; ++i)
                EXPECT_EQ(list.add(new item{p, i}), 0);
        });
    }
    std::vector<std::size_t> next(producers, 0);
    bool in_order = true;
    for (std::size_t taken = 0; taken < producers * each;) {
        pthread_mutex_lock(list.getMutex());
        while (list.head == nullptr)
            pthread_cond_wait(list.getCondition(), list.getMutex());
        std::unique_ptr<ListEntry<item*>> entry(list.head);
        list.head = list.tail = nullptr;
        pthread_mutex_unlock(list.getMutex());

        for (; entry; entry.reset(entry->next)) {
            const std::unique_ptr<item> got(entry->value);
            in_order = in_order && got->number == next[got->producer];
            ++next[got->producer];
            ++taken;
        }
    }
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_TRUE(in_order);
    EXPECT_EQ(next, std::vector<std::size_t>(producers, each));
    EXPECT_EQ(list.head, nullptr);
}

}  // namespace
