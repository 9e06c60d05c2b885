// Counted bodies and the handles on them.
//
// A body derives from csgl_refcounted<T> and starts with count 0; every csgl_refcounted_pointer_to<T> on it counts
// once, and the handle that brings the count back to 0 destroys it. Handles on one body may be copied and dropped by
// many threads; one handle object belongs to one thread at a time.
#pragma once

#include <pthread.h>

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <new>
#include <utility>

#include "libraries/dirbase_export.h"
#include "servers/vrnd/libcsgl/csgl_memory.h"

// A counter that is changed under a mutex of its own.
class DIRBASE_EXPORT csgl_sync_value {
public:
    explicit csgl_sync_value(int value);

    // Destroys the mutex when the value is 0. At any other value somebody may still stand in the mutex, so it stays.
    ~csgl_sync_value();

    csgl_sync_value(const csgl_sync_value&) = delete;
    csgl_sync_value& operator=(const csgl_sync_value&) = delete;

    // Add or subtract 1 and give the new value.
    int increment();
    int decrement();

    // The value at this moment. It is written with release order, so that one who reads 1 as the only holder of a body
    // also sees everything that the earlier holders did to it.
    int value() const { return value_.load(std::memory_order_acquire); }

private:
    pthread_mutex_t mutex_;
    std::atomic<std::int32_t> value_;
};

// The base of a counted body T. Copying a body copies no count: the copy has handles of its own.
template <typename T>
class csgl_refcounted : public csgl_sync_value {
public:
    csgl_refcounted() : csgl_sync_value(0) {}
    csgl_refcounted(const csgl_refcounted&) : csgl_sync_value(0) {}
    csgl_refcounted& operator=(const csgl_refcounted&) { return *this; }

    // Drops one reference and destroys the body with the last one. The destruction runs outside the counter's mutex.
    void refcount_decrement()
    {
        if (decrement() == 0) {
            delete static_cast<T*>(this);
        }
    }

    // Bodies come from the heap; raises exc_not_enough_memory_t when it is exhausted.
    static void* operator new(std::size_t size) { return csgl_allocate(size, __FILE__, __LINE__); }
    static void* operator new(std::size_t size, const std::nothrow_t&) noexcept { return csgl_allocate_or_null(size); }
    static void operator delete(void* block) noexcept { csgl_free(block); }
    static void operator delete(void* block, const std::nothrow_t&) noexcept { csgl_free(block); }

protected:
    ~csgl_refcounted() = default;
};

// A handle on a counted body, or on none.
template <typename T>
class csgl_refcounted_pointer_to {
public:
    csgl_refcounted_pointer_to() = default;
    explicit csgl_refcounted_pointer_to(T* body) : body_(body) { take(); }
    csgl_refcounted_pointer_to(const csgl_refcounted_pointer_to& other) : body_(other.body_) { take(); }
    csgl_refcounted_pointer_to(csgl_refcounted_pointer_to&& other) noexcept : body_(other.body_)
    {
        other.body_ = nullptr;
    }
    ~csgl_refcounted_pointer_to() { drop(body_); }

    // The new reference is taken before the old one is dropped, so that a handle may be assigned to itself.
    csgl_refcounted_pointer_to& operator=(csgl_refcounted_pointer_to other) noexcept
    {
        std::swap(body_, other.body_);
        return *this;
    }

    T* get() const { return body_; }
    T* operator->() const { return body_; }
    T& operator*() const { return *body_; }
    explicit operator bool() const { return body_ != nullptr; }

    // Handles compare and sort by the address of their body.
    friend bool operator==(const csgl_refcounted_pointer_to& a, const csgl_refcounted_pointer_to& b)
    {
        return a.body_ == b.body_;
    }
    friend bool operator<(const csgl_refcounted_pointer_to& a, const csgl_refcounted_pointer_to& b)
    {
        return std::less<T*>()(a.body_, b.body_);
    }

private:
    void take()
    {
        if (body_ != nullptr) {
            body_->increment();
        }
    }
    static void drop(T* body)
    {
        if (body != nullptr) {
            body->refcount_decrement();
        }
    }

    T* body_ = nullptr;
};
