// Counted bodies and their handles, with real threads: run these under ThreadSanitizer.
#include "servers/vrnd/libcsgl/csgl_refcounted.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include "servers/vrnd/libcsgl/csgl_exception.h"
#include "servers/vrnd/libcsgl/csgl_string.h"

namespace {

constexpr unsigned thread_count = 8;
constexpr int rounds = 2000;

// Runs an action on many threads that begin together; it gets the number of its thread.
template <typename Action>
void run_threads(const Action& action)
{
    std::atomic<unsigned> waiting{thread_count};
    std::vector<std::thread> threads;
    for (unsigned t = 0; t < thread_count; ++t) {
        threads.emplace_back([&, t] {
            for (--waiting; waiting != 0;) {
                std::this_thread::yield();
            }
            action(t);
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
}

struct body;
using handle = csgl_refcounted_pointer_to<body>;

// Tells of its end, and may hold another body.
struct body : csgl_refcounted<body> {
    explicit body(std::atomic<int>& counter, handle held = handle()) : ended(counter), next(held) {}
    ~body() { ++ended; }

    std::atomic<int>& ended;
    handle next;
    int payload = 0;  // written without a lock by the only holder
};

}  // namespace

TEST(SyncValue, EachChangeGivesItsOwnResult)
{
    csgl_sync_value value(0);
    std::vector<int> results[thread_count];
    run_threads([&](unsigned t) {
        for (int i = 0; i < rounds; ++i) {
            results[t].push_back(value.increment());
        }
    });
    std::vector<int> all;
    for (const auto& some : results) {
        all.insert(all.end(), some.begin(), some.end());
    }
    std::sort(all.begin(), all.end());
    for (std::size_t i = 0; i < all.size(); ++i) {
        ASSERT_EQ(all[i], static_cast<int>(i) + 1);
    }
    std::atomic<int> zeros{0};
    run_threads([&](unsigned) {
        for (int i = 0; i < rounds; ++i) {
            zeros += value.decrement() == 0;
        }
    });
    EXPECT_EQ(zeros, 1);
}

TEST(Handle, CountsItsBodyAndEndsItWithTheLast)
{
    std::atomic<int> ended{0};
    handle a(new body(ended));
    EXPECT_EQ(a->value(), 1);
    {
        handle b = a;
        EXPECT_EQ(a->value(), 2);
        handle& alias = b;
        b = alias;  // itself
        b = a;      // another handle on the same body
        EXPECT_EQ(a->value(), 2);
        b = handle(new body(ended, b));
        EXPECT_EQ(a->value(), 2);  // held by the new body now
    }
    EXPECT_EQ(ended, 1);
    EXPECT_EQ(a->value(), 1);

    a = handle(new body(ended, handle(new body(ended, a))));  // a chain that ends in the old body
    EXPECT_EQ(ended, 1);
    a = a->next;  // what is assigned lies in what goes
    EXPECT_EQ(ended, 2);
    const handle none;
    a = none;
    EXPECT_EQ(ended, 4);
    EXPECT_FALSE(a);
}

TEST(Handle, ACopyOfABodyStartsUncounted)
{
    std::atomic<int> ended{0};
    const handle a(new body(ended));
    const handle b(new body(*a));
    EXPECT_EQ(b->value(), 1);
    EXPECT_EQ(a->value(), 1);
}

TEST(HandleThreads, ManyThreadsCopyAndDropOneBodyAndOneEndsIt)
{
    for (int round = 0; round < 200; ++round) {
        std::atomic<int> ended{0};
        std::vector<handle> own(thread_count, handle(new body(ended, handle(new body(ended)))));
        run_threads([&](unsigned t) {
            for (int i = 0; i < 20; ++i) {
                const handle first = own[t];
                handle second = first;
                second = first->next;
                second = first;
            }
            own[t] = handle();
        });
        ASSERT_EQ(ended, 2);
    }
}

// Appending in place is allowed to the last holder: all that earlier holders read must be over by then.
TEST(HandleThreads, SharedStringsKeepTheirTextWhileOthersAppend)
{
    const std::string base(20, 'b');
    for (int round = 0; round < 200; ++round) {
        std::vector<csgl_string> own(thread_count, csgl_string(base.c_str()));
        run_threads([&](unsigned t) {
            const std::string mark(1, static_cast<char>('a' + t));
            std::string expected = base;
            for (int i = 0; i < 30; ++i) {
                EXPECT_EQ(own[t].c_str(), expected);
                own[t].append(mark.c_str(), 1);
                expected += mark;
            }
            const csgl_string empty;
            EXPECT_TRUE(empty.empty());
        });
    }
}

TEST(HandleThreads, TheOnlyHolderMaySeeAndChangeWhatOthersLeft)
{
    for (int round = 0; round < 200; ++round) {
        std::atomic<int> ended{0};
        std::vector<handle> own(thread_count, handle(new body(ended)));
        std::atomic<int> changed{0};
        run_threads([&](unsigned t) {
            EXPECT_GE(own[t]->payload, 0);
            if (own[t]->value() == 1) {
                own[t]->payload = 1;
                ++changed;
            }
            own[t] = handle();
        });
        ASSERT_LE(changed, 1);
        ASSERT_EQ(ended, 1);
    }
}

TEST(HandleThreads, CopiesOfOneExceptionCrossThreads)
{
    const exc_invalid_token_t original("a.cpp", 12, "invalid [p[token]p]", 0);
    run_threads([&](unsigned) {
        for (int i = 0; i < rounds; ++i) {
            const exc_t copy = original;
            const csgl_message kept = copy.message();
            EXPECT_STREQ(kept.text(), "invalid token");
            EXPECT_STREQ(kept->parameter(0), "token");
        }
    });
    EXPECT_EQ(original.message()->value(), 1);
}
