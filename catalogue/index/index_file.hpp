/// @file
/// The side file of a catalogue, from and to bytes: docs/index_file.md describes them.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <vector>

#include "catalogue/index/index.hpp"
#include "catalogue/index/mapped_file.hpp"
#include "catalogue/index/parts.hpp"

namespace kzcat {

/// What is wrong with a side file, in a sentence that goes on after "the side file ...".
struct IndexFileError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

/// What the header of a side file states, besides where its sections lie.
struct IndexHeader {
    std::string catalogue; ///< its id, at most kMaxCatalogueId bytes
    Profile profile = Profile::standard;
    int64_t cursor = 0; ///< the last change of the catalogue that the file has
    uint64_t tracks = 0;
    uint64_t codes = 0;
    Plan plan = Plan::scan;
    uint32_t scan_us = 0; ///< microseconds of a look-up as measured when the file was written
    uint32_t parts_us = 0;
};

constexpr size_t kMaxCatalogueId = 64;
constexpr size_t kIndexHeaderBytes = 4096;

/// A side file that was found whole. Its spans lie in the bytes that were read.
struct IndexContents {
    IndexHeader header;
    std::vector<TrackSpan> tracks;
    std::span<const Code> codes;
    std::optional<PartTables> tables; ///< none for more than kMaxIndexedCodes
    std::vector<Code> swapped; ///< what `codes` refers to where words lie the other way round
};

/// Checks every byte that an answer may depend on: header, places and checksums of all sections,
/// tracks, and that the lists of all tables lie in them. Throws IndexFileError.
IndexContents read_index_file(std::span<const std::byte> bytes);

/// Writes the tracks of a corpus and their tables, and a header with no times yet. The counts of
/// `header` are set. Throws std::system_error.
void write_index_file(FileReplacement& file, IndexHeader& header, const Corpus& corpus);

/// Writes the header again, over what write_index_file() has written.
void rewrite_header(FileReplacement& file, std::span<const std::byte> written,
                    const IndexHeader& header);

} // namespace kzcat
