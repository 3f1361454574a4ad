// libsndfile corrects a length that is too large without an error; only its log has the one that
// was stated.

#include "audio/missing_samples.hpp"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstring>
#include <limits>
#include <optional>

#include <unistd.h>

namespace audio {

namespace {

constexpr uint64_t kTolerated = 4096;           ///< bytes that headers count wrongly
constexpr uint64_t kUnknownLength = 0x7ff00000; ///< what pipes have for a length, or more

/// The number behind `mark`; nothing when there is none.
std::optional<uint64_t> number_behind(std::string_view line, std::string_view mark)
{
    const size_t found = line.find(mark);
    if (found == std::string_view::npos) {
        return {};
    }
    const std::string_view text = line.substr(found + mark.size());
    uint64_t number = 0;
    const auto [stop, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    return error == std::errc{} ? std::optional(number) : std::nullopt;
}

/// The line of the samples' length in WAV, AIFF and AU files.
bool is_about_samples(std::string_view line)
{
    line.remove_prefix(std::min(line.find_first_not_of(' '), line.size()));
    return line.starts_with("data ") || line.starts_with("SSND ") || line.starts_with("Data Size ");
}

/// The bytes of an ID3v2 tag at the start of a file; their count has 7 bits in each byte.
off_t id3_bytes(int file)
{
    std::array<unsigned char, 10> header = {};
    if (::pread(file, header.data(), header.size(), 0) != ssize_t{header.size()} ||
        std::memcmp(header.data(), "ID3", 3) != 0) {
        return 0;
    }
    off_t size = 0;
    for (size_t i = 6; i < header.size(); ++i) {
        size = size * 128 + (header[i] & 0x7f);
    }
    return size + off_t{header.size()};
}

bool is_ogg(const SF_INFO& info) { return (info.format & SF_FORMAT_TYPEMASK) == SF_FORMAT_OGG; }

} // namespace

uint64_t missing_bytes(std::string_view log)
{
    while (!log.empty()) {
        const std::string_view line = log.substr(0, log.find('\n'));
        log.remove_prefix(std::min(line.size() + 1, log.size()));
        const auto stated = number_behind(line, ": ");
        const auto there = number_behind(line, "(should be ");
        const bool is_known = stated && *stated < kUnknownLength;
        if (is_about_samples(line) && is_known && there && *there < *stated) {
            return *stated - *there;
        }
    }
    return 0;
}

std::string why_cut_off(SNDFILE* file, const SF_INFO& info)
{
    if (is_ogg(info)) {
        const bool unknown = info.frames == std::numeric_limits<sf_count_t>::max();
        return unknown ? "its last page is missing" : "";
    }
    std::array<char, 16384> log = {};
    sf_command(file, SFC_GET_LOG_INFO, log.data(), static_cast<int>(log.size()));
    const uint64_t missing = missing_bytes(log.data());
    return missing > kTolerated ? std::to_string(missing) + " bytes of it are missing" : "";
}

bool has_length_tag(int file)
{
    std::array<char, 2048> bytes = {}; // longer than the first frame of any file
    const ssize_t count = ::pread(file, bytes.data(), bytes.size(), id3_bytes(file));
    const std::string_view text(bytes.data(), static_cast<size_t>(std::max<ssize_t>(count, 0)));
    constexpr std::string_view kTags[] = {"Xing", "Info", "VBRI"};
    return std::ranges::any_of(
        kTags, [text](std::string_view tag) { return text.find(tag) != std::string_view::npos; });
}

} // namespace audio
