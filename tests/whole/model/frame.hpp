/// @file
/// One analysis frame of 32768 samples to the energies and amplitudes of 15 bands.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <utility>
#include <vector>

#include "whole/model/dct.hpp"
#include "whole/model/equaliser.hpp"
#include "whole/model/resampler.hpp"
#include "whole/model/words.hpp"

namespace kz::model {

inline constexpr size_t kFrameLength = 32768;
inline constexpr size_t kFrameHop = 11264;
inline constexpr size_t kFrameLimit = 12;
inline constexpr size_t kBands = 15;
inline constexpr uint32_t kLevels = 256;

/// Band b runs from edge b to edge b + 1, both bins included.
inline constexpr std::array<size_t, kBands + 1> kBandEdges = {
    0, 593, 1188, 1782, 2377, 3031, 3744, 4576, 5468, 6419, 7548, 8797, 10223, 11888, 13790, 16049};

/// About 256 / (bins of the band), as a fraction of 2^32.
inline constexpr std::array<int32_t, kBands> kBandWeights = {
    1851029675, 1844818166, 1847918701, 1844818166, 1678643705, 1539932251, 1319941929, 1231256021,
    1154949188, 973019139,  879609301,  770505695,  659970964,  577778049,  486509569};

/// A stretch of bins whose gain, with 30 fraction bits, grows linearly.
struct GainSegment {
    size_t first;
    size_t end;
    int32_t gain;
    int32_t step;
};

inline constexpr GainSegment kGainRamp[] = {
    {13790, 14147, 1073741824, 32483},  {14147, 14385, 1085338235, 73087},
    {14385, 14622, 1102732853, 140674}, {14622, 14860, 1136072536, 149219},
    {14860, 15098, 1171586547, 121811}, {15098, 15336, 1200577576, -194898},
    {15336, 15574, 1154191930, 992760}, {15574, 15811, 1390468818, 819578}};

struct Features {
    std::array<int32_t, kBands> energy;
    std::array<uint32_t, kBands> amplitude;
};

class FrameAnalyser {
public:
    explicit FrameAnalyser(std::vector<int32_t> half_band_taps)
        : decimator_(kHalf, std::move(half_band_taps)), dct_(14)
    {
    }

    Features operator()(std::span<const int32_t> frame)
    {
        std::vector<int32_t> spectrum = decimate(equalise_unless_silent(frame, kLevels));
        dct_(spectrum);
        lift(spectrum);
        return features(spectrum);
    }

    /// Half the samples, from a filter that starts empty and is emptied with zeros.
    std::vector<int32_t> decimate(std::span<const int32_t> frame)
    {
        std::vector<int32_t> result(frame.size() / 2);
        decimator_.reset();
        const size_t made = decimator_.resample(frame, result).produced;
        if (made < result.size()) {
            const std::vector<int32_t> zeros(60, 0);
            decimator_.resample(zeros, std::span(result).subspan(made));
        }
        return result;
    }

    static void lift(std::span<int32_t> spectrum)
    {
        for (const GainSegment& segment : kGainRamp) {
            for (size_t bin = segment.first; bin < segment.end; ++bin) {
                const auto steps = static_cast<int64_t>(bin - segment.first);
                const int32_t gain = word(segment.gain + steps * segment.step);
                spectrum[bin] = word(int64_t{high_product(spectrum[bin], gain)} * 4);
            }
        }
    }

    static Features features(std::span<const int32_t> spectrum)
    {
        Features result{};
        for (size_t band = 0; band < kBands; ++band) {
            int64_t sum = 0;
            for (size_t bin = kBandEdges[band]; bin <= kBandEdges[band + 1]; ++bin) {
                sum += (int64_t{spectrum[bin]} * spectrum[bin]) >> 16;
            }
            result.energy[band] = word(sum >> 16);
            result.amplitude[band] =
                square_root(unsigned_word(high_product(result.energy[band], kBandWeights[band])));
        }
        return result;
    }

private:
    Resampler decimator_;
    Dct dct_;
};

} // namespace kz::model
