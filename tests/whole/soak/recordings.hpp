/// @file
/// What the load is made of: recordings, the ways in which they are cut, and the documents that one
/// thread alone gets from them.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "support/input_formats.hpp"
#include "support/signals.hpp"

namespace kz::soak {

struct Recording {
    test::Algorithm algorithm = test::fixed;
    uint32_t rate = 0;
    uint32_t channels = 0;
    std::string name; ///< of its line in the golden documents
    std::vector<int16_t> samples;
    std::vector<std::string> documents; ///< one for each way of cutting

    uint32_t frame_count() const { return static_cast<uint32_t>(samples.size() / channels); }
};

constexpr uint32_t kCuts = 4; ///< ways of cutting; number 0 is not to cut at all

/// The sizes of the pieces, in frames, that one way of cutting gives.
class Cutter {
public:
    explicit Cutter(uint32_t way) : way_(way), random_(way) {}
    uint32_t next();

private:
    uint32_t way_;
    test::Random random_;
};

/// Reads what is on record in tests/whole/golden, makes the sound of the 16-bit music among it, and
/// takes the documents, one after the other. `problem` says what is not as it is on record.
std::vector<Recording> make_recordings(std::string& problem);

} // namespace kz::soak
