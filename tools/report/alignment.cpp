// Silence has codes of zeros, which agree with each other and mean nothing: they are not counted.

#include "report/alignment.hpp"

#include <algorithm>
#include <bit>
#include <cmath>

namespace report {

namespace {

constexpr uint32_t kBits = 64;

/// The track's code at the clip's i-th; nothing before and after the track.
std::optional<uint64_t> track_code(const Trails& trails, size_t i)
{
    const int64_t place = trails.clip_at + static_cast<int64_t>(i);
    if (place < 0 || static_cast<uint64_t>(place) >= trails.track.size()) {
        return {};
    }
    return trails.track[static_cast<size_t>(place)];
}

Pixels blank(uint32_t columns)
{
    return {
        .width = columns, .height = kBits, .ink = std::vector<uint8_t>(size_t{columns} * kBits)};
}

/// Sets a column to the share of ones in each bit of the codes.
void set_column(Pixels& pixels, uint32_t column, const std::vector<uint64_t>& codes)
{
    for (uint32_t bit = 0; bit < kBits && !codes.empty(); ++bit) {
        const auto ones = std::count_if(codes.begin(), codes.end(),
                                        [bit](uint64_t code) { return (code >> bit & 1) != 0; });
        pixels.ink[size_t{kBits - 1 - bit} * pixels.width + column] =
            static_cast<uint8_t>(static_cast<size_t>(ones) * 255 / codes.size());
    }
}

} // namespace

double highest_error_rate(double score, size_t codes)
{
    if (codes == 0) {
        return 0;
    }
    return std::clamp((1 - score / std::sqrt(48 * static_cast<double>(codes))) / 2, 0.0, 0.5);
}

ErrorRates error_rates(const Trails& trails)
{
    ErrorRates rates;
    rates.reserve(trails.clip.size());
    for (size_t i = 0; i < trails.clip.size(); ++i) {
        const auto track = track_code(trails, i);
        if (!track || *track == 0 || trails.clip[i] == 0) {
            rates.emplace_back();
        } else {
            rates.emplace_back(std::popcount(trails.clip[i] ^ *track) / double{kBits});
        }
    }
    return rates;
}

std::optional<double> mean_of(const ErrorRates& rates, size_t begin, size_t end)
{
    double sum = 0;
    size_t count = 0;
    for (size_t i = begin; i < std::min(end, rates.size()); ++i) {
        sum += rates[i].value_or(0);
        count += rates[i] ? size_t{1} : size_t{0};
    }
    return count > 0 ? std::optional(sum / static_cast<double>(count)) : std::nullopt;
}

CodePixels code_pixels(const Trails& trails, uint32_t columns)
{
    const size_t count = trails.clip.size();
    const auto used = static_cast<uint32_t>(std::min<size_t>(columns, count));
    CodePixels pixels = {.track = blank(used), .clip = blank(used), .different = blank(used)};
    for (uint32_t column = 0; column < used; ++column) {
        std::vector<uint64_t> track;
        std::vector<uint64_t> clip;
        std::vector<uint64_t> different;
        for (size_t i = count * column / used; i < count * (column + 1) / used; ++i) {
            clip.push_back(trails.clip[i]);
            if (const auto code = track_code(trails, i)) {
                track.push_back(*code);
                different.push_back(*code ^ trails.clip[i]);
            }
        }
        set_column(pixels.track, column, track);
        set_column(pixels.clip, column, clip);
        set_column(pixels.different, column, different);
    }
    return pixels;
}

} // namespace report
