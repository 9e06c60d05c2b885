// Counts this thread's allocations. The program's malloc and its kin count and pass the call on to the C library;
// operator new and the C library's own functions (strdup) end up there too.
#pragma once

#include <cstddef>

namespace bench_support {

// Allocations of this thread since it began.
std::size_t allocation_count();

// How many `work` makes.
template <typename Work>
double allocations_of(Work&& work)
{
    const std::size_t before = allocation_count();
    work();
    return static_cast<double>(allocation_count() - before);
}

}  // namespace bench_support
