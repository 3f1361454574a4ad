/// @file
/// The peers, each over one library. A peer whose library was not there at configuration has no
/// work to run, and its ratios are absent.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "case.hpp"

namespace kz::bench {

inline constexpr char kChromaprint[] = "libchromaprint";
inline constexpr char kCosineFftw[] = "FFTW REDFT10";
inline constexpr char kCosineByRealFftw[] = "DCT by FFTW r2c";
inline constexpr char kSwresample[] = "swresample, float";
inline constexpr char kSwresample16[] = "swresample, 16 bits";
inline constexpr char kSoxr[] = "soxr, matched";
inline constexpr char kSpeexdsp[] = "speexdsp, quality 3";
inline constexpr char kPugixml[] = "pugixml";
inline constexpr char kTinyxml2[] = "tinyxml2";
inline constexpr char kLibxml2[] = "libxml2";
inline constexpr char kCopying[] = "memcpy";
inline constexpr char kReading[] = "reading";

/// A fingerprint by libchromaprint's default algorithm: context, one feed, text, freeing.
Peer chromaprint_fingerprint(std::vector<int16_t> samples, uint32_t rate, uint32_t channels);

/// The life of a libchromaprint context without any audio.
Peer chromaprint_life(uint32_t rate, uint32_t channels);

/// Bytes of heap that a libchromaprint context holds, fresh and fed; nothing where it is absent.
struct ContextHeap {
    int64_t fresh = 0;
    int64_t fed = 0;
};
ContextHeap chromaprint_heap(const std::vector<int16_t>& samples, uint32_t rate, uint32_t channels);

/// FFTW's own DCT-II, and one over its real transform. Single precision, out of place, planned with
/// patience once and stored in a file.
Peer cosine_by_fftw(uint32_t length);
Peer cosine_by_real_fftw(uint32_t length);

/// Resamplers from `rate` to 11025 Hz, mono, fed block by block.
Peer swresample_float(uint32_t rate, size_t block);
Peer swresample_16_bits(uint32_t rate, size_t block);
Peer soxr_matched(uint32_t rate, size_t block);
Peer speexdsp_quality_3(uint32_t rate, size_t block);

/// The query document's tree built with `blocks` blocks of values, rendered with indentation,
/// freed.
Peer document_by_pugixml(const std::string& values, size_t blocks = 1);
Peer document_by_tinyxml2(const std::string& values, size_t blocks = 1);
Peer document_by_libxml2(const std::string& values, size_t blocks = 1);

/// Copies between two buffers that hold `bytes` together, until `bytes` are copied, `times` over.
Peer copying(size_t bytes, size_t times = 1);

/// Reads `bytes` bytes, `times` over.
Peer reading(size_t bytes, size_t times = 1);

} // namespace kz::bench
