// The replaced allocator of alloc_fault.h. Nothing here allocates on the way to its decision, so nothing recurses.
#include "tests/support/alloc_fault.h"

#include <dlfcn.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <new>

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)
#define REPLACE_MALLOC 1
#endif

namespace {

// Plain data, so that it is there before the first constructor and behind the last destructor of the thread.
struct counters {
    bool armed = false;       // between the start and the end of a run
    bool failed = false;      // the failing allocation of this run has been met
    unsigned pauses = 0;      // no counting while there are any
    std::size_t seen = 0;     // allocations counted in this run
    std::size_t failing = 0;  // the first to fail, counted from 1; 0 fails none
    bool onwards = false;     // all behind it fail, too
    std::ptrdiff_t live = 0;  // blocks made less blocks released in this run
};

thread_local constinit counters state;

// Counts an allocation and says whether it has to fail.
bool must_fail()
{
    if (!state.armed || state.pauses != 0) {
        return false;
    }
    ++state.seen;
    if (state.seen != state.failing && !(state.onwards && state.failed)) {
        return false;
    }
    state.failed = true;
    return true;
}

void* made(void* block)
{
    state.live += block != nullptr;
    return block;
}

void released(const void* block)
{
    state.live -= block != nullptr;
}

}  // namespace

// ---- malloc and its kin
// -----------------------------------------------------------------------------------------------

#ifdef REPLACE_MALLOC

// The C library's own functions under the names that nobody replaces.
extern "C" {
void* __libc_malloc(std::size_t size);
void* __libc_calloc(std::size_t count, std::size_t size);
void* __libc_realloc(void* block, std::size_t size);
void* __libc_memalign(std::size_t alignment, std::size_t size);
void __libc_free(void* block);
}

namespace {

void* out_of_memory()
{
    errno = ENOMEM;
    return nullptr;
}

void* system_allocate(std::size_t size, std::size_t alignment)
{
    return alignment == 0 ? __libc_malloc(size) : __libc_memalign(alignment, size);
}

void system_free(void* block)
{
    __libc_free(block);
}

}  // namespace

extern "C" {

void* malloc(std::size_t size)
{
    return must_fail() ? out_of_memory() : made(__libc_malloc(size));
}

void* calloc(std::size_t count, std::size_t size)
{
    return must_fail() ? out_of_memory() : made(__libc_calloc(count, size));
}

void* aligned_alloc(std::size_t alignment, std::size_t size)
{
    return must_fail() ? out_of_memory() : made(__libc_memalign(alignment, size));
}

void* realloc(void* block, std::size_t size)
{
    if (block == nullptr) {
        return malloc(size);
    }
    if (size == 0) {  // a release here, as in the C library
        free(block);
        return nullptr;
    }
    return must_fail() ? out_of_memory() : __libc_realloc(block, size);
}

void free(void* block)
{
    released(block);
    __libc_free(block);
}

// Memory for an exception comes from malloc: it is counted as a live block, but is no allocation that could fail.
void* __cxa_allocate_exception(std::size_t size) noexcept
{
    const test_support::alloc_fault_pause pause;
    static const auto original = reinterpret_cast<void* (*)(std::size_t)>(dlsym(RTLD_NEXT, "__cxa_allocate_exception"));
    return original(size);
}

}  // extern "C"

#else

namespace {

void* system_allocate(std::size_t size, std::size_t alignment)
{
    return alignment == 0 ? std::malloc(size)
                          : std::aligned_alloc(alignment, (size + alignment - 1) / alignment * alignment);
}

void system_free(void* block)
{
    std::free(block);
}

}  // namespace

#endif

// ---- operator new and delete
// ------------------------------------------------------------------------------------------

namespace {

void* new_or_null(std::size_t size, std::size_t alignment) noexcept
{
    return must_fail() ? nullptr : made(system_allocate(size == 0 ? 1 : size, alignment));
}

void* new_or_throw(std::size_t size, std::size_t alignment)
{
    if (void* block = new_or_null(size, alignment)) {
        return block;
    }
    throw std::bad_alloc();
}

void delete_block(void* block) noexcept
{
    released(block);
    system_free(block);
}

std::size_t bytes(std::align_val_t alignment)
{
    return static_cast<std::size_t>(alignment);
}

}  // namespace

