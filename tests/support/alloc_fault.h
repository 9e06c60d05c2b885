// Makes the first, second, ... n-th allocation of a call fail, one per run, to show that each failure is survived.
//
// The program that links alloc_fault.cpp (all *_alloc_test.cpp files share one) has every form of operator new and
// delete replaced, and so have the shared libraries in it, whose calls are bound to the program's symbols. Without a
// sanitizer malloc, calloc, realloc and free are replaced too, so whatever the C library makes with them (strdup) fails
// as well; a sanitizer brings its own, so there only operator new fails, and LeakSanitizer looks after the blocks of
// malloc.
//
// Counters are the thread's own: what other threads allocate is neither counted nor made to fail. So a body starts no
// thread: what one allocates and another releases looks like a leak. Memory for an exception in flight is never
// refused, or a throw for quite another reason would count as a failed allocation. At its end the program tells how
// many failures were tried in all.
//
//     TEST(DnNormalizeAlloc, EveryFailureGivesNoMemory)
//     {
//         const std::size_t points = for_each_failing_allocation([&](std::size_t) {
//             heap_dn dn(dn_normalize_esc("cn=a,o=b"));
//             if (allocation_failed())
//                 EXPECT_TRUE(!dn || dn->result == LDAP_NO_MEMORY);
//             else
//                 EXPECT_EQ(dn->result, LDAP_SUCCESS);
//         });
//         EXPECT_GE(points, 3u);
//     }
#pragma once

#include <cstddef>
#include <functional>

namespace test_support {

// What fails in a run: the one allocation, as when a large block can't be had, or all from that one on, as when memory
// has run out for good. A caller that tries again with less survives the first kind and not the second.
enum class alloc_failures : int { one, all_from_there };

// Runs `body` once without failures (point 0), then again and again with its 1st (point 1), 2nd, ... allocation
// failing, until a run ends without having come to its failing allocation. Returns the number of allocations that
// failed; none at all is a test failure, since then nothing was shown.
//
//   body  takes the point, checks for itself what it expects, and leaves nothing behind. Once an allocation has failed
//         it may end by any exception; before that, an exception passes through to the caller.
//
// A run after the first that leaves more or fewer live blocks on this thread than it found is a test failure that names
// the point. The first is let off because it fills what is filled once. Not to be nested.
std::size_t for_each_failing_allocation(const std::function<void(std::size_t point)>& body,
                                        alloc_failures kind = alloc_failures::one);

// Whether an allocation has failed in this run.
bool allocation_failed();

// While one lives, this thread's allocations are neither counted nor made to fail: for what a body does around the call
// that it tests. Blocks made meanwhile still have to be released.
class alloc_fault_pause {
public:
    alloc_fault_pause();
    ~alloc_fault_pause();
    alloc_fault_pause(const alloc_fault_pause&) = delete;
    alloc_fault_pause& operator=(const alloc_fault_pause&) = delete;
};

}  // namespace test_support
