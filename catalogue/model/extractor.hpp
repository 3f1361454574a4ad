/// @file
/// From sound to trails and to queries.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>

#include "catalogue/model/document_bands.hpp"
#include "catalogue/model/fine_bands.hpp"
#include "catalogue/model/trail.hpp"

namespace kzcat {

/// How interleaved samples lie in memory.
struct SoundFormat {
    uint32_t encoding = 0; ///< KZ_STREAM_FORMAT_...; full scale is 1 for floats, 32768 for 16 bits
    uint32_t rate = 0;     ///< hertz, 1 to KZ_STREAM_MAX_RATE
    uint32_t channels = 0; ///< 1 to KZ_STREAM_MAX_CHANNELS

    bool operator==(const SoundFormat&) const = default;
};

/// Makes the trail of a stream of samples of any length, which may be cut anywhere, in the middle
/// of a sample too: the codes are the same to the bit. Memory does not grow with the stream, except
/// for the codes not yet taken.
class TrailExtractor {
public:
    /// @param document_bands  Also compute what documents are answered from.
    ///
    /// Throws std::invalid_argument with a sentence when the format cannot be used.
    explicit TrailExtractor(const SoundFormat& format, bool document_bands = false);
    TrailExtractor(TrailExtractor&&) noexcept;
    TrailExtractor& operator=(TrailExtractor&&) noexcept;
    ~TrailExtractor();

    void feed(std::span<const std::byte> bytes);

    /// The codes that are complete, oldest first; each is given once. finish() then gives the rest.
    std::vector<Code> take_codes();

    /// The band energies that are complete, oldest frame first; each is given once. finish() adds
    /// none. Empty unless the extractor was made to compute them.
    DocumentBands take_document_bands();

    /// Ends the stream and returns the trail of everything that was fed, less codes already taken.
    Trail finish();

private:
    struct State;
    std::unique_ptr<State> state_;
};

/// Makes the query of a stream of samples, which may be cut anywhere.
class QueryExtractor {
public:
    explicit QueryExtractor(const SoundFormat& format);
    QueryExtractor(QueryExtractor&&) noexcept;
    QueryExtractor& operator=(QueryExtractor&&) noexcept;
    ~QueryExtractor();

    void feed(std::span<const std::byte> bytes);

    /// The bands of the frames that are complete, oldest first; each is given once, so that memory
    /// does not grow with the stream. `samples` are all that were heard so far. finish() then gives
    /// the rest.
    QueryBands take();

    /// Ends the stream.
    QueryBands finish();

private:
    struct State;
    std::unique_ptr<State> state_;
};

} // namespace kzcat
