// Memory of the foundation and the schema engine: every failure to get some raises exc_not_enough_memory_t.
#pragma once

#include <cstddef>
#include <map>
#include <set>
#include <type_traits>
#include <utility>
#include <vector>

#include "libraries/dirbase_export.h"

// Raises exc_not_enough_memory_t, "not enough memory", with the place that asked.
[[noreturn]] DIRBASE_EXPORT void csgl_throw_no_memory(const char* file, int line);

// A block of at least `size` bytes for csgl_free. When there is none the first raises exc_not_enough_memory_t, the
// second gives null.
DIRBASE_EXPORT void* csgl_allocate(std::size_t size, const char* file, int line);
DIRBASE_EXPORT void* csgl_allocate_or_null(std::size_t size) noexcept;
DIRBASE_EXPORT void csgl_free(void* block) noexcept;

// The allocator of the standard containers in the schema engine, so that their failures travel in the same tree of
// exceptions as all others.
template <typename T>
struct csgl_allocator {
    using value_type = T;

    csgl_allocator() = default;
    template <typename U>
    csgl_allocator(const csgl_allocator<U>&)
    {
    }

    T* allocate(std::size_t count)
    {
        if (count > static_cast<std::size_t>(-1) / sizeof(T)) {
            csgl_throw_no_memory(__FILE__, __LINE__);
        }
        return static_cast<T*>(csgl_allocate(count * sizeof(T), __FILE__, __LINE__));
    }
    void deallocate(T* block, std::size_t) noexcept { csgl_free(block); }

    friend bool operator==(const csgl_allocator&, const csgl_allocator&) { return true; }
};

template <typename Key, typename Less = std::less<Key>>
using csgl_set = std::set<Key, Less, csgl_allocator<Key>>;
template <typename Key, typename Value, typename Less = std::less<Key>>
using csgl_map = std::map<Key, Value, Less, csgl_allocator<std::pair<const Key, Value>>>;
template <typename T>
using csgl_vector = std::vector<T, csgl_allocator<T>>;

// Owns one array for the length of a scope. The constructor raises exc_not_enough_memory_t.
template <typename T>
class csgl_local_array_of {
public:
    explicit csgl_local_array_of(std::size_t count) : array_(csgl_allocator<T>().allocate(count)) {}
    ~csgl_local_array_of() { csgl_free(array_); }
    csgl_local_array_of(const csgl_local_array_of&) = delete;
    csgl_local_array_of& operator=(const csgl_local_array_of&) = delete;

    T* get() const { return array_; }
    T& operator[](std::size_t index) const { return array_[index]; }

private:
    static_assert(std::is_trivial_v<T>, "the elements are neither constructed nor destroyed");
    T* array_;
};
