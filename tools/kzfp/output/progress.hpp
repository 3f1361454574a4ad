/// @file
/// How far the program is, on a terminal or for another program.
#pragma once

#include <chrono>
#include <cstddef>
#include <deque>
#include <optional>
#include <string>

#include "kzfp/command_line/output_options.hpp"

namespace kzfp {

/// How fast work on many files has been of late, and how long the rest will take.
class Pace {
public:
    struct Rate {
        double files = 0; ///< a second
        double sound = 0; ///< seconds of sound a second
    };

    /// `seconds` since the work began, at which `files` were done that hold `sound` seconds.
    void note(double seconds, size_t files, double sound);

    /// Over the last half minute; nothing before there is something to divide by.
    std::optional<Rate> rate() const;

    /// Seconds that `files` more will take at this rate.
    std::optional<double> remaining(size_t files) const;

private:
    struct Point {
        double seconds;
        size_t files;
        double sound;
    };
    std::deque<Point> points_ = {{0, 0, 0}};
};

/// On a terminal, a line that is replaced in place when there are several files. As JSON, one line
/// on standard error for each call of show(): "schema", "done", "total", "file", "elapsed" and
/// "remaining" (seconds; null while it is unknown).
class Progress {
public:
    explicit Progress(size_t files, ProgressMode mode = ProgressMode::terminal);
    ~Progress() { clear(); }
    Progress(const Progress&) = delete;
    Progress& operator=(const Progress&) = delete;

    /// `done` files are done, `file` being the one at hand or the last one. `sound` is how many
    /// seconds of it were read since the call before; with it, the line shows times real time.
    void show(size_t done, const std::string& file, double sound = 0);

    /// Removes the line from the terminal, before anything else is written there.
    void clear();

private:
    double elapsed() const;
    void show_line(size_t done, const std::string& file);
    void show_object(size_t done, const std::string& file) const;

    size_t files_;
    ProgressMode mode_;
    bool shown_ = false;
    double sound_ = 0;
    std::chrono::steady_clock::time_point began_ = std::chrono::steady_clock::now();
    Pace pace_;
};

} // namespace kzfp
