/// @file
/// How two whole trails lie to each other, and where along time they agree.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <vector>

#include "catalogue/model/profile.hpp"

namespace kzcat {

/// Codes that are judged together: 3 s.
constexpr size_t kAlignedCodes = 16;

/// The share of differing bits up to which a block agrees. docs/duplicates.md has the measurements.
constexpr double kAgreeingErrors = 0.36;

/// Some codes of the second trail and those of the first that they lie on. A code without a bit,
/// which is one of silence, is not compared.
struct AlignedBlock {
    size_t begin = 0; ///< codes of the second trail
    size_t end = 0;
    int64_t lag = 0; ///< code i of the second trail lies on code i + lag of the first
    uint32_t compared = 0;
    uint32_t errors = 0; ///< differing bits of those compared

    bool agrees() const;
};

struct Alignment {
    int64_t lag = 0;                  ///< where most of it agrees
    double offset = 0;                ///< the average lag of what agrees, also between two codes
    std::vector<AlignedBlock> blocks; ///< all codes of the second trail; their lags may drift
};

/// The alignment at which most agrees; nothing when no six seconds agree at any.
std::optional<Alignment> align(std::span<const Code> first, std::span<const Code> second);

/// The differing bits of each code of the second trail; nothing where it is not compared.
std::vector<std::optional<uint8_t>>
bit_errors(std::span<const Code> first, std::span<const Code> second, const Alignment& alignment);

/// Codes that are not silence.
uint64_t sounding_codes(std::span<const Code> codes);

} // namespace kzcat
