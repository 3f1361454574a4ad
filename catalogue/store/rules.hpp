/// @file
/// What holds in every store, wherever it keeps its tracks.
#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "catalogue/store/store.hpp"

namespace kzcat {

constexpr size_t kMaxCodes = (size_t{1} << 25) - 128;          ///< of a track: 72 days
constexpr size_t kMaxDocumentBands = size_t{15} * (1U << 23U); ///< of a track: 49 days
constexpr size_t kMaxText = size_t{1} << 20;                   ///< bytes of a tag, path or setting

/// Each throws StoreError::Kind::invalid, or other_profile, when a store cannot keep this.
void check_new_track(const NewTrack& track, Profile profile);
void check_source(const Source& source);
void check_setting(std::string_view name, std::string_view value);

/// The tags of a track after it was added again: see Store::add().
std::vector<Tag> merge_tags(std::span<const Tag> kept, std::span<const Tag> given,
                            bool same_source);

/// 32 random hexadecimal digits.
std::string random_catalogue_id();

/// Seconds since 1970.
int64_t seconds_now();

} // namespace kzcat
