/// @file
/// Sound files that end before their header says.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include <sndfile.h>

namespace audio {

/// The bytes of samples that a header states and the file does not have, by what libsndfile
/// writes down while it reads the header. 0 where nothing is missing or no length is stated.
uint64_t missing_bytes(std::string_view log);

/// Why a file is damaged that was read to its end: it was cut off. Empty when it was not. For files
/// of the formats that libsndfile takes for shorter ones without complaint.
std::string why_cut_off(SNDFILE* file, const SF_INFO& info);

/// Whether an MPEG file states its length: without the tag that does, libsndfile estimates it from
/// the first bit rate, which may be far from that of the rest.
bool has_length_tag(int file);

} // namespace audio
