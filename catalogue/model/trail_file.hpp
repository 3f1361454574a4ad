/// @file
/// Trails as files (.kzt): docs/trail_file.md describes them byte by byte.
#pragma once

#include <cstddef>
#include <span>
#include <stdexcept>
#include <vector>

#include "catalogue/model/trail.hpp"

namespace kzcat {

/// What is wrong with a trail or with the bytes of one, in a sentence.
struct TrailError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

/// The bytes of a file, the same on every machine. Throws TrailError for a trail that is not whole:
/// it has code_count(samples) codes.
std::vector<std::byte> write_trail(const Trail& trail);

/// Throws TrailError. A trail that was read is whole.
Trail read_trail(std::span<const std::byte> bytes);

} // namespace kzcat
