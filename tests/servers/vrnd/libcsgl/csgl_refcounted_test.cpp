// Counted bodies and their handles, with real threads: run these under ThreadSanitizer.
#include "servers/vrnd/libcsgl/csgl_refcounted.h"

#include <gtest/gtest.h>

#include <atomic>
#include <latch>
#include <string>
#include <thread>
#include <vector>

#include "servers/vrnd/libcsgl/csgl_string.h"

namespace {

constexpr unsigned thread_count = 8;

// Runs an action on many threads that begin together; it gets the number of its thread.
void run_threads(const auto& action)
{
    std::latch all(thread_count);
    std::vector<std::jthread> threads;
    for (unsigned t = 0; t < thread_count; ++t) {
        threads.emplace_back([&, t] {
            all.arrive_and_wait();
            action(t);
        });
    }
}

struct body;
using handle = csgl_refcounted_pointer_to<body>;

// Tells of its end, and may hold another body.
struct body : csgl_refcounted<body> {
    explicit body(std::atomic<int>& counter, const handle& held = handle()) : ended(counter), next(held) {}
    body(const body&) = default;
    ~body() { ++ended; }

    std::atomic<int>& ended;
    handle next;
    int payload = 0;  // changed by an only holder, without a lock
};

}  // namespace

TEST(Handle, CountsItsBodyAndEndsItWithTheLast)
{
    std::atomic<int> ended{0};
    handle a(new body(ended));
    const handle b = a;
    a = b;  // another handle on the same body
    EXPECT_EQ(b->value(), 2);
    EXPECT_EQ(handle(new body(*a))->value(), 1);  // a copy of a body counts for itself
    EXPECT_EQ(ended, 1);
    a = handle(new body(ended, handle(new body(ended, b))));
    a = a->next;  // what is assigned lies in what goes
    EXPECT_EQ(ended, 2);
    a = handle();
    EXPECT_EQ(ended, 3);
    EXPECT_EQ(b->value(), 1);
}

TEST(HandleThreads, ManyThreadsCopyAndDropOneBodyAndOneEndsIt)
{
    for (int round = 0; round < 200; ++round) {
        std::atomic<int> ended{0};
        std::vector<handle> own(thread_count, handle(new body(ended, handle(new body(ended)))));
        run_threads([&](unsigned t) {
            for (int i = 0; i < 20; ++i) {
                handle other = own[t];
                EXPECT_EQ(other->payload, 0);
                other = other->next;
            }
            if (own[t]->value() == 1)
                own[t]->payload = 1;  // all that the others did is over
            own[t] = handle();
        });
        ASSERT_EQ(ended, 2);
    }
}

TEST(HandleThreads, SharedStringsKeepTheirTextWhileOthersAppend)
{
    for (int round = 0; round < 200; ++round) {
        const std::string base(20, 'b');
        std::vector<csgl_string> own(thread_count, csgl_string(base.c_str()));
        run_threads([&](unsigned t) {
            std::string expected = base;
            for (int i = 0; i < 30; ++i)
                EXPECT_EQ(own[t].append(&"abcdefgh"[t], 1).c_str(), expected += "abcdefgh"[t]);
            EXPECT_TRUE(csgl_string().empty());
        });
    }
}
