/// @file
/// The documents of every stretch of a track, in the form in which they are compared.
#pragma once

#include <array>
#include <cstdint>
#include <span>
#include <vector>

#include "catalogue/model/document_bands.hpp"

namespace kzcat {

/// Square roots of the 30 values of a document, in units of 1/128, then zeros to the next power of
/// two. Roots, because in them the values of quiet bands count as much as those of loud ones.
using DocumentRow = std::array<int16_t, 32>;

constexpr double kDocumentRowUnit = 1.0 / 128;

DocumentRow document_row(const DocumentValues& values);

/// How far two documents are apart: the sum of the differences of the roots, in kDocumentRowUnit.
uint32_t document_distance(const DocumentRow& a, const DocumentRow& b);

/// The rows of all documents of a track, one for every stored frame with which one can begin: none
/// when the track is shorter than a document.
std::vector<DocumentRow> document_rows(std::span<const uint16_t> bands);

} // namespace kzcat
