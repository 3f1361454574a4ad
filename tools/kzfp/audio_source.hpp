/// @file
/// A stream of samples, wherever it comes from, in a form that the library takes.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <iterator>
#include <span>
#include <stdexcept>
#include <string>

#include "options.hpp"

namespace kzfp {

/// What is wrong with one file, and what would be right; without the name of the file.
struct FileError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

/// The file ends before the section that was asked for begins; both in seconds.
FileError start_beyond_end(double end, double start);

constexpr uint32_t kSupportedRates[] = {8000, 11025, 16000, 22050, 24000, 32000, 44100, 48000};
constexpr uint32_t kConvertedRate = 44100; ///< what all other rates are converted to

/// What a sound file may have at all, hertz.
constexpr uint32_t kLowestRate = 1000;
constexpr uint32_t kHighestRate = 768000;

constexpr bool is_usual_rate(uint32_t rate) { return rate >= kLowestRate && rate <= kHighestRate; }

/// Whether samples of a rate go to the library as they are.
constexpr bool takes_rate(Algorithm algorithm, uint32_t rate)
{
    return algorithm == Algorithm::floating
               ? is_usual_rate(rate)
               : std::ranges::find(kSupportedRates, rate) != std::end(kSupportedRates);
}

/// A stream of samples in a form that the library takes.
class AudioSource {
public:
    virtual ~AudioSource() = default;

    /// The form of the samples that read() gives.
    virtual StreamFormat format() const = 0;

    /// Fills `bytes`, a whole number of frames. Gives the frames read: fewer only at the end.
    /// Throws FileError.
    virtual size_t read(std::span<std::byte> bytes) = 0;

    /// Why the stream ended before its time; empty when nothing is known against it.
    virtual std::string trouble() const { return {}; }
};

} // namespace kzfp
