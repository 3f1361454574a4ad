/// @file
/// The program while it runs, for tests that do something to it meanwhile.
#pragma once

#include <string>
#include <vector>

#include <sys/types.h>

namespace kz::test {

struct RunningSetup {
    /// As a user without rights, when the test has them all.
    bool without_rights = false;
    /// A descriptor for standard input; -1 for that of the test.
    int input = -1;
    /// A socket that is handed over as systemd does it, as descriptor 3; -1 for none.
    int handed_over = -1;
    /// "NAME=value", added to the environment.
    std::vector<std::string> environment = {};
};

/// Its two outputs go to files. Killed at the end when it still runs.
class Running {
public:
    /// The status of a program that may not be run without rights from where it is.
    static constexpr int kMayNotRun = 98;

    Running(std::vector<std::string> arguments, const std::string& out, const std::string& err,
            const RunningSetup& setup = {});
    ~Running();
    Running(const Running&) = delete;
    Running& operator=(const Running&) = delete;

    void send(int signal) const;

    /// Waits until it has a file open; false when that takes too long.
    bool wait_until_open(const std::string& path) const;

    /// The exit status; 128 + n when signal n ended it.
    int wait();

private:
    pid_t process_;
};

} // namespace kz::test
