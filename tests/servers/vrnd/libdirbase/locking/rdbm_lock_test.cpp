// The read-write lock: who gets in when, under real contention, and what a damaged lock does.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <string>
#include <thread>
#include <utility>
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
    if (failing_wait > 0 && --failing_wait == 0) {
        return EPERM;
    }
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

    // The count, and whether a writer is inside or in line.
    std::pair<int, bool> state()
    {
        pthread_mutex_lock(&lock.mutex);
        const std::pair<int, bool> value(lock.count, lock.writer != 0);
        pthread_mutex_unlock(&lock.mutex);
        return value;
    }

    // A trylock gives EBUSY when it meets another thread's visit to the mutex; asked again it tells about the lock.
    int settled(int (*tried)(rdbm_lock_t*))
    {
        int rc;
        while ((rc = tried(&lock)) == EBUSY) {
            std::this_thread::yield();
        }
        return rc;
    }

    rdbm_lock_t lock;
};

using lock_call = void (*)(rdbm_lock_t*);
constexpr std::pair no_one(0, false);

TEST_F(RdbmLock, TryingFollowsTheStateAndAFailureChangesNothing)
{
    EXPECT_EQ(_rdbm_rd_trylock(&lock), 0);
    EXPECT_EQ(_rdbm_rd_trylock(&lock), 0);
    EXPECT_EQ(_rdbm_wr_trylock(&lock), -1);
    EXPECT_EQ(state(), std::pair(2, false));
    _rdbm_rd_unlock(&lock);
    EXPECT_EQ(_rdbm_wr_trylock(&lock), -1);
    _rdbm_unlock(&lock);

    EXPECT_EQ(_rdbm_wr_trylock(&lock), 0);
    EXPECT_EQ(_rdbm_wr_trylock(&lock), -1);
    EXPECT_EQ(_rdbm_rd_trylock(&lock), -1);
    EXPECT_EQ(state(), std::pair(-1, true));
    _rdbm_unlock(&lock);

    pthread_mutex_lock(&lock.mutex);
    EXPECT_EQ(_rdbm_rd_trylock(&lock), EBUSY);
    EXPECT_EQ(_rdbm_wr_trylock(&lock), EBUSY);
    pthread_mutex_unlock(&lock.mutex);
    EXPECT_EQ(state(), no_one);
}

TEST_F(RdbmLock, AWriterInLineGoesAheadOfLaterReaders)
{
    _rdbm_rd_lock(&lock);
    _rdbm_rd_lock(&lock);
    std::atomic<int> order = 0;
    std::atomic<int> reader_came = 0;
    std::thread writing([&] {
        _rdbm_wr_lock(&lock);
        EXPECT_EQ(++order, 1);
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
        EXPECT_EQ(reader_came, 0);
        _rdbm_wr_unlock(&lock);
    });
    while (state() != std::pair(2, true)) {
        std::this_thread::yield();
    }
    EXPECT_EQ(settled(_rdbm_rd_trylock), -1);
    EXPECT_EQ(settled(_rdbm_wr_trylock), -1);
    std::thread reading([&] {
        _rdbm_rd_lock(&lock);
        reader_came = ++order;
        _rdbm_rd_unlock(&lock);
    });
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
    EXPECT_EQ(state(), std::pair(2, true)) << "nobody enters while the first readers are inside";
    _rdbm_rd_unlock(&lock);
    EXPECT_EQ(order, 0);
    _rdbm_rd_unlock(&lock);
    writing.join();
    reading.join();
    EXPECT_EQ(reader_came, 2);
    EXPECT_EQ(state(), no_one);
}

