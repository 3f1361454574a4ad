/// @file
/// Trails as files (.kzt): docs/trail_file.md describes them byte by byte.
#pragma once

#include <cstddef>
#include <span>
#include <stdexcept>
#include <vector>

#include "catalogue/model/trail.hpp"

namespace kzcat {

/// What is wrong with the bytes of a trail, in a sentence.
struct TrailError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

std::vector<std::byte> write_trail(const Trail& trail);

/// Throws TrailError.
Trail read_trail(std::span<const std::byte> bytes);

} // namespace kzcat
