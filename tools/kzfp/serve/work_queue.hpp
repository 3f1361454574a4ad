/// @file
/// Requests that wait for a thread to answer them: a bounded number.
#pragma once

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <deque>
#include <functional>
#include <mutex>
#include <thread>
#include <vector>

#include "kzfp/serve/exchange.hpp"

namespace kzfp::serve {

/// May be used by several threads at once.
class WorkQueue {
public:
    /// Starts the threads, which hand each exchange to `work`. It throws nothing.
    WorkQueue(size_t threads, size_t places, std::function<void(Exchange&)> work);

    /// Waits for the threads to do what they are at; nothing else may wait any more.
    ~WorkQueue();
    WorkQueue(const WorkQueue&) = delete;
    WorkQueue& operator=(const WorkQueue&) = delete;

    /// Keeps a place for a push() that has to follow, also after close() has begun; false when all
    /// are taken.
    bool reserve();

    void push(Exchange& exchange);

    /// From now on no exchange is begun; returns those that still wait, when all that was reserved
    /// has come.
    std::deque<Exchange*> close();

    /// How many exchanges the threads are still at when this time has come; 0 as soon as none is.
    size_t busy_at(std::chrono::steady_clock::time_point end);

    /// Whether close() was called.
    bool is_closed() const;

    /// Places that are taken.
    size_t length() const;
    size_t places() const { return places_; }

private:
    void run();
    Exchange* next();

    const size_t places_;
    const std::function<void(Exchange&)> work_;
    mutable std::mutex mutex_;
    std::condition_variable came_;
    std::deque<Exchange*> waiting_;
    std::condition_variable changed_; ///< reserved_ or busy_
    size_t taken_ = 0;                ///< places, those of reserve() among them
    size_t reserved_ = 0;             ///< of these, those for which push() is still to come
    size_t busy_ = 0;                 ///< exchanges that threads are at
    bool closed_ = false;
    std::vector<std::thread> threads_;
};

} // namespace kzfp::serve
