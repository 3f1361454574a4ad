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

WorkQueue::~WorkQueue()
{
    close();
    for (std::thread& thread : threads_) {
        thread.join();
    }
}

bool WorkQueue::reserve()
{
    const std::lock_guard lock(mutex_);
    if (taken_ >= places_ || closed_) {
        return false;
    }
    ++taken_;
    ++reserved_;
    return true;
}

void WorkQueue::push(Exchange& exchange)
{
    {
        const std::lock_guard lock(mutex_);
        --reserved_;
        waiting_.push_back(&exchange);
        came_.notify_one();
        changed_.notify_all(); // while close() cannot return yet
    }
}

std::deque<Exchange*> WorkQueue::close()
{
    std::unique_lock lock(mutex_);
    closed_ = true;
    came_.notify_all();
    changed_.wait(lock, [this] { return reserved_ == 0; });
    taken_ = 0;
    return std::exchange(waiting_, {});
}

size_t WorkQueue::busy_at(std::chrono::steady_clock::time_point end)
{
    std::unique_lock lock(mutex_);
    changed_.wait_until(lock, end, [this] { return busy_ == 0; });
    return busy_;
}

bool WorkQueue::is_closed() const
{
    const std::lock_guard lock(mutex_);
    return closed_;
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
    ++busy_;
    return exchange;
}

void WorkQueue::run()
{
    while (Exchange* const exchange = next()) {
        work_(*exchange);
        const std::lock_guard lock(mutex_);
        --busy_;
        changed_.notify_all();
    }
}

} // namespace kzfp::serve
