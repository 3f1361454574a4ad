/// @file
/// A worker with its events, for tests.
#pragma once

#include <condition_variable>
#include <mutex>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "kzsdk/jni/fingerprint_thread.hpp"

namespace kz::test {

/// What workers have reported, in order.
class Events {
public:
    static Events& all()
    {
        static Events events;
        return events;
    }

    static void post(int32_t event, int32_t argument1, int32_t argument2, jobject cookie)
    {
        EXPECT_EQ(0, argument1);
        EXPECT_EQ(0, argument2);
        Events& events = all();
        const std::lock_guard lock(events.mutex_);
        events.seen_.emplace_back(event, cookie);
        events.changed_.notify_all();
    }

    void clear()
    {
        const std::lock_guard lock(mutex_);
        seen_.clear();
    }

    size_t count()
    {
        const std::lock_guard lock(mutex_);
        return seen_.size();
    }

    /// Returns the last of them once so many have been posted.
    int32_t wait_for(size_t count)
    {
        std::unique_lock lock(mutex_);
        changed_.wait(lock, [&] { return seen_.size() >= count; });
        return seen_[count - 1].first;
    }

    jobject cookie_of(size_t index)
    {
        const std::lock_guard lock(mutex_);
        return seen_.at(index).second;
    }

private:
    std::mutex mutex_;
    std::condition_variable changed_;
    std::vector<std::pair<int32_t, jobject>> seen_;
};

} // namespace kz::test
