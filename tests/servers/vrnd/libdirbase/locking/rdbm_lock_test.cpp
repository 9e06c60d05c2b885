// The read-write lock: who gets in when, under real contention, and what a damaged lock does.
#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <string>
#include <thread>
#include <vector>

#include <dlfcn.h>
#include <pthread.h>

#include "servers/vrnd/libdirbase/locking/rdbm_lock.h"
#include "tests/support/message_catcher.h"

using test_support::debug_catcher;

// The library's waits come through here, so that one can be made to fail. ThreadSanitizer has to see the real call.
#if !defined(__SANITIZE_THREAD__)
namespace {
thread_local int failing_wait = 0;  // the wait of this thread that fails, counted down; 0 is none
}

extern "C" __attribute__((visibility("default"))) int pthread_cond_wait(pthread_cond_t* cond, pthread_mutex_t* mutex)
{
    if (failing_wait > 0 && --failing_wait == 0)
        return EPERM;
    using wait_function = int (*)(pthread_cond_t*, pthread_mutex_t*);
    static const auto real = reinterpret_cast<wait_function>(dlsym(RTLD_NEXT, "pthread_cond_wait"));
    return real(cond, mutex);
}
#endif

namespace {

class RdbmLock : public testing::Test {
protected:
    RdbmLock() { rdbm_lock_init(&lock, "test_lock"); }
    ~RdbmLock() override { rdbm_lock_destroy(&lock); }

    int count()
    {
        pthread_mutex_lock(&lock.mutex);
        const int value = lock.count;
        pthread_mutex_unlock(&lock.mutex);
        return value;
    }

    bool writer()
    {
        pthread_mutex_lock(&lock.mutex);
        const bool value = lock.writer != 0;
        pthread_mutex_unlock(&lock.mutex);
        return value;
    }

    // A trylock gives EBUSY when it meets another thread's visit to the mutex; asked again it tells about the lock.
    template <typename Try>
    int settled(Try tried)
    {
        int rc;
        while ((rc = tried(&lock)) == EBUSY)
            std::this_thread::yield();
        return rc;
    }

    void wait_for_writer_in_line()
    {
        while (!writer())
            std::this_thread::yield();
    }

    std::string not_set(const char* function)
    {
        char text[100];
        std::snprintf(text, sizeof text, "Error - %s: lock %p not set\n", function, static_cast<void*>(&lock));
        return text;
    }

