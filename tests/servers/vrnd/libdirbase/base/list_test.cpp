// The list: its chain, who frees what, whom it wakes, and many threads that add to it.
#include <gtest/gtest.h>

#include <algorithm>
#include <iterator>
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

TEST(List, AdditionsMakeAChainThatReadsBothWays)
{
    List<int*> list(0, true);
    EXPECT_EQ(list.getHead(), nullptr);
    EXPECT_EQ(list.tail, nullptr);
    int values[5] = {};
    const ListEntry<int*>* before = nullptr;
    for (int& value : values) {
        EXPECT_EQ(list.add(&value), 0);
        const ListEntry<int*>* added = before == nullptr ? list.getHead() : before->next;
        ASSERT_EQ(list.tail, added);
        EXPECT_EQ(added->value, &value);
        EXPECT_EQ(added->previous, before);
        EXPECT_EQ(added->next, nullptr);
        before = added;
    }
}

TEST(List, ClearingDeletesTheValuesOnlyWhenAsked)
{
    const auto shared = std::make_shared<int>();
    using value = std::shared_ptr<int>;
    auto* a = new value(shared);
    auto* b = new value(shared);
    {
        List<value*> list(1, false);
        for (const bool deleting : {false, true}) {
            list.add(a);
            list.add(nullptr);
            list.clear(deleting);
            EXPECT_EQ(shared.use_count(), deleting ? 2 : 3);
            EXPECT_EQ(list.head, nullptr);
            EXPECT_EQ(list.tail, nullptr);
        }
        list.clear(true);  // nothing twice
        list.add(b);
    }
    EXPECT_EQ(shared.use_count(), 2) << "a list that goes leaves its values";
    delete b;
}

TEST(List, OnlyTheArgumentOneMakesACondition)
{
    for (const int with : {-1, 0, 1, 2}) {
        EXPECT_EQ(List<int*>(with, true).getCondition() != nullptr, with == 1) << with;
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
    std::vector<std::vector<int>> values(4, std::vector<int>(3000));
    List<int*> list(1, false);
    std::vector<std::jthread> threads;
    for (std::vector<int>& own : values) {
        threads.emplace_back([&list, &own] {
            for (int& value : own) {
                EXPECT_EQ(list.add(&value), 0);
            }
        });
    }
    std::vector<int*> taken;
    while (taken.size() < 4 * 3000) {
        pthread_mutex_lock(list.getMutex());
        while (list.head == nullptr) {
            pthread_cond_wait(list.getCondition(), list.getMutex());
        }
        std::unique_ptr<ListEntry<int*>> entry(list.head);
        list.head = list.tail = nullptr;
        pthread_mutex_unlock(list.getMutex());
        for (; entry; entry.reset(entry->next)) {
            taken.push_back(entry->value);
        }
    }
    EXPECT_EQ(list.head, nullptr);
    for (std::vector<int>& own : values) {
        std::vector<int*> mine;
        std::copy_if(taken.begin(), taken.end(), std::back_inserter(mine),
                     [&own](const int* value) { return value >= own.data() && value < own.data() + own.size(); });
        EXPECT_EQ(mine.size(), own.size());
        EXPECT_TRUE(std::is_sorted(mine.begin(), mine.end()));
    }
}

}  // namespace
