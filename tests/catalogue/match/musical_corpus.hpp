// A catalogue of synthetic music, and clips of it.
#pragma once

#include <cstdint>
#include <span>
#include <vector>

#include "background_music.hpp"
#include "catalogue/match/match.hpp"
#include "catalogue/match/scan.hpp"
#include "catalogue/model/extractor.hpp"
#include "kzsdk/stream/stream.h"

namespace kzcat::test {

using Samples = std::vector<int16_t>;

inline SoundFormat mono(uint32_t rate = kWorkingRate)
{
    return {.encoding = KZ_STREAM_FORMAT_PCM16, .rate = rate, .channels = 1};
}

inline Trail trail_of(const Samples& sound)
{
    TrailExtractor extractor(mono());
    extractor.feed(std::as_bytes(std::span(sound)));
    return extractor.finish();
}

// The query of a sound; another rate than that of the catalogue makes it faster or slower.
inline QueryBands query_of(const Samples& sound, uint32_t rate = kWorkingRate)
{
    QueryExtractor extractor(mono(rate));
    extractor.feed(std::as_bytes(std::span(sound)));
    return extractor.finish();
}

inline size_t samples_in(double seconds) { return static_cast<size_t>(seconds * kWorkingRate); }

inline Samples part_of(const Samples& sound, double begin, double seconds)
{
    const auto first = sound.begin() + static_cast<std::ptrdiff_t>(samples_in(begin));
    return {first, first + static_cast<std::ptrdiff_t>(samples_in(seconds))};
}

// Tracks 1, 2, ... with the codes that they are made of.
class MusicalCorpus {
public:
    void add(const Trail& trail)
    {
        spans_.push_back({.id = static_cast<int64_t>(spans_.size()) + 1,
                          .first = codes_.size(),
                          .count = trail.codes.size()});
        codes_.insert(codes_.end(), trail.codes.begin(), trail.codes.end());
    }
    Corpus corpus() const { return {.segments = {{.codes = codes_, .tracks = spans_}}}; }
    std::span<const Code> track(size_t number) const
    {
        return std::span(codes_).subspan(spans_[number].first, spans_[number].count);
    }

private:
    std::vector<Code> codes_;
    std::vector<TrackSpan> spans_;
};

// Pieces that are not among those of the background, one minute of each.
constexpr size_t kFirstPiece = 100;
constexpr size_t kPieces = 8;
constexpr double kPieceSeconds = 60;

inline Samples piece(size_t number, Playing playing = {})
{
    return background_music(kFirstPiece + number, samples_in(kPieceSeconds), playing);
}

inline const MusicalCorpus& pieces()
{
    static const MusicalCorpus made = [] {
        MusicalCorpus corpus;
        for (size_t i = 0; i < kPieces; ++i) {
            corpus.add(trail_of(piece(i)));
        }
        return corpus;
    }();
    return made;
}

} // namespace kzcat::test
