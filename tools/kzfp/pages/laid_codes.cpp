// A track's codes begin every 2048 samples; a clip begins anywhere between two of them. A code that
// is read where none of the track begins differs from it in more bits than it need, so the clip is
// read at eight phases of the grid, those of them that are needed, and the nearest code is taken.

#include "kzfp/pages/laid_codes.hpp"

#include <array>
#include <cmath>
#include <functional>
#include <optional>
#include <span>

#include "kzfp/pages/gather.hpp"
#include "kzsdk/stream/stream.h"

namespace kzfp {

namespace {

constexpr double kCodeSeconds = 2048.0 / 11025;
constexpr size_t kPhases = 8;
constexpr double kMostChange = 2; ///< of pitch and tempo; more is no music

/// The code at so many seconds of a clip whose pitch has been undone, if there is one.
using CodeAt = std::function<std::optional<uint64_t>(double seconds)>;

/// The codes of samples that are said to have another rate than they have.
class PhasedCodes {
public:
    PhasedCodes(const report::Sound& sound, double pitch)
        : samples_(sound.samples), rate_(static_cast<uint32_t>(std::lround(sound.rate / pitch)))
    {
    }

    std::optional<uint64_t> at(double seconds)
    {
        const double place = std::round(seconds / kCodeSeconds * kPhases);
        if (!(place >= 0) || place > 1e12) {
            return {};
        }
        const auto step = static_cast<size_t>(place);
        const std::vector<uint64_t>& codes = codes_of_phase(step % kPhases);
        const size_t i = step / kPhases;
        return i < codes.size() ? std::optional(codes[i]) : std::nullopt;
    }

private:
    const std::vector<uint64_t>& codes_of_phase(size_t phase)
    {
        if (!codes_[phase]) {
            const double skipped =
                kCodeSeconds * rate_ * static_cast<double>(phase) / double{kPhases};
            const auto begin = static_cast<size_t>(std::lround(skipped));
            codes_[phase] = begin < samples_.size() ? codes_after(samples_.subspan(begin))
                                                    : std::vector<uint64_t>();
        }
        return *codes_[phase];
    }

    std::vector<uint64_t> codes_after(std::span<const float> samples) const
    {
        const kzcat_format format = {KZ_STREAM_FORMAT_FLOAT32, rate_, 1, 0};
        const auto builder = made<Builder>(kzcat_builder_create, &format,
                                           static_cast<const kzcat_builder_settings*>(nullptr));
        check(kzcat_builder_feed(builder.get(), samples.data(), samples.size_bytes()));
        return codes_of(*made<Trail>(kzcat_builder_finish, builder.get()));
    }

    std::span<const float> samples_;
    uint32_t rate_;
    std::array<std::optional<std::vector<uint64_t>>, kPhases> codes_;
};

bool is_possible(const FoundTrack& found)
{
    const auto is_change = [](double factor) {
        return factor > 1 / kMostChange && factor < kMostChange;
    };
    return is_change(found.tempo) && is_change(found.pitch) && std::fabs(found.offset) < 1e9;
}

/// From `begin`, seconds of the clip, on; `pitch` has been undone in what `code_at` reads.
report::Trails lay(double begin, double pitch, const CodeAt& code_at, std::vector<uint64_t> track,
                   const FoundTrack& found)
{
    report::Trails trails = {.track_name = found.title.value_or(found.source),
                             .track = std::move(track),
                             .matched = {{.begin = found.clip_begin, .end = found.clip_end}}};
    if (!is_possible(found)) {
        return trails;
    }
    const double place = found.offset + begin * found.tempo;
    trails.clip_at = static_cast<int64_t>(std::ceil(place / kCodeSeconds));
    trails.clip_speed = found.tempo;
    const auto time_of = [&](size_t i) {
        const auto code = static_cast<double>(trails.clip_at) + static_cast<double>(i);
        return (code * kCodeSeconds - found.offset) / found.tempo;
    };
    trails.clip_begin = time_of(0);
    while (const auto code = code_at((time_of(trails.clip.size()) - begin) * pitch)) {
        trails.clip.push_back(*code);
    }
    trails.needed = report::highest_error_rate(found.threshold, trails.clip.size());
    return trails;
}

} // namespace

report::Trails lay_sound(const report::Sound& clip, std::vector<uint64_t> track,
                         const FoundTrack& found)
{
    if (!is_possible(found)) {
        return lay(clip.begin, 1, {}, std::move(track), found);
    }
    PhasedCodes codes(clip, found.pitch);
    const CodeAt code_at = [&codes](double seconds) { return codes.at(seconds); };
    report::Trails trails = lay(clip.begin, found.pitch, code_at, std::move(track), found);
    trails.clip_name = clip.name;
    return trails;
}

report::Trails lay_codes(const std::vector<uint64_t>& clip, std::vector<uint64_t> track,
                         const FoundTrack& found)
{
    const CodeAt code_at = [&clip](double seconds) -> std::optional<uint64_t> {
        const double place = std::round(seconds / kCodeSeconds);
        const bool there = place >= 0 && place < static_cast<double>(clip.size());
        return there ? std::optional(clip[static_cast<size_t>(place)]) : std::nullopt;
    };
    return lay(0, 1, code_at, std::move(track), found);
}

} // namespace kzfp
