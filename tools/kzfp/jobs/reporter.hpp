/// @file
/// Where the threads of a worker report what became of their files.
#pragma once

#include <array>
#include <cstdint>
#include <mutex>
#include <string>

#include "kzfp/adding/arrival.hpp"
#include "kzfp/output/progress.hpp"

namespace kzfp {

/// Any thread may report.
class Reporter {
public:
    /// `jobs` are there to be done at first, by all workers.
    Reporter(const OutputOptions& output, size_t jobs);

    void report(const Arrival& arrival);

    /// A job that failed now and is to be tried again.
    void report_postponed(const Arrival& arrival, uint32_t attempt, uint32_t attempts);

    void say(const std::string& message);

    /// A thread has given up.
    void report_end(const std::string& message);

    uint64_t count(Outcome outcome) const { return counts_.at(static_cast<size_t>(outcome)); }
    uint64_t threads_ended() const { return ended_; }

    /// "12 added, 1 failed".
    std::string summary() const;

private:
    Format format_;
    std::mutex mutex_;
    Progress progress_;
    size_t taken_ = 0;
    uint64_t ended_ = 0;
    std::array<uint64_t, kOutcomeCount> counts_ = {};
};

} // namespace kzfp
