/// @file
/// Trails and queries from frames: which frames are compared, and when a code is known.

#include "catalogue/model/extractor.hpp"

#include <algorithm>
#include <array>
#include <optional>
#include <stdexcept>
#include <utility>

#include "catalogue/model/frame_analyser.hpp"
#include "catalogue/model/frame_feeder.hpp"
#include "catalogue/model/level_meter.hpp"
#include "catalogue/model/library_hold.hpp"

namespace kzcat {

namespace {

using Differences = std::array<float, kPairs>;

void require_open(bool ended)
{
    if (ended) {
        throw std::logic_error("The stream has ended; make another extractor for another stream.");
    }
}

} // namespace

// A code compares frames up to three before and three behind its own, so the last seven are kept.
//
//     frame     0  1  2  3  4  5  6  7 ...         code c is that of frame 2c
//     code      0     1     2     3                and is known with frame 2c + 3
struct TrailExtractor::State {
    static constexpr uint64_t kKept = 8;
    static constexpr uint64_t kLongestLag = 3;
    static constexpr uint64_t kFramesPerCode = kCodeHop / kTrailHop;

    State(const SoundFormat& format, bool document_bands) : feeder(format, kTrailHop)
    {
        if (document_bands) {
            documents.emplace();
        }
    }

    void hear(std::span<const float> samples)
    {
        if (documents) {
            documents->feed(samples);
        }
    }

    void add(Frame frame)
    {
        std::array<float, kFineBands> energies;
        analyser.analyse(frame, energies);
        pair_differences(energies, 0, kept[frames % kKept]);
        ++frames;
        while (next_frame() + kLongestLag < frames) {
            add_code();
        }
    }

    // The frame of the next code.
    uint64_t next_frame() const { return made * kFramesPerCode; }

    // Frames beyond the ends are those at the ends.
    const Differences& at(uint64_t frame) const
    {
        return kept[std::min(frame, frames - 1) % kKept];
    }

    void add_code()
    {
        const uint64_t centre = next_frame();
        Code code = 0;
        for (size_t pair = 0; pair < kPairs; ++pair) {
            const uint64_t lag = pair_lag(pair);
            const float change = at(centre + lag)[pair] - at(centre - std::min(centre, lag))[pair];
            code |= Code{change > 0} << pair;
        }
        codes.push_back(code);
        ++made;
    }

    LibraryHold library; // before what it is needed for
    FrameFeeder feeder;
    FrameAnalyser analyser;
    std::array<Differences, kKept> kept{};
    uint64_t frames = 0;
    uint64_t made = 0; // codes, also those taken
    std::vector<Code> codes;
    std::optional<DocumentBandExtractor> documents;
    bool ended = false;
};

TrailExtractor::TrailExtractor(const SoundFormat& format, bool document_bands)
    : state_(std::make_unique<State>(format, document_bands))
{
}
TrailExtractor::TrailExtractor(TrailExtractor&&) noexcept = default;
TrailExtractor& TrailExtractor::operator=(TrailExtractor&&) noexcept = default;
TrailExtractor::~TrailExtractor() = default;

void TrailExtractor::feed(std::span<const std::byte> bytes)
{
    require_open(state_->ended);
    state_->feeder.feed(
        bytes, [this](Frame frame) { state_->add(frame); },
        [this](std::span<const float> samples) { state_->hear(samples); });
}

std::vector<Code> TrailExtractor::take_codes() { return std::exchange(state_->codes, {}); }

DocumentBands TrailExtractor::take_document_bands()
{
    return state_->documents ? state_->documents->take() : DocumentBands{};
}

Trail TrailExtractor::finish()
{
    require_open(state_->ended);
    state_->ended = true;
    while (state_->next_frame() < state_->frames) {
        state_->add_code();
    }
    return {Profile::standard, state_->feeder.samples(), take_codes()};
}

struct QueryExtractor::State {
    explicit State(const SoundFormat& format) : feeder(format, kQueryHop) {}

    void add(Frame frame)
    {
        const size_t before = bands.energies.size();
        bands.energies.resize(before + kFineBands);
        analyser.analyse(frame,
                         std::span<float, kFineBands>(bands.energies.data() + before, kFineBands));
        bands.levels.push_back(meter.measure(frame));
    }

    LibraryHold library; // before what it is needed for
    FrameFeeder feeder;
    FrameAnalyser analyser;
    LevelMeter meter;
    QueryBands bands;
    bool ended = false;
};

QueryExtractor::QueryExtractor(const SoundFormat& format) : state_(std::make_unique<State>(format))
{
}
QueryExtractor::QueryExtractor(QueryExtractor&&) noexcept = default;
QueryExtractor& QueryExtractor::operator=(QueryExtractor&&) noexcept = default;
QueryExtractor::~QueryExtractor() = default;

void QueryExtractor::feed(std::span<const std::byte> bytes)
{
    require_open(state_->ended);
    state_->feeder.feed(
        bytes, [this](Frame frame) { state_->add(frame); }, [](std::span<const float>) {});
}

QueryBands QueryExtractor::take()
{
    state_->bands.samples = state_->feeder.samples();
    return std::exchange(state_->bands, {});
}

QueryBands QueryExtractor::finish()
{
    require_open(state_->ended);
    state_->ended = true;
    return take();
}

} // namespace kzcat
