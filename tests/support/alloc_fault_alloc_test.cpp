// The harness itself: it reaches the allocations of a shared library, fails each of them once, and sees what is left.
#include "tests/support/alloc_fault.h"

#include <gtest/gtest-spi.h>
#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <new>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

using test_support::alloc_fault_pause;
using test_support::allocation_failed;
using test_support::for_each_failing_allocation;

namespace {

struct alignas(64) wide {
    char bytes[64];
};

// Three allocations: inside libstdc++.so, aligned, and one that reports by null.
void allocate_three_times()
{
    std::string text;
    text.append(200, 'x');
    const auto aligned = std::make_unique<wide>();
    void* block = ::operator new(1, std::nothrow);
    if (block == nullptr) {
        throw std::bad_alloc();
    }
    ::operator delete(block);
}

}  // namespace

TEST(AllocFault, EachAllocationFailsOnceAndTheLastRunIsWhole)
{
    std::vector<std::size_t> failed;
    failed.reserve(10);
    std::size_t whole = 0;
    const std::size_t points = for_each_failing_allocation([&](std::size_t point) {
        try {
            allocate_three_times();
            ++whole;
        } catch (const std::bad_alloc&) {
            EXPECT_TRUE(allocation_failed());
            failed.push_back(point);
        }
    });
    EXPECT_EQ(points, 3u);
    EXPECT_EQ(failed, (std::vector<std::size_t>{1, 2, 3}));
    EXPECT_EQ(whole, 2u);
}

TEST(AllocFault, AllAllocationsFromOneOnFail)
{
    std::vector<int> made;
    made.reserve(10);
    EXPECT_EQ(3u, for_each_failing_allocation(
                      [&](std::size_t) {
                          int count = 0;
                          for (int i = 0; i < 3; ++i) {
                              const std::unique_ptr<int> block(new (std::nothrow) int(i));
                              count += block != nullptr ? 1 : 0;
                          }
                          made.push_back(count);
                      },
                      test_support::alloc_failures::all_from_there));
    EXPECT_EQ(made, (std::vector{3, 0, 1, 2, 3}));
}

TEST(AllocFault, OtherThreadsAndPausesAndExceptionsInFlightAreLeftAlone)
{
    std::atomic<unsigned> rounds = 0;
    const std::jthread other([&rounds](const std::stop_token& stop) {
        for (; !stop.stop_requested(); ++rounds) {
            allocate_three_times();
        }
    });
    const std::size_t points = for_each_failing_allocation([&](std::size_t) {
        for (const unsigned start = rounds; rounds < start + 2;) {
            std::this_thread::yield();
        }
        {
            const alloc_fault_pause pause;
            allocate_three_times();
        }
        try {
            throw 1;
        } catch (int) {
        }
        ::operator delete(::operator new(1));
    });
    EXPECT_EQ(points, 1u);
}

TEST(AllocFault, ABlockLeftBehindIsATestFailure)
{
    static void* leaked = nullptr;
    EXPECT_NONFATAL_FAILURE(for_each_failing_allocation([](std::size_t) {
                                void* block = ::operator new(1);
                                try {
                                    ::operator delete(::operator new(1));
                                } catch (const std::bad_alloc&) {
                                    leaked = block;
                                    throw;
                                }
                                ::operator delete(block);
                            }),
                            "1 blocks left behind after allocation 2 failed");
    ::operator delete(leaked);
}

TEST(AllocFault, AnExceptionWithoutAFailureReachesTheCaller)
{
    EXPECT_THROW(for_each_failing_allocation([](std::size_t) { throw std::runtime_error("unrelated"); }),
                 std::runtime_error);
}
