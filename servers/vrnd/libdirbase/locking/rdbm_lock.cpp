// The read-write lock. Every function is one visit to the lock's mutex; all changes of `count` and `writer` happen
// there.
#include "servers/vrnd/libdirbase/locking/rdbm_lock.h"

#include <limits>

#include "libraries/libmsg/debug_log.h"

namespace {

constexpr std::int16_t written = -1;                                             // `count` while a writer is inside
constexpr std::int16_t most_readers = std::numeric_limits<std::int16_t>::max();  // one more waits for a place

// Both lines of a failure: what failed, and the place, which is that of the call that failed.
void report_error(const char* function, const char* call, int rc, int line)
{
    debug_error("Error - %s: %s error. rc = %d\n", function, call, rc);
    debug_error("      - in file %s near line %d\n", __FILE__, line);
}

void report_not_set(const char* function, const rdbm_lock_t* lock, int line)
{
    debug_error("Error - %s: lock %p not set\n", function, static_cast<const void*>(lock));
    debug_error("      - in file %s near line %d\n", __FILE__, line);
}

bool enter(rdbm_lock_t* lock, const char* function, int line)
{
    const int rc = pthread_mutex_lock(&lock->mutex);
    if (rc != 0)
        report_error(function, "pthread_mutex_lock", rc, line);
    return rc == 0;
}

void leave(rdbm_lock_t* lock, const char* function, int line)
{
    if (const int rc = pthread_mutex_unlock(&lock->mutex); rc != 0)
        report_error(function, "pthread_mutex_unlock", rc, line);
}

// The trylocks have a result, and tell no more than this of a mutex that can't be released.
void leave_after_try(rdbm_lock_t* lock)
{
    if (const int rc = pthread_mutex_unlock(&lock->mutex); rc != 0)
        debug_error("pthread_mutex_unlock error. rc = %d\n", rc);
}

bool wait_for_change(rdbm_lock_t* lock, const char* function, int line)
{
    const int rc = pthread_cond_wait(&lock->cond, &lock->mutex);
    if (rc != 0)
        report_error(function, "pthread_cond_wait", rc, line);
    return rc == 0;
}

void wake_all(rdbm_lock_t* lock, const char* function, int line)
{
    if (const int rc = pthread_cond_broadcast(&lock->cond); rc != 0)
        report_error(function, "pthread_cond_broadcast", rc, line);
}

bool reader_may_enter(const rdbm_lock_t* lock)
{
    return lock->writer == 0 && lock->count < most_readers;
}

void release_reader(rdbm_lock_t* lock, const char* function, int line)
{
    const bool was_full = lock->count == most_readers;
    --lock->count;
    if (lock->count == 0 || was_full)
        wake_all(lock, function, line);
}

void release_writer(rdbm_lock_t* lock, const char* function, int line)
{
    lock->count = 0;
    lock->writer = 0;
    wake_all(lock, function, line);
}

}  // namespace

extern "C" {

void rdbm_lock_init(rdbm_lock_t* lock, const char* /*name*/)
{
    lock->count = 0;
    lock->writer = 0;
    if (const int rc = pthread_mutex_init(&lock->mutex, nullptr); rc != 0)
        report_error("rdbm_lock_init", "pthread_mutex_init", rc, __LINE__);
    if (const int rc = pthread_cond_init(&lock->cond, nullptr); rc != 0)
        report_error("rdbm_lock_init", "pthread_cond_init", rc, __LINE__);
}

void rdbm_lock_destroy(rdbm_lock_t* lock)
{
    if (const int rc = pthread_cond_destroy(&lock->cond); rc != 0)
        report_error("rdbm_lock_destroy", "pthread_cond_destroy", rc, __LINE__);
    if (const int rc = pthread_mutex_destroy(&lock->mutex); rc != 0)
        report_error("rdbm_lock_destroy", "pthread_mutex_destroy", rc, __LINE__);
}

void _rdbm_rd_lock(rdbm_lock_t* lock)
{
    constexpr const char* function = "_rdbm_rd_lock";
    if (!enter(lock, function, __LINE__))
        return;
    bool waiting = true;
    while (waiting && !reader_may_enter(lock))
        waiting = wait_for_change(lock, function, __LINE__);
    if (waiting)
        ++lock->count;
    leave(lock, function, __LINE__);
}

void _rdbm_wr_lock(rdbm_lock_t* lock)
{
    constexpr const char* function = "_rdbm_wr_lock";
    if (!enter(lock, function, __LINE__))
        return;

    bool waiting = true;
    while (waiting && lock->writer != 0)
        waiting = wait_for_change(lock, function, __LINE__);  // another writer goes first
    if (waiting) {
        lock->writer = 1;  // from here on no new reader enters
        while (waiting && lock->count != 0)
            waiting = wait_for_change(lock, function, __LINE__);  // the readers inside finish
        if (waiting) {
            lock->count = written;
        } else {
            lock->writer = 0;  // gives up the first place, or nobody would ever enter again
            wake_all(lock, function, __LINE__);
        }
    }
    leave(lock, function, __LINE__);
}

int _rdbm_rd_trylock(rdbm_lock_t* lock)
{
    if (const int rc = pthread_mutex_trylock(&lock->mutex); rc != 0)
        return rc;
    const bool free = reader_may_enter(lock);
    if (free)
        ++lock->count;
    leave_after_try(lock);
    return free ? 0 : -1;
}

int _rdbm_wr_trylock(rdbm_lock_t* lock)
{
    if (const int rc = pthread_mutex_trylock(&lock->mutex); rc != 0)
        return rc;
    const bool free = lock->writer == 0 && lock->count == 0;
    if (free) {
        lock->writer = 1;
        lock->count = written;
    }
    leave_after_try(lock);
    return free ? 0 : -1;
}

void _rdbm_rd_unlock(rdbm_lock_t* lock)
{
    constexpr const char* function = "_rdbm_rd_unlock";
    if (!enter(lock, function, __LINE__))
        return;
    if (lock->count < 1)
        report_not_set(function, lock, __LINE__);
    else
        release_reader(lock, function, __LINE__);
    leave(lock, function, __LINE__);
}

void _rdbm_wr_unlock(rdbm_lock_t* lock)
{
    constexpr const char* function = "_rdbm_wr_unlock";
    if (!enter(lock, function, __LINE__))
        return;
    if (lock->count != written)
        report_not_set(function, lock, __LINE__);
    else
        release_writer(lock, function, __LINE__);
    leave(lock, function, __LINE__);
}

void _rdbm_unlock(rdbm_lock_t* lock)
{
    constexpr const char* function = "_rdbm_unlock";
    if (!enter(lock, function, __LINE__))
        return;
    if (lock->count == written)
        release_writer(lock, function, __LINE__);
    else if (lock->count < 1)
        report_not_set(function, lock, __LINE__);
    else
        release_reader(lock, function, __LINE__);
    leave(lock, function, __LINE__);
}

}  // extern "C"
