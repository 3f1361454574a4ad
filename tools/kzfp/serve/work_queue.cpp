// A place is free again when a thread begins with what had it.

#include "kzfp/serve/work_queue.hpp"

#include <utility>

namespace kzfp::serve {

WorkQueue::WorkQueue(size_t threads, size_t places, std::function<void(Exchange&)> work)
    : places_(places), work_(std::move(work))
{
    for (size_t i = 0; i < threads; ++i) {
        threads_.emplace_back([this] { run(); });
    }
}

WorkQueue::~WorkQueue() { close(); }

bool WorkQueue::reserve()
{
    const std::lock_guard lock(mutex_);
    if (taken_ >= places_ || closed_) {
        return false;
    }
    ++taken_;
    return true;
}

void WorkQueue::push(Exchange& exchange)
{
    {
        const std::lock_guard lock(mutex_);
        waiting_.push_back(&exchange);
    }
    came_.notify_one();
}

std::deque<Exchange*> WorkQueue::close()
{
    {
        const std::lock_guard lock(mutex_);
        closed_ = true;
    }
    came_.notify_all();
    for (std::thread& thread : threads_) {
        thread.join();
    }
    threads_.clear();
    const std::lock_guard lock(mutex_);
    return std::exchange(waiting_, {});
}

size_t WorkQueue::length() const
{
    const std::lock_guard lock(mutex_);
    return taken_;
}

Exchange* WorkQueue::next()
{
    std::unique_lock lock(mutex_);
    came_.wait(lock, [this] { return closed_ || !waiting_.empty(); });
    if (closed_) {
        return nullptr;
    }
    Exchange* const exchange = waiting_.front();
    waiting_.pop_front();
    --taken_;
    return exchange;
}

void WorkQueue::run()
{
    while (Exchange* const exchange = next()) {
        work_(*exchange);
    }
}

} // namespace kzfp::serve
