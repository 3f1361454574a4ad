/// @file
/// One thread's work: several fingerprints at once, a piece for this and a piece for that.
#pragma once

#include <atomic>
#include <cstdint>
#include <string>
#include <vector>

#include "support/fingerprints.hpp"
#include "whole/soak/recordings.hpp"

namespace kz::soak {

/// A fingerprint context.
class Job {
public:
    Job(const Recording& recording, uint32_t way);

    /// Feeds the next piece; true when the fingerprint is complete or the recording at its end.
    bool step();

    /// The document, or what went wrong.
    std::string document() const;

    bool is_as_alone() const { return document() == recording_->documents[way_]; }
    const Recording& recording() const { return *recording_; }

private:
    const Recording* recording_;
    uint32_t way_;
    Cutter cutter_;
    uint32_t fed_ = 0;
    test::Handle handle_;
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
