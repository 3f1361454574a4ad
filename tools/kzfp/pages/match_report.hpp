/// @file
/// The page of `kzfp match --report`.
#pragma once

#include <string>
#include <vector>

#include "kzfp/catalogue/answer.hpp"
#include "kzfp/catalogue/clip_inputs.hpp"
#include "report/report.hpp"

namespace kzfp {

/// Collects the answers of a run. Memory grows with their number, not with their length: pictures
/// are drawn as answers come, and of the first kMostDrawn clips alone.
class MatchReport {
public:
    static constexpr size_t kMostDrawn = 50;

    /// `title` is what the clips were looked up in.
    explicit MatchReport(std::string title) : title_(std::move(title)) {}

    /// Draws why a clip was recognised, or was not. What cannot be read again is noted on the page;
    /// nothing is thrown but std::bad_alloc.
    void add(const Answer& answer, const ClipInput& input, const SoundOptions& options,
             kzcat_catalogue& catalogue);

    /// The page as HTML.
    std::string page() const;

private:
    void count(const Answer& answer, const std::string& name);

    std::string title_;
    size_t clips_ = 0;
    size_t recognised_ = 0;
    size_t failed_ = 0;
    report::Table all_;
    std::string sections_;
};

} // namespace kzfp
