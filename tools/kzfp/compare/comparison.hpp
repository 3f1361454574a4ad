/// @file
/// What two files have in common, and the verdict on it.
#pragma once

#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

#include "kzfp/catalogue/answer.hpp"
#include "kzfp/compare/side.hpp"

namespace kzfp {

enum class PairVerdict {
    same_recording, ///< the same sound from start to end
    same_start,     ///< they begin with the same sound; of documents, nothing more can be said
    related,        ///< they share sound somewhere, or one is faster, slower or transposed
    different,
    too_quiet ///< or too short: nothing can be said
};

/// "same recording", ...
std::string_view name_of(PairVerdict verdict);

struct Comparison {
    PairVerdict verdict = PairVerdict::different;
    bool by_document = false;                ///< only the 30 values of each could be compared
    std::optional<double> document_distance; ///< mean absolute difference of the 30 values
    std::optional<FoundTrack> found;         ///< the second file in the first, or nearly so
    std::optional<kzcat_alignment> trails;   ///< laid over each other; when both have one
    double first_seconds = 0;                ///< 0 when it has no trail
    double second_seconds = 0;
};

/// Compares two files. Throws audio::FileError when they have no form in common, and what reading
/// the sound of the shorter one once more does.
Comparison compare(const Side& first, const Side& second, const SoundOptions& options);

/// The decision alone, from everything else that a comparison holds. `verdict` is what looking the
/// shorter one up came to.
PairVerdict verdict_of(const Comparison& comparison, uint32_t verdict);

/// Seconds of the first file at which the second one begins, when they have sound in common.
std::optional<double> offset_of(const Comparison& comparison);

/// The share of the longer one's sound that agrees with the other; 0 without trails.
double agreeing_share(const Comparison& comparison);

/// How often a verdict like this was wrong when it was measured (docs/comparing.md).
struct MeasuredError {
    unsigned wrong; ///< verdicts that were wrong
    unsigned pairs; ///< verdicts of this kind
};

MeasuredError measured_error(PairVerdict verdict, bool by_document);

} // namespace kzfp
