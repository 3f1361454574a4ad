/// @file
/// Work on many files at once, whose results come in the order of the files.
#pragma once

#include <algorithm>
#include <condition_variable>
#include <cstddef>
#include <exception>
#include <map>
#include <mutex>
#include <optional>
#include <system_error>
#include <thread>
#include <utility>
#include <variant>
#include <vector>

namespace kzfp {

/// Runs `work(i)` for i = 0 .. count - 1 in several threads and gives each result to `deliver(i,
/// result)` in the calling thread, in the order of i. No more than a few results a thread wait for
/// their turn. What either of them throws ends the work and is thrown on, in that order too.
template <class Work, class Deliver>
class InOrder {
    using Result = std::invoke_result_t<Work&, size_t>;
    using Outcome = std::variant<Result, std::exception_ptr>;

public:
    InOrder(size_t count, size_t threads, Work& work, Deliver& deliver)
        : count_(count), ahead_(4 * threads), work_(work), deliver_(deliver)
    {
        start(std::min(threads, count));
    }
    ~InOrder()
    {
        {
            const std::lock_guard lock(mutex_);
            stopped_ = true;
        }
        changed_.notify_all();
        for (std::thread& thread : threads_) {
            thread.join();
        }
    }
    InOrder(const InOrder&) = delete;
    InOrder& operator=(const InOrder&) = delete;

    void run()
    {
        for (size_t i = 0; i < count_; ++i) {
            Outcome outcome = threads_.empty() ? Outcome(work_(i)) : wait_for(i);
            if (const auto* error = std::get_if<std::exception_ptr>(&outcome)) {
                std::rethrow_exception(*error);
            }
            deliver_(i, std::get<Result>(std::move(outcome)));
        }
    }

private:
    /// As many as the system allows; none do as well.
    void start(size_t threads)
    {
        threads_.reserve(threads);
        try {
            while (threads > 1 && threads_.size() < threads) {
                threads_.emplace_back([this] { take_turns(); });
            }
        } catch (const std::system_error&) {
        }
    }

    void take_turns()
    {
        std::unique_lock lock(mutex_);
        for (;;) {
            changed_.wait(lock, [this] { return stopped_ || next_ < delivered_ + ahead_; });
            if (stopped_ || next_ >= count_) {
                return;
            }
            const size_t mine = next_++;
            lock.unlock();
            Outcome outcome = attempt(mine);
            lock.lock();
            outcomes_[mine % ahead_] = std::move(outcome);
            changed_.notify_all();
        }
    }

    Outcome attempt(size_t i) noexcept
    {
        try {
            return work_(i);
        } catch (...) {
            return std::current_exception();
        }
    }

    Outcome wait_for(size_t i)
    {
        std::unique_lock lock(mutex_);
        std::optional<Outcome>& place = outcomes_[i % ahead_];
        changed_.wait(lock, [&place] { return place.has_value(); });
        Outcome outcome = std::move(*place);
        place.reset();
        delivered_ = i + 1;
        changed_.notify_all();
        return outcome;
    }

    size_t count_;
    size_t ahead_; ///< results that may wait
    Work& work_;
    Deliver& deliver_;
    std::mutex mutex_;
    std::condition_variable changed_;
    size_t next_ = 0;
    size_t delivered_ = 0;
    bool stopped_ = false;
    std::vector<std::optional<Outcome>> outcomes_ = std::vector<std::optional<Outcome>>(ahead_);
    std::vector<std::thread> threads_;
};

template <class Work, class Deliver>
void in_order(size_t count, size_t threads, Work work, Deliver deliver)
{
    InOrder<Work, Deliver>(count, std::max<size_t>(threads, 1), work, deliver).run();
}

} // namespace kzfp
