/// @file
/// Observes the platform adapter that the test is linked with, and makes it fail.
#pragma once

#include <cstdint>
#include <ostream>
#include <string>
#include <vector>

namespace kz::test {

struct LogLine {
    int priority;
    std::string tag;
    std::string message;
    bool operator==(const LogLine&) const = default;
};

inline std::ostream& operator<<(std::ostream& out, const LogLine& line)
{
    return out << line.priority << " [" << line.tag << "] " << line.message;
}

using LogLines = std::vector<LogLine>;

/// Catches what is logged while it lives, exactly as it was made.
class CapturedLog {
public:
    CapturedLog();
    ~CapturedLog();
    CapturedLog(const CapturedLog&) = delete;
    CapturedLog& operator=(const CapturedLog&) = delete;

    /// What was logged so far.
    LogLines lines() const;
};

/// No thread can be started while it lives.
class NoThreads {
public:
    NoThreads();
    ~NoThreads();
    NoThreads(const NoThreads&) = delete;
    NoThreads& operator=(const NoThreads&) = delete;
};

/// What a platform shows of a thread: its name, cut to what the system stores, and its nice value;
/// or what was requested, where the platform ignores it.
struct ThreadLooks {
    std::string name;
    int priority;
};

/// Called on the thread in question.
ThreadLooks looks_of_this_thread();

} // namespace kz::test
