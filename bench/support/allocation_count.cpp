// The counting malloc: see allocation_count.h.
#include "bench/support/allocation_count.h"

#include <cstdlib>

namespace {

// Initial-exec, so that reading it never allocates.
__attribute__((tls_model("initial-exec"))) thread_local std::size_t count = 0;

}  // namespace

std::size_t bench_support::allocation_count()
{
    return count;
}

// The C library's allocator under its second names; free stays its own.
extern "C" {

void* __libc_malloc(std::size_t size);
void* __libc_calloc(std::size_t number, std::size_t size);
void* __libc_realloc(void* block, std::size_t size);

void* malloc(std::size_t size)
{
    ++count;
    return __libc_malloc(size);
}

void* calloc(std::size_t number, std::size_t size)
{
    ++count;
    return __libc_calloc(number, size);
}

void* realloc(void* block, std::size_t size)
{
    ++count;
    return __libc_realloc(block, size);
}

}  // extern "C"
