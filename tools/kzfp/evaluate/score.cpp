// A clip for which a track with the same sound was named is counted neither as right nor as wrong.

#include "kzfp/evaluate/score.hpp"

#include <algorithm>
#include <cmath>

namespace kzfp::evaluate {

Interval confidence(size_t hits, size_t count)
{
    constexpr double kDeviations = 1.959964; // 95 % of the normal distribution lie within
    if (count == 0) {
        return {};
    }
    const auto n = static_cast<double>(count);
    const double share = static_cast<double>(hits) / n;
    const double square = kDeviations * kDeviations / n;
    const double middle = (share + square / 2) / (1 + square);
    const double half =
        kDeviations / (1 + square) * std::sqrt(share * (1 - share) / n + square / (4 * n));
    return {.low = hits == 0 ? 0 : std::max(0.0, middle - half),
            .high = hits == count ? 1 : std::min(1.0, middle + half)};
}

std::optional<double> quantile(std::vector<double> values, double part)
{
    if (values.empty()) {
        return {};
    }
    std::ranges::sort(values);
    const auto place = static_cast<size_t>(part * static_cast<double>(values.size()));
    return values[std::min(place, values.size() - 1)];
}

void Tally::add(const Outcome& outcome)
{
    if (outcome.state != Outcome::State::looked_up) {
        silent += outcome.state == Outcome::State::silent ? 1U : 0U;
        failed += outcome.state == Outcome::State::failed ? 1U : 0U;
        return;
    }
    milliseconds.push_back(outcome.milliseconds);
    if (outcome.same_sound) {
        ++same_sound;
        return;
    }
    if (!outcome.known) {
        ++strangers;
        false_matches += outcome.accepted ? 1U : 0U;
        return;
    }
    ++clips;
    first += outcome.first ? 1U : 0U;
    right += outcome.right ? 1U : 0U;
    wrong += outcome.accepted && !outcome.right ? 1U : 0U;
    if (outcome.right) {
        place_errors.push_back(outcome.place_error);
    }
    if (outcome.by_scan.value_or(false)) {
        ++scanned;
        by_parts += outcome.by_parts.value_or(false) ? 1U : 0U;
    }
}

void Tally::add(const Tally& other)
{
    clips += other.clips;
    first += other.first;
    right += other.right;
    wrong += other.wrong;
    strangers += other.strangers;
    false_matches += other.false_matches;
    same_sound += other.same_sound;
    silent += other.silent;
    failed += other.failed;
    scanned += other.scanned;
    by_parts += other.by_parts;
    place_errors.insert(place_errors.end(), other.place_errors.begin(), other.place_errors.end());
    milliseconds.insert(milliseconds.end(), other.milliseconds.begin(), other.milliseconds.end());
}

} // namespace kzfp::evaluate
