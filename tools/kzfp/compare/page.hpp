/// @file
/// The page of `kzfp compare --report`.
#pragma once

#include <string>

#include "kzfp/compare/comparison.hpp"
#include "report/report.hpp"

namespace kzfp {

/// Collects the pairs of a run. The pictures are of the first file and of the first kMostDrawn
/// others; the table has all of them.
class ComparisonPage {
public:
    static constexpr size_t kMostDrawn = 8;

    explicit ComparisonPage(std::string first);

    /// What cannot be read again for its picture is noted on the page; nothing is thrown but
    /// std::bad_alloc.
    void add(const Side& first, const Side& second, const Comparison& comparison,
             const SoundOptions& options);

    /// A pair that could not be compared.
    void add_failed(const std::string& second, const std::string& error);

    /// The page as HTML.
    std::string html() const;

private:
    void draw(const Side& side, const SoundOptions& options);
    void draw_trails(const Side& first, const Side& second, const Comparison& comparison);
    void mark(const Side& first, const Side& second, const Comparison& comparison,
              const SoundOptions& options);

    std::string first_;
    std::string last_;    ///< the only other file, or the last one
    std::string verdict_; ///< of that one
    size_t pairs_ = 0;
    size_t drawn_ = 0;
    report::ComparePage page_;
};

} // namespace kzfp