    rdbm_lock_t lock;
};

using lock_call = void (*)(rdbm_lock_t*);
using try_call = int (*)(rdbm_lock_t*);

TEST_F(RdbmLock, TryingFollowsTheStateAndAFailureChangesNothing)
{
    EXPECT_EQ(_rdbm_rd_trylock(&lock), 0);
    EXPECT_EQ(_rdbm_rd_trylock(&lock), 0);
    EXPECT_EQ(_rdbm_wr_trylock(&lock), -1);
    EXPECT_EQ(count(), 2);
    EXPECT_FALSE(writer());
    _rdbm_rd_unlock(&lock);
    EXPECT_EQ(_rdbm_wr_trylock(&lock), -1);
    _rdbm_unlock(&lock);

    EXPECT_EQ(_rdbm_wr_trylock(&lock), 0);
    EXPECT_EQ(_rdbm_wr_trylock(&lock), -1);
    EXPECT_EQ(_rdbm_rd_trylock(&lock), -1);
    EXPECT_EQ(count(), -1);
    EXPECT_TRUE(writer());
    _rdbm_unlock(&lock);
    EXPECT_EQ(count(), 0);
    EXPECT_FALSE(writer());
}

TEST_F(RdbmLock, AWriterInLineGoesAheadOfLaterReaders)
{
    _rdbm_rd_lock(&lock);
    _rdbm_rd_lock(&lock);
    std::atomic<int> order = 0;
    std::atomic<int> writer_came = 0;
    std::atomic<int> reader_came = 0;
    std::thread writing([&] {
        _rdbm_wr_lock(&lock);
        writer_came = ++order;
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
        EXPECT_EQ(reader_came, 0);
        _rdbm_wr_unlock(&lock);
    });
    wait_for_writer_in_line();
    EXPECT_EQ(settled(_rdbm_rd_trylock), -1);
    EXPECT_EQ(settled(_rdbm_wr_trylock), -1);
    std::thread reading([&] {
        _rdbm_rd_lock(&lock);
        reader_came = ++order;
        _rdbm_rd_unlock(&lock);
    });
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
    EXPECT_EQ(order, 0) << "nobody enters while the first readers are inside";
    EXPECT_EQ(count(), 2);
    _rdbm_rd_unlock(&lock);
    EXPECT_EQ(order, 0);
    _rdbm_rd_unlock(&lock);
    writing.join();
    reading.join();
    EXPECT_EQ(writer_came, 1);
    EXPECT_EQ(reader_came, 2);
    EXPECT_EQ(count(), 0);
}

TEST_F(RdbmLock, WritersExcludeEverybodyAndReadersShare)
{
    constexpr int rounds = 2000;
    long first = 0;  // plain words that only the lock protects
    long second = 0;
    std::atomic<long> torn = 0;
    std::atomic<long> written = 0;

    std::vector<std::thread> threads;
    for (int i = 0; i < 3; ++i) {
        threads.emplace_back([&, i] {
            for (int n = 0; n < rounds; ++n) {
                if (i == 0 && n % 2 == 0) {
                    if (_rdbm_wr_trylock(&lock) != 0)
                        continue;
                } else {
                    _rdbm_wr_lock(&lock);
                }
                ++first;
                ++second;
                ++written;
                n % 3 == 0 ? _rdbm_unlock(&lock) : _rdbm_wr_unlock(&lock);
            }
        });
    }
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&, i] {
            for (int n = 0; n < rounds; ++n) {
                if (i == 0 && n % 2 == 0) {
                    if (_rdbm_rd_trylock(&lock) != 0)
                        continue;
                } else {
                    _rdbm_rd_lock(&lock);
                }
                torn += first != second;
                n % 3 == 0 ? _rdbm_unlock(&lock) : _rdbm_rd_unlock(&lock);
            }
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_EQ(torn, 0);
    EXPECT_EQ(first, written);
    EXPECT_EQ(second, written);
    EXPECT_EQ(count(), 0);
    EXPECT_FALSE(writer());
}

TEST_F(RdbmLock, TheReadSideIsLeftForTheWriteSideAndTakenBack)
{
    // What a schema change does while other operations read: each thread comes and goes with the read side held.
    std::atomic<int> inside = 0;
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&] {
            for (int n = 0; n < 300; ++n) {
                _rdbm_rd_lock(&lock);
                _rdbm_rd_unlock(&lock);
                _rdbm_wr_lock(&lock);
                EXPECT_EQ(++inside, 1);
                --inside;
                _rdbm_wr_unlock(&lock);
                _rdbm_rd_lock(&lock);
                _rdbm_rd_unlock(&lock);
            }
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_EQ(count(), 0);
}

TEST_F(RdbmLock, ReleasingWhatIsNotHeldIsReportedAndChangesNothing)
{
    const struct {
        const char* name;
        lock_call release;
        int held;  // the state: readers inside, or -1
        bool reported;
    } table[] = {
        {"_rdbm_rd_unlock", _rdbm_rd_unlock, 0, true},   {"_rdbm_wr_unlock", _rdbm_wr_unlock, 0, true},
        {"_rdbm_unlock", _rdbm_unlock, 0, true},         {"_rdbm_rd_unlock", _rdbm_rd_unlock, -1, true},
        {"_rdbm_wr_unlock", _rdbm_wr_unlock, 1, true},   {"_rdbm_unlock", _rdbm_unlock, -1, false},
        {"_rdbm_unlock", _rdbm_unlock, 1, false},        {"_rdbm_rd_unlock", _rdbm_rd_unlock, 1, false},
        {"_rdbm_wr_unlock", _rdbm_wr_unlock, -1, false},
    };
    for (const auto& entry : table) {
        if (entry.held != 0)
            (entry.held < 0 ? _rdbm_wr_lock : _rdbm_rd_lock)(&lock);

        const debug_catcher caught;
        entry.release(&lock);
        if (!entry.reported) {
            EXPECT_EQ(caught.count(), 0u) << entry.name << " of " << entry.held;
            EXPECT_EQ(count(), 0);
            continue;
        }
        const auto texts = caught.texts();
        ASSERT_EQ(texts.size(), 2u) << entry.name << " of " << entry.held;
        EXPECT_EQ(texts[0], not_set(entry.name));
        EXPECT_EQ(texts[1].rfind("      - in file ", 0), 0u) << texts[1];
        EXPECT_NE(texts[1].find("rdbm_lock.cpp near line "), std::string::npos) << texts[1];
        EXPECT_EQ(count(), entry.held);
        if (entry.held != 0)
            _rdbm_unlock(&lock);
    }
}

TEST_F(RdbmLock, ABusyMutexMakesTryingGiveItsCode)
{
    pthread_mutex_lock(&lock.mutex);
    EXPECT_EQ(_rdbm_rd_trylock(&lock), EBUSY);
    EXPECT_EQ(_rdbm_wr_trylock(&lock), EBUSY);
    pthread_mutex_unlock(&lock.mutex);
    EXPECT_EQ(count(), 0);
    EXPECT_FALSE(writer());
}

TEST_F(RdbmLock, AMutexThatCannotBeLockedIsReportedAndTheLockStaysAsItWas)
{
    pthread_mutex_destroy(&lock.mutex);
    pthread_mutexattr_t attributes;
    pthread_mutexattr_init(&attributes);
    pthread_mutexattr_settype(&attributes, PTHREAD_MUTEX_ERRORCHECK);
    pthread_mutex_init(&lock.mutex, &attributes);
    pthread_mutexattr_destroy(&attributes);

    const struct {
        const char* name;
        lock_call call;
    } table[] = {
        {"_rdbm_rd_lock", _rdbm_rd_lock},     {"_rdbm_wr_lock", _rdbm_wr_lock}, {"_rdbm_rd_unlock", _rdbm_rd_unlock},
        {"_rdbm_wr_unlock", _rdbm_wr_unlock}, {"_rdbm_unlock", _rdbm_unlock},
    };
    _rdbm_rd_lock(&lock);
    pthread_mutex_lock(&lock.mutex);  // a second lock by this thread is EDEADLK
    for (const auto& entry : table) {
        const debug_catcher caught;
        entry.call(&lock);
        EXPECT_TRUE(caught.has("Error - " + std::string(entry.name) +
                               ": pthread_mutex_lock error. rc = " + std::to_string(EDEADLK) + "\n"))
            << entry.name;
        EXPECT_EQ(caught.count(), 2u);
        EXPECT_EQ(lock.count, 1);
        EXPECT_EQ(lock.writer, 0);
    }
    pthread_mutex_unlock(&lock.mutex);
    _rdbm_rd_unlock(&lock);
}

TEST_F(RdbmLock, NoReaderEntersBeyondTheRangeOfTheCount)
{
    lock.count = 32767;
    EXPECT_EQ(_rdbm_rd_trylock(&lock), -1);
    std::thread late([&] { _rdbm_rd_lock(&lock); });
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
    EXPECT_EQ(count(), 32767);
    _rdbm_rd_unlock(&lock);
    late.join();
    EXPECT_EQ(count(), 32767);
    lock.count = 0;
}

#if !defined(__SANITIZE_THREAD__)
TEST_F(RdbmLock, AWaitThatFailsGivesUpAndLetsOthersGoOn)
{
    const std::string failed = ": pthread_cond_wait error. rc = " + std::to_string(EPERM) + "\n";
    const debug_catcher caught;

    _rdbm_wr_lock(&lock);
    failing_wait = 1;
    _rdbm_rd_lock(&lock);
    EXPECT_TRUE(caught.has("Error - _rdbm_rd_lock" + failed));
    failing_wait = 1;
    _rdbm_wr_lock(&lock);  // behind another writer
    EXPECT_TRUE(caught.has("Error - _rdbm_wr_lock" + failed));
    EXPECT_EQ(caught.count(), 4u);
    EXPECT_EQ(count(), -1);
    _rdbm_wr_unlock(&lock);

    _rdbm_rd_lock(&lock);
    failing_wait = 1;
    _rdbm_wr_lock(&lock);  // first in line, behind a reader
    EXPECT_EQ(caught.count(), 6u);
    EXPECT_EQ(count(), 1);
    EXPECT_EQ(_rdbm_rd_trylock(&lock), 0) << "the place in line is given up";
    _rdbm_rd_unlock(&lock);
    _rdbm_rd_unlock(&lock);
    EXPECT_EQ(count(), 0);
}
#endif

}  // namespace
