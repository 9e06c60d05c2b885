// Guards for memory of the C heap, until it is handed over by release().
#pragma once

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <memory>

struct heap_free {
    void operator()(void* block) const noexcept { std::free(block); }
};

// One block; a text.
template <typename T>
using heap_pointer = std::unique_ptr<T, heap_free>;
using heap_text = heap_pointer<char>;

// Releases bytes that nobody should find later; null does nothing.
inline void wipe_and_free(char* bytes, std::size_t length)
{
    if (bytes != nullptr) {
        explicit_bzero(bytes, length);
    }
    std::free(bytes);
}
