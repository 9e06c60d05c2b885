// The counter behind every counted body: see csgl_refcounted.h.
#include "servers/vrnd/libcsgl/csgl_refcounted.h"

csgl_sync_value::csgl_sync_value(int value) : value_(value)
{
    pthread_mutex_init(&mutex_, nullptr);
}

csgl_sync_value::~csgl_sync_value()
{
    if (value() == 0) {
        pthread_mutex_destroy(&mutex_);
    }
}

int csgl_sync_value::increment()
{
    pthread_mutex_lock(&mutex_);
    const int result = value_.load(std::memory_order_relaxed) + 1;
    value_.store(result, std::memory_order_release);
    pthread_mutex_unlock(&mutex_);
    return result;
}

int csgl_sync_value::decrement()
{
    pthread_mutex_lock(&mutex_);
    const int result = value_.load(std::memory_order_relaxed) - 1;
    value_.store(result, std::memory_order_release);
    pthread_mutex_unlock(&mutex_);
    return result;
}