using size = std::size_t;
using align = std::align_val_t;
using no_throw = const std::nothrow_t&;

// A table.
// clang-format off
void* operator new(size n) { return new_or_throw(n, 0); }
void* operator new[](size n) { return new_or_throw(n, 0); }
void* operator new(size n, align a) { return new_or_throw(n, bytes(a)); }
void* operator new[](size n, align a) { return new_or_throw(n, bytes(a)); }
void* operator new(size n, no_throw) noexcept { return new_or_null(n, 0); }
void* operator new[](size n, no_throw) noexcept { return new_or_null(n, 0); }
void* operator new(size n, align a, no_throw) noexcept { return new_or_null(n, bytes(a)); }
void* operator new[](size n, align a, no_throw) noexcept { return new_or_null(n, bytes(a)); }

void operator delete(void* p) noexcept { delete_block(p); }
void operator delete[](void* p) noexcept { delete_block(p); }
void operator delete(void* p, size) noexcept { delete_block(p); }
void operator delete[](void* p, size) noexcept { delete_block(p); }
void operator delete(void* p, align) noexcept { delete_block(p); }
void operator delete[](void* p, align) noexcept { delete_block(p); }
void operator delete(void* p, size, align) noexcept { delete_block(p); }
void operator delete[](void* p, size, align) noexcept { delete_block(p); }
void operator delete(void* p, no_throw) noexcept { delete_block(p); }
void operator delete[](void* p, no_throw) noexcept { delete_block(p); }
void operator delete(void* p, align, no_throw) noexcept { delete_block(p); }
void operator delete[](void* p, align, no_throw) noexcept { delete_block(p); }
// clang-format on

// ---- the runs
// ---------------------------------------------------------------------------------------------------------

namespace test_support {

alloc_fault_pause::alloc_fault_pause()
{
    ++state.pauses;
}

alloc_fault_pause::~alloc_fault_pause()
{
    --state.pauses;
}

bool allocation_failed()
{
    return state.failed;
}

namespace {

std::atomic<std::size_t> failed_in_all = 0;

// Tells what was tried once the last test is through.
class tell_total : public testing::Environment {
public:
    void TearDown() override { std::printf("%zu failed allocations were tried\n", failed_in_all.load()); }
};
const testing::Environment* const total = testing::AddGlobalTestEnvironment(new tell_total);

// One run with the allocation `point` failing; returns what the run has left in the counters.
counters run(const std::function<void(std::size_t)>& body, std::size_t point, alloc_failures kind)
{
    state = counters{.armed = true, .failing = point, .onwards = kind == alloc_failures::all_from_there};
    try {
        body(point);
    } catch (...) {
        if (!state.failed) {
            state = counters{};
            throw;
        }
        // The failure has come out as an exception, as it may; the body has checked what it wanted to.
    }
    const counters result = state;
    state = counters{};
    return result;
}

}  // namespace

std::size_t for_each_failing_allocation(const std::function<void(std::size_t point)>& body, alloc_failures kind)
{
    // A call whose need grows from run to run, because it leaves something behind, would never end.
    const std::size_t limit = 1000 + 10 * run(body, 0, kind).seen;

    for (std::size_t point = 1; point <= limit; ++point) {
        const counters result = run(body, point, kind);
        if (result.live != 0) {
            ADD_FAILURE() << result.live << " blocks left behind after allocation " << point
                          << (result.failed ? " failed" : " was not reached");
        }
        failed_in_all += result.failed ? 1 : 0;
        if (!result.failed) {
            EXPECT_GT(point, 1u) << "the body allocates nothing, so no failure was tried";
            return point - 1;
        }
    }
    ADD_FAILURE() << "no end after " << limit << " failing allocations: each run needs more than the last";
    return limit;
}

}  // namespace test_support
