// Work on the batches of an LDIF file by several threads, with the results in the order of the file.
//
// The calling thread reads batches and takes what came of them; others do the work. What is held in memory is a few
// batches, however large the file is.
#pragma once

#include <algorithm>
#include <condition_variable>
#include <deque>
#include <exception>
#include <mutex>
#include <string>
#include <system_error>
#include <thread>
#include <vector>

#include "tools/dirbase/ldif_reader.h"
#include "tools/dirbase/report.h"

namespace dirbase_tool {

// How many threads work when the user doesn't say: as many as there are processors, at most so many.
constexpr unsigned ldif_most_threads = 8;

inline unsigned ldif_threads(unsigned given)
{
    return given != 0 ? given : std::clamp(std::thread::hardware_concurrency(), 1u, ldif_most_threads);
}

// Threads that work on what is handed to them. `Worker` is called with an item; each thread has its own.
template <typename Item, typename Worker>
class ldif_pool {
public:
    // An item with the state of the work on it.
    struct slot {
        Item item;
        std::exception_ptr failure;
        bool done = false;
    };

    template <typename MakeWorker>
    ldif_pool(const MakeWorker& make_worker, unsigned threads)
    {
        for (unsigned i = 0; i < threads; ++i) {
            workers_.push_back(make_worker());
        }
        try {
            for (Worker& worker : workers_) {
                threads_.emplace_back([this, &worker] { run(worker); });
            }
        } catch (const std::system_error& failure) {
            stop();
            throw tool_failure(status_unusable, "", 0, std::string("can't start a thread: ") + failure.what());
        } catch (...) {
            stop();
            throw;
        }
    }
    ~ldif_pool() { stop(); }
    ldif_pool(const ldif_pool&) = delete;
    ldif_pool& operator=(const ldif_pool&) = delete;

    void hand_over(slot& work)
    {
        {
            const std::lock_guard<std::mutex> guard(mutex_);
            work.done = false;
            waiting_.push_back(&work);
        }
        more_.notify_one();
    }

    bool is_done(const slot& work)
    {
        const std::lock_guard<std::mutex> guard(mutex_);
        return work.done;
    }

    // Waits for an item that was handed over. Raises what the work on it raised.
    void wait_for(slot& work)
    {
        std::unique_lock<std::mutex> guard(mutex_);
        finished_.wait(guard, [&work] { return work.done; });
        if (work.failure != nullptr) {
            std::rethrow_exception(work.failure);
        }
    }

private:
    void stop()
    {
        {
            const std::lock_guard<std::mutex> guard(mutex_);
            stopping_ = true;
            waiting_.clear();
        }
        more_.notify_all();
        for (std::thread& thread : threads_) {
            thread.join();
        }
    }

    void run(Worker& worker)
    {
        std::unique_lock<std::mutex> guard(mutex_);
        for (;;) {
            more_.wait(guard, [this] { return stopping_ || !waiting_.empty(); });
            if (stopping_) {
                return;
            }
            slot& work = *waiting_.front();
            waiting_.pop_front();
            guard.unlock();
            try {
                worker(work.item);
            } catch (...) {
                work.failure = std::current_exception();
            }
            guard.lock();
            work.done = true;
            finished_.notify_one();
        }
    }

    std::mutex mutex_;
    std::condition_variable more_;
    std::condition_variable finished_;
    std::deque<slot*> waiting_;
    bool stopping_ = false;
    std::deque<Worker> workers_;
    std::vector<std::thread> threads_;
};

// Has every batch of a file worked on.
//
//   Item         has a member `batch`, which is read into; items are used again
//   make_worker  gives what a thread calls with each of its items, to take entries off the batch until it is taken or
//                results_limit is reached; called by this thread, once for each
//   take         called by this thread with each item, in the order of the file, when the work on it is done, and
//                again while the batch isn't taken. False ends it all, and the rest isn't read.
template <typename Item, typename MakeWorker, typename Take>
void for_each_batch(ldif_reader& reader, unsigned threads, const MakeWorker& make_worker, const Take& take)
{
    if (threads == 1) {
        auto worker = make_worker();
        for (Item item; reader.next(item.batch);) {
            do {
                worker(item);
                if (!take(item)) {
                    return;
                }
            } while (!item.batch.is_taken());
        }
        return;
    }
    using pool_type = ldif_pool<Item, decltype(make_worker())>;
    std::deque<typename pool_type::slot> ring(2 * threads + 1);
    pool_type pool(make_worker, threads);
    std::size_t read = 0;
    std::size_t taken = 0;
    for (bool more = true;;) {
        const auto oldest = [&]() -> typename pool_type::slot& { return ring[taken % ring.size()]; };
        // What is done is taken first, and what isn't is waited for rather than input that hasn't come yet.
        while (more && read - taken < ring.size() &&
               (read == taken || (!pool.is_done(oldest()) && reader.is_ready()))) {
            typename pool_type::slot& work = ring[read % ring.size()];
            more = reader.next(work.item.batch);
            if (more) {
                pool.hand_over(work);
                ++read;
            }
        }
        if (taken == read) {
            return;
        }
        pool.wait_for(oldest());
        if (!take(oldest().item)) {
            return;
        }
        if (oldest().item.batch.is_taken()) {
            ++taken;
        } else {
            pool.hand_over(oldest());
        }
    }
}

}  // namespace dirbase_tool
