#include "kzfp/duplicates/finding.hpp"

#include <algorithm>
#include <iterator>
#include <map>
#include <optional>
#include <tuple>
#include <utility>

#include "kzfp/duplicates/decoded.hpp"
#include "kzfp/duplicates/search.hpp"

namespace kzfp {

namespace {

/// Seconds with sound; a recording with fewer is told apart by its bytes alone.
constexpr double kFewestSounding = 2;

/// A file with the number of its recording.
struct Member {
    size_t recording;
    FoundFile found;
};

Member member_of(const HeldRecording& recording, size_t number, const HeldFile& file,
                 const SoundOptions& sound)
{
    Member member = {.recording = number, .found = {}};
    member.found.track = recording.track;
    member.found.file = file;
    member.found.seconds = recording.seconds;
    member.found.quality = quality_of(file.path, sound);
    member.found.quality.sounding = recording.sounding;
    member.found.quality.silent = recording.seconds - recording.sounding;
    return member;
}

/// The best one first.
std::vector<Member> members_of(const std::vector<HeldRecording>& recordings,
                               const std::vector<size_t>& numbers, const SoundOptions& sound)
{
    std::vector<Member> members;
    for (const size_t number : numbers) {
        for (const HeldFile& file : recordings[number].files) {
            members.push_back(member_of(recordings[number], number, file, sound));
        }
    }
    std::vector<Quality*> qualities;
    for (Member& member : members) {
        qualities.push_back(&member.found.quality);
    }
    compare_among(qualities);
    std::ranges::stable_sort(members, [](const Member& one, const Member& other) {
        return is_better(one.found.quality, other.found.quality);
    });
    return members;
}

/// Whether two files with equal trails, which says little of volume and treble, decode to the same
/// samples.
bool have_same_sound(const FoundFile& one, const FoundFile& other, const SoundOptions& sound)
{
    const auto shape = [](const Quality& quality) {
        return std::tuple(quality.state, quality.rate, quality.channels);
    };
    if (shape(one.quality) != shape(other.quality) || one.quality.state != Quality::State::there ||
        one.quality.rate == 0) {
        return false;
    }
    try {
        return hash_of_sound(one.file.path, sound) == hash_of_sound(other.file.path, sound);
    } catch (const audio::FileError&) {
        return false;
    }
}

Kinship kinship_of(const Member& best, const Member& other, bool excerpt, const SoundOptions& sound)
{
    if (other.found.quality.is_same_file(best.found.quality)) {
        return Kinship::same_file;
    }
    if (best.found.file.hash && best.found.file.hash == other.found.file.hash) {
        return Kinship::identical_bytes;
    }
    if (excerpt) {
        return Kinship::excerpt;
    }
    return best.recording == other.recording && have_same_sound(best.found, other.found, sound)
               ? Kinship::identical_sound
               : Kinship::same_recording;
}

/// How a recording lies on the best one of its group.
void place(const std::vector<HeldRecording>& recordings, const Member& best, Member& other)
{
    if (best.recording == other.recording) {
        return;
    }
    const kzcat_alignment alignment =
        align(recordings[best.recording], recordings[other.recording]);
    other.found.offset = alignment.offset;
    other.found.error_rate = alignment.agreeing_rate;
}

void mark_copies(std::vector<FoundFile>& files)
{
    for (size_t i = 1; i < files.size(); ++i) {
        const auto is_original = [&copy = files[i]](const FoundFile& file) {
            return file.file.hash && file.file.hash == copy.file.hash &&
                   !file.quality.is_same_file(copy.quality);
        };
        const auto end = files.begin() + static_cast<std::ptrdiff_t>(i);
        const auto original = std::find_if(files.begin(), end, is_original);
        if (original != end) {
            files[i].copy_of = static_cast<size_t>(original - files.begin());
        }
    }
}

bool is_silent(const HeldRecording& recording) { return recording.sounding < kFewestSounding; }

/// The same trail once for each different content of its files.
std::vector<HeldRecording> divided_by_bytes(HeldRecording recording)
{
    std::map<std::optional<FileHash>, std::vector<HeldFile>> contents;
    for (HeldFile& file : recording.files) {
        contents[file.hash].push_back(std::move(file));
    }
    std::vector<HeldRecording> parts;
    for (auto& [hash, files] : contents) {
        HeldRecording part;
        part.track = recording.track;
        part.codes = recording.codes;
        part.seconds = recording.seconds;
        part.sounding = recording.sounding;
        part.trail =
            made<Trail>(kzcat_trail_cut, recording.trail.get(), uint64_t{0}, recording.codes);
        if (!hash) { // nothing tells that these are equal
            files.resize(1);
        }
        part.files = std::move(files);
        parts.push_back(std::move(part));
    }
    return parts;
}

} // namespace

const char* word_of(Kinship kinship)
{
    switch (kinship) {
    case Kinship::best:
        return "best";
    case Kinship::same_file:
        return "same file";
    case Kinship::identical_bytes:
        return "identical bytes";
    case Kinship::identical_sound:
        return "identical sound";
    case Kinship::same_recording:
        return "same recording";
    case Kinship::excerpt:
        break;
    }
    return "excerpt";
}

Finding finding_of(const std::vector<HeldRecording>& recordings, const Group& group,
                   const SoundOptions& sound)
{
    std::vector<Member> whole = members_of(recordings, group.whole, sound);
    std::vector<Member> excerpts = members_of(recordings, group.excerpts, sound);
    const Member& best = whole.front();
    const auto relate = [&](Member& member, bool excerpt) {
        member.found.kinship = kinship_of(best, member, excerpt, sound);
        place(recordings, best, member);
    };
    std::for_each(whole.begin() + 1, whole.end(), [&](Member& other) { relate(other, false); });
    std::ranges::for_each(excerpts, [&](Member& other) { relate(other, true); });
    std::ranges::stable_sort(whole, {}, [](const Member& one) { return one.found.kinship; });
    Finding finding;
    for (std::vector<Member>* const members : {&whole, &excerpts}) {
        for (Member& member : *members) {
            finding.files.push_back(std::move(member.found));
        }
    }
    mark_copies(finding.files);
    return finding;
}

std::vector<Group> groups_of(std::vector<HeldRecording>& recordings, const std::vector<Link>& links)
{
    std::vector<Group> groups = group_recordings(recordings.size(), links);
    std::erase_if(groups, [&](const Group& group) {
        return group.excerpts.empty() && group.whole.size() == 1 &&
               (recordings[group.whole.front()].files.size() < 2 ||
                is_silent(recordings[group.whole.front()]));
    });
    const size_t count = recordings.size();
    for (size_t i = 0; i < count; ++i) {
        if (recordings[i].files.size() < 2 || !is_silent(recordings[i])) {
            continue;
        }
        for (HeldRecording& part : divided_by_bytes(std::move(recordings[i]))) {
            if (part.files.size() > 1) {
                groups.push_back({.whole = {recordings.size()}, .excerpts = {}});
                recordings.push_back(std::move(part));
            }
        }
    }
    return groups;
}

} // namespace kzfp
