// Guards for memory of the C heap, until it is handed over by release().
#pragma once

#include <cstdlib>
#include <memory>

struct heap_free {
    void operator()(void* block) const noexcept { std::free(block); }
};

// One block; a text.
template <typename T>
using heap_pointer = std::unique_ptr<T, heap_free>;
using heap_text = heap_pointer<char>;
