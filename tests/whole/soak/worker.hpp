/// @file
/// One thread's work: several fingerprints at once, a piece for this and a piece for that.
#pragma once

#include <atomic>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "kzsdk/stream/stream.h"
#include "support/fingerprints.hpp"
#include "whole/soak/recordings.hpp"

namespace kz::soak {

struct FreeStream {
    void operator()(kz_stream* stream) const { kz_stream_free(&stream); }
};

/// What a fingerprint is made through.
enum class Door { extraction, stream };

/// A fingerprint context, or a stream.
class Job {
public:
    Job(const Recording& recording, uint32_t way, Door door = Door::extraction);

    /// Feeds the next piece; true when the fingerprint is complete or the recording at its end.
    bool step();

    /// The document, or what went wrong.
    std::string document() const;

    /// No cut shows in a stream: its document is that of the uncut recording.
    bool is_as_alone() const
    {
        return document() == recording_->documents[stream_ != nullptr ? 0 : way_];
    }
    const Recording& recording() const { return *recording_; }

private:
    kz_status feed(const int16_t* samples, uint32_t byte_count, uint8_t& complete);

    const Recording* recording_;
    uint32_t way_;
    Cutter cutter_;
    uint32_t fed_ = 0;
    test::Handle handle_;                           ///< or
    std::unique_ptr<kz_stream, FreeStream> stream_; ///< one of the two
};

struct Tally {
    std::atomic<uint64_t> documents{0};
    std::atomic<uint64_t> abandoned{0};
    std::atomic<uint64_t> wrong{0};
};

/// Works until `stop`.
void work(const std::vector<Recording>& recordings, uint64_t seed, const std::atomic<bool>& stop,
          Tally& tally);

} // namespace kz::soak
