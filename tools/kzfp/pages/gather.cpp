#include "kzfp/pages/gather.hpp"

#include <algorithm>
#include <chrono>
#include <ctime>
#include <filesystem>
#include <system_error>

#include "audio/input.hpp"
#include "audio/mono.hpp"
#include "kzfp/fingerprinter.hpp"
#include "kzfp/library.hpp"

namespace kzfp {

namespace {

/// "2026-11-22 07:00 UTC".
std::string time_text()
{
    const std::time_t now = std::chrono::system_clock::to_time_t(std::chrono::system_clock::now());
    std::tm parts = {};
    char text[64];
    if (::gmtime_r(&now, &parts) == nullptr ||
        std::strftime(text, sizeof text, "%Y-%m-%d %H:%M UTC", &parts) == 0) {
        return {};
    }
    return text;
}

} // namespace

report::Heading heading_of(const std::string& title, const std::string& subtitle)
{
    return {.title = title,
            .subtitle = subtitle,
            .program = "kzfp " KZFP_VERSION,
            .made = time_text(),
            .facts = {}};
}

bool can_be_drawn(const std::string& path)
{
    std::error_code error;
    return path != "-" && std::filesystem::is_regular_file(path, error);
}

SoundOptions part_of(const SoundOptions& options, double begin, double seconds)
{
    SoundOptions part = options;
    part.section.start += begin;
    part.section.length =
        options.section.length ? std::min(seconds, *options.section.length - begin) : seconds;
    return part;
}

report::Sound drawn_sound(const std::string& name, const std::string& path,
                          const SoundOptions& options)
{
    const SoundOptions part = part_of(options, 0, kDrawnSeconds);
    audio::Mono mono = audio::read_mono(path, part.raw, part.section);
    return {.name = name,
            .samples = std::move(mono.samples),
            .rate = mono.rate,
            .begin = part.section.start,
            .matched = {}};
}

std::optional<report::Fingerprint> drawn_values(const std::string& name, const std::string& path,
                                                const SoundOptions& options)
{
    const audio::Request request = {
        .raw = options.raw, .section = options.section, .accepts_rate = [](uint32_t rate) {
            return takes_rate(Algorithm::fixed, rate);
        }};
    audio::Input input(path, request);
    const audio::OpenedInput opened = input.open();
    try {
        const Fingerprint taken = take_fingerprint(*opened.source, Algorithm::fixed);
        report::Fingerprint fingerprint = {.name = name, .values = {}};
        std::copy_n(taken.values.begin(), std::min(taken.values.size(), fingerprint.values.size()),
                    fingerprint.values.begin());
        return fingerprint;
    } catch (const audio::FileError&) {
        return {};
    }
}

std::vector<uint64_t> codes_of(const kzcat_trail& trail)
{
    kzcat_trail_facts facts;
    check(kzcat_trail_get_facts(&trail, &facts));
    std::vector<uint64_t> codes(facts.code_count);
    uint64_t count = 0;
    check(kzcat_trail_get_codes(&trail, codes.data(), codes.size(), &count));
    return codes;
}

report::Trails laid_trails(const kzcat_trail& first, const std::string& first_name,
                           const kzcat_trail& second, const std::string& second_name,
                           const kzcat_alignment& alignment)
{
    report::Trails trails = {.clip_name = second_name,
                             .track_name = first_name,
                             .clip = codes_of(second),
                             .track = codes_of(first),
                             .clip_at = alignment.lag,
                             .matched = {},
                             .needed = {}};
    if (alignment.found != 0) {
        trails.matched = {.begin = alignment.begin, .end = alignment.end};
    }
    return trails;
}

} // namespace kzfp
