/// @file
/// How far the program is, on a terminal.
#pragma once

#include <cstddef>
#include <string>

#include "kzfp/command_line/output_options.hpp"

namespace kzfp {

/// A line on the terminal that shows how far the program is, when there are several files.
class Progress {
public:
    explicit Progress(size_t files, ProgressMode mode = ProgressMode::terminal);
    ~Progress() { clear(); }
    Progress(const Progress&) = delete;
    Progress& operator=(const Progress&) = delete;
    void show(size_t nth, const std::string& file);
    void clear();

private:
    size_t files_;
    bool wanted_;
    bool shown_ = false;
};

} // namespace kzfp
