// Holds a POSIX mutex for as long as one lives.
#pragma once

#include <pthread.h>

class mutex_holder {
public:
    explicit mutex_holder(pthread_mutex_t& mutex) : mutex_(mutex) { pthread_mutex_lock(&mutex_); }
    ~mutex_holder() { pthread_mutex_unlock(&mutex_); }
    mutex_holder(const mutex_holder&) = delete;
    mutex_holder& operator=(const mutex_holder&) = delete;

private:
    pthread_mutex_t& mutex_;
};
