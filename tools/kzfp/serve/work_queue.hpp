/// @file
/// Requests that wait for a thread to answer them: a bounded number.
#pragma once

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

    /// Ends the threads; nothing may wait any more.
    ~WorkQueue();
    WorkQueue(const WorkQueue&) = delete;
    WorkQueue& operator=(const WorkQueue&) = delete;

    /// Keeps a place for a push() that follows; false when all are taken.
    bool reserve();

    void push(Exchange& exchange);

    /// Ends the threads once they have done what they are at; returns what still waits.
    std::deque<Exchange*> close();

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
    size_t taken_ = 0; ///< places, those of reserve() among them
    bool closed_ = false;
    std::vector<std::thread> threads_;
};

} // namespace kzfp::serve
