/// @file
/// Whether the variant of the inner loops that is to be timed is bit-identical to the plain one: a
/// fast wrong loop is worth nothing.
#pragma once

#include <string>
#include <vector>

#include "case.hpp"

namespace kz::bench {

/// Name of the variant that the library uses in this process.
std::string variant();

/// Prints what each of these cases yields, a line each: its name and a digest.
void print_digests(const std::vector<Case>& cases);

/// Throws unless each of these cases yields here what it yields in a process that is pinned to the
/// plain variant.
void require_plain_bits(const std::vector<Case>& cases);

} // namespace kz::bench
