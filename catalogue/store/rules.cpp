// What holds in every store: which tracks it accepts, and how tags unite.

#include "catalogue/store/rules.hpp"

#include <algorithm>
#include <chrono>
#include <limits>
#include <random>

namespace kzcat {

namespace {

[[noreturn]] void refuse(const std::string& text)
{
    throw StoreError(StoreError::Kind::invalid, text);
}

/// How many bytes follow the first one of a character, and how low and how high the second may be:
/// that excludes overlong forms, surrogates and what lies above U+10FFFF.
struct Lead {
    int following;
    unsigned low;
    unsigned high;
};

Lead read_lead(unsigned byte)
{
    if (byte < 0x80) {
        return {0, 0, 0};
    }
    if (byte >= 0xc2 && byte <= 0xdf) {
        return {1, 0x80, 0xbf};
    }
    if (byte >= 0xe0 && byte <= 0xef) {
        return {2, byte == 0xe0 ? 0xa0U : 0x80U, byte == 0xed ? 0x9fU : 0xbfU};
    }
    if (byte >= 0xf0 && byte <= 0xf4) {
        return {3, byte == 0xf0 ? 0x90U : 0x80U, byte == 0xf4 ? 0x8fU : 0xbfU};
    }
    return {-1, 0, 0};
}

bool is_utf8(std::string_view text)
{
    for (size_t at = 0; at < text.size();) {
        const Lead lead = read_lead(static_cast<unsigned char>(text[at++]));
        if (lead.following < 0 || text.size() - at < static_cast<size_t>(lead.following)) {
            return false;
        }
        for (int i = 0; i < lead.following; ++i) {
            const unsigned byte = static_cast<unsigned char>(text[at++]);
            if (byte < (i == 0 ? lead.low : 0x80U) || byte > (i == 0 ? lead.high : 0xbfU)) {
                return false;
            }
        }
    }
    return true;
}

void check_text(std::string_view text, const char* what, bool must_be_utf8)
{
    if (text.find('\0') != std::string_view::npos) {
        refuse(std::string(what) + " must not contain a NUL byte; leave it out");
    }
    if (text.size() > kMaxText) {
        refuse(std::string(what) + " of " + std::to_string(text.size()) +
               " bytes is too long; at most " + std::to_string(kMaxText) + " are kept");
    }
    if (must_be_utf8 && !is_utf8(text)) {
        refuse(std::string(what) + " must be UTF-8; convert it first");
    }
}

void check_features(const NewTrack& track)
{
    if (track.trail.codes.size() > kMaxCodes) {
        refuse("a trail of " + std::to_string(track.trail.codes.size()) +
               " codes is too long; cut the recording into tracks of at most " +
               std::to_string(kMaxCodes));
    }
    if (track.trail.samples > uint64_t{std::numeric_limits<int64_t>::max()}) {
        refuse("a trail cannot be of more than 2^63 - 1 samples; the trail is damaged");
    }
    if (track.document_bands.size() % 15 != 0 || track.document_bands.size() > kMaxDocumentBands) {
        refuse("document bands must be whole frames of 15 values, " +
               std::to_string(kMaxDocumentBands) + " values at most, not " +
               std::to_string(track.document_bands.size()));
    }
}

} // namespace

void check_source(const Source& source) { check_text(source.uri, "the path of a source", false); }

void check_setting(std::string_view name, std::string_view value)
{
    if (name.empty()) {
        refuse("a setting must have a name");
    }
    check_text(name, "the name of a setting", true);
    check_text(value, "the value of a setting", true);
}

void check_new_track(const NewTrack& track, Profile profile)
{
    if (track.trail.profile != profile) {
        throw StoreError(
            StoreError::Kind::other_profile,
            "the trail has features of profile " +
                std::to_string(static_cast<uint32_t>(track.trail.profile)) +
                ", which cannot be compared with profile " +
                std::to_string(static_cast<uint32_t>(profile)) +
                " of this catalogue; make the trail again from the sound, or use a catalogue of "
                "its profile");
    }
    check_features(track);
    check_source(track.source);
    for (const Tag& tag : track.tags) {
        if (tag.name.empty()) {
            refuse("a tag must have a name");
        }
        check_text(tag.name, "the name of a tag", true);
        check_text(tag.value, "the value of a tag", true);
    }
}

std::vector<Tag> merge_tags(std::span<const Tag> kept, std::span<const Tag> given, bool same_source)
{
    if (same_source && !given.empty()) {
        return {given.begin(), given.end()};
    }
    std::vector<Tag> tags(kept.begin(), kept.end());
    for (const Tag& tag : given) {
        const auto has_name = [&](const Tag& other) { return other.name == tag.name; };
        if (std::none_of(kept.begin(), kept.end(), has_name)) {
            tags.push_back(tag);
        }
    }
    return tags;
}

std::string random_catalogue_id()
{
    std::random_device random;
    std::string id;
    for (int word = 0; word < 4; ++word) {
        for (uint32_t bits = random(), digit = 0; digit < 8; ++digit, bits >>= 4U) {
            id += "0123456789abcdef"[bits & 0xfU];
        }
    }
    return id;
}

int64_t seconds_now()
{
    const auto since_1970 = std::chrono::system_clock::now().time_since_epoch();
    return std::chrono::duration_cast<std::chrono::seconds>(since_1970).count();
}

} // namespace kzcat