TEST_F(RdbmLock, WritersExcludeEverybodyAndReadersShare)
{
    long first = 0;  // plain words that only the lock protects
    long second = 0;
    std::atomic<long> torn = 0;
    std::atomic<long> written = 0;
    const auto write = [&](int round, bool trying) {
        if (trying && _rdbm_wr_trylock(&lock) != 0) {
            return;
        }
        if (!trying) {
            _rdbm_wr_lock(&lock);
        }
        ++first;
        ++second;
        ++written;
        round % 3 == 0 ? _rdbm_unlock(&lock) : _rdbm_wr_unlock(&lock);
    };
    const auto read = [&](int round, bool trying) {
        if (trying && _rdbm_rd_trylock(&lock) != 0) {
            return;
        }
        if (!trying) {
            _rdbm_rd_lock(&lock);
        }
        torn += first != second;
        round % 3 == 0 ? _rdbm_unlock(&lock) : _rdbm_rd_unlock(&lock);
    };
    std::vector<std::thread> threads;
    for (int i = 0; i < 7; ++i) {  // two that write, three that read, and two that do both, as a schema change does
        threads.emplace_back([&, i] {
            for (int round = 0; round < 2000; ++round) {
                if (i < 4) {
                    write(round, i == 0 && round % 2 == 0);
                }
                if (i >= 2) {
                    read(round, i == 6 && round % 2 == 0);
                }
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(torn, 0);
    EXPECT_EQ(first, written);
    EXPECT_EQ(second, written);
    EXPECT_EQ(state(), no_one);
}

TEST_F(RdbmLock, ReleasingWhatIsNotHeldIsReportedAndChangesNothing)
{
    const struct {
        const char* name;
        lock_call release;
        int held;  // the state: readers inside, or -1
        bool reported;
    } table[] = {
        {"_rdbm_rd_unlock", _rdbm_rd_unlock, -1, true}, {"_rdbm_rd_unlock", _rdbm_rd_unlock, 0, true},
        {"_rdbm_rd_unlock", _rdbm_rd_unlock, 1, false}, {"_rdbm_wr_unlock", _rdbm_wr_unlock, -1, false},
        {"_rdbm_wr_unlock", _rdbm_wr_unlock, 0, true},  {"_rdbm_wr_unlock", _rdbm_wr_unlock, 1, true},
        {"_rdbm_unlock", _rdbm_unlock, -1, false},      {"_rdbm_unlock", _rdbm_unlock, 0, true},
        {"_rdbm_unlock", _rdbm_unlock, 1, false},
    };
    for (const auto& entry : table) {
        SCOPED_TRACE(entry.name + std::to_string(entry.held));
        if (entry.held != 0) {
            (entry.held < 0 ? _rdbm_wr_lock : _rdbm_rd_lock)(&lock);
        }
        const debug_catcher caught;
        entry.release(&lock);
        EXPECT_EQ(state().first, entry.reported ? entry.held : 0);
        ASSERT_EQ(caught.count(), entry.reported ? 2u : 0u);
        if (entry.reported) {
            char text[100];
            std::snprintf(text, sizeof text, "Error - %s: lock %p not set\n", entry.name, static_cast<void*>(&lock));
            EXPECT_EQ(caught.texts()[0], text);
            EXPECT_THAT(caught.texts()[1], testing::MatchesRegex("      - in file .*rdbm_lock.cpp near line [0-9]+\n"));
            lock.count = 0;
            lock.writer = 0;
        }
    }
}

TEST_F(RdbmLock, AMutexThatCannotBeLockedIsReportedAndTheLockStaysAsItWas)
{
    constexpr pthread_mutex_t checking = PTHREAD_ERRORCHECK_MUTEX_INITIALIZER_NP;
    pthread_mutex_destroy(&lock.mutex);
    lock.mutex = checking;
    const std::pair<const char*, lock_call> table[] = {
        {"_rdbm_rd_lock", _rdbm_rd_lock},     {"_rdbm_wr_lock", _rdbm_wr_lock}, {"_rdbm_rd_unlock", _rdbm_rd_unlock},
        {"_rdbm_wr_unlock", _rdbm_wr_unlock}, {"_rdbm_unlock", _rdbm_unlock},
    };
    _rdbm_rd_lock(&lock);
    pthread_mutex_lock(&lock.mutex);  // a second lock by this thread is EDEADLK
    const std::string failed = ": pthread_mutex_lock error. rc = " + std::to_string(EDEADLK) + "\n";
    for (const auto& [name, call] : table) {
        const debug_catcher caught;
        call(&lock);
        EXPECT_EQ(caught.texts().at(0), "Error - " + (name + failed));
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
    EXPECT_EQ(state().first, 32767);
    _rdbm_rd_unlock(&lock);
    late.join();
    EXPECT_EQ(state().first, 32767);
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
    _rdbm_wr_unlock(&lock);

    _rdbm_rd_lock(&lock);
    failing_wait = 1;
    _rdbm_wr_lock(&lock);  // first in line, behind a reader
    EXPECT_EQ(caught.count(), 6u);
    EXPECT_EQ(state(), std::pair(1, false)) << "the place in line is given up";
    _rdbm_rd_unlock(&lock);
    EXPECT_EQ(state(), no_one);
}
#endif

}  // namespace
