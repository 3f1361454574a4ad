// Times are seconds of the clip, which begins at the section that was asked for, until a page
// shows them: there they are seconds of the file.

#include "kzfp/pages/match_pictures.hpp"

#include <algorithm>
#include <functional>

#include "kzfp/catalogue/files.hpp"
#include "kzfp/pages/laid_codes.hpp"

namespace kzfp {

namespace {

constexpr size_t kMostTracks = 12;   ///< of a clip, that are laid against it
constexpr double kAround = 5;        ///< seconds before and behind a passage of a long clip
constexpr double kValueSeconds = 60; ///< enough for 30 values and some silence before them

/// What cannot be done is said on the page.
void noting(report::MatchedClip& clip, const std::string& what, const std::function<void()>& work)
{
    try {
        work();
    } catch (const audio::FileError& error) {
        clip.notes.push_back(what + " cannot be shown: it " + error.what() + ".");
    } catch (const CatalogueError& error) {
        clip.notes.push_back(what + " cannot be shown: " + error.what() + ".");
    }
}

/// The part of a clip that a picture of one of its tracks shows: all of a short clip.
report::Stretch part_for(const FoundTrack& found, const Answer& answer)
{
    if (answer.matches.size() < 2 && answer.seconds <= kDrawnSeconds) {
        return {.begin = 0, .end = kDrawnSeconds};
    }
    const double begin = std::max(0.0, found.clip_begin - kAround);
    return {.begin = begin, .end = std::min(found.clip_end + kAround, begin + kDrawnSeconds)};
}

/// That part's sound, in seconds of the clip.
report::Sound sound_of(const ClipInput& input, const SoundOptions& options,
                       const report::Stretch& part)
{
    report::Sound sound = drawn_sound(name_of(input), input.path,
                                      part_of(options, part.begin, part.end - part.begin));
    sound.begin = part.begin;
    return sound;
}

double seconds_of(const report::Sound& sound)
{
    return static_cast<double>(sound.samples.size()) / std::max(1U, sound.rate);
}

report::Trails trails_for(const report::Sound& sound, const ClipInput& input,
                          std::vector<uint64_t> track, const FoundTrack& found)
{
    if (input.kind != ClipKind::trail) {
        return lay_sound(sound, std::move(track), found);
    }
    const std::string bytes = contents_of(input.path, size_t{1} << 30);
    const auto trail = made<Trail>(kzcat_trail_read, bytes.data(), uint64_t{bytes.size()});
    report::Trails trails = lay_codes(codes_of(*trail), std::move(track), found);
    trails.clip_name = name_of(input);
    return trails;
}

/// Seconds of the file instead of the clip.
void move(report::Trails& trails, double start)
{
    trails.clip_begin += start;
    if (trails.matched) {
        trails.matched->begin += start;
        trails.matched->end += start;
    }
}

class Pictures {
public:
    Pictures(report::MatchedClip& clip, const Answer& answer, const ClipInput& input,
             const SoundOptions& options, kzcat_catalogue& catalogue)
        : clip_(clip), answer_(answer), input_(input), options_(options), catalogue_(catalogue)
    {
    }

    /// The clip on a track, and both their sounds when it is the only one.
    void add(const FoundTrack& found)
    {
        const report::Stretch part = part_for(found, answer_);
        report::Sound sound;
        if (input_.kind == ClipKind::sound) {
            noting(clip_, name_of(input_), [&] { sound = sound_of(input_, options_, part); });
        }
        noting(clip_, name_text(found), [&] { lay(sound, found); });
        if (answer_.matches.size() < 2 && input_.kind == ClipKind::sound) {
            const double seconds = seconds_of(sound);
            add_clip_sound(std::move(sound), &found);
            add_track_sound(found, part, seconds);
        }
    }

    /// The clip by itself.
    void add_clip()
    {
        noting(clip_, name_of(input_), [&] {
            add_clip_sound(sound_of(input_, options_, {.begin = 0, .end = kDrawnSeconds}), nullptr);
        });
    }

private:
    void lay(const report::Sound& sound, const FoundTrack& found)
    {
        const auto trail =
            made<Trail>(kzcat_get_trail, &catalogue_, static_cast<int64_t>(found.track));
        report::Trails trails = trails_for(sound, input_, codes_of(*trail), found);
        move(trails, options_.section.start);
        clip_.trails.push_back(std::move(trails));
    }

    void add_clip_sound(report::Sound sound, const FoundTrack* found)
    {
        if (sound.samples.empty()) {
            return;
        }
        const double start = options_.section.start;
        sound.begin += start;
        if (found != nullptr) {
            sound.matched = {.begin = start + found->clip_begin, .end = start + found->clip_end};
        }
        clip_.sounds.push_back(std::move(sound));
        const double begin = found == nullptr ? 0 : begin_of_values(*found);
        add_values(name_of(input_), input_.path, part_of(options_, begin, kValueSeconds));
    }

    /// Two that begin alike are compared: with the passage, where the clip begins with other sound.
    static double begin_of_values(const FoundTrack& found)
    {
        return found.clip_begin < 1 ? 0 : found.clip_begin;
    }

    /// The 30 values of what begins where a section does. A file that is too short has none.
    void add_values(const std::string& name, const std::string& path, const SoundOptions& options)
    {
        const double begin = options.section.start;
        const std::string place = begin == 0 ? "" : " from " + clock_text(begin);
        noting(clip_, name, [&] {
            if (const auto values = drawn_values(name + place, path, options)) {
                clip_.fingerprints.push_back(*values);
            }
        });
    }

    /// The passage of the track that the clip lies on, when its file is at hand.
    void add_track_sound(const FoundTrack& found, const report::Stretch& part, double seconds)
    {
        const std::string name = found.title.value_or(found.source);
        if (!can_be_drawn(found.source)) {
            clip_.notes.push_back("The sound of the track is not shown: " + found.source +
                                  " is not at hand.");
            return;
        }
        const double place = found.offset + part.begin * found.tempo;
        const SoundOptions passage = part_of(
            {}, std::max(0.0, place), std::max(0.0, seconds * found.tempo + std::min(0.0, place)));
        noting(clip_, name_text(found), [&] {
            report::Sound track = drawn_sound(name, found.source, passage);
            track.matched = {.begin = found.offset + found.clip_begin * found.tempo,
                             .end = found.offset + found.clip_end * found.tempo};
            clip_.sounds.push_back(std::move(track));
        });
        const double begin = found.offset + begin_of_values(found) * found.tempo;
        if (begin >= 0 && !clip_.fingerprints.empty()) {
            add_values(name, found.source, part_of({}, begin, kValueSeconds));
        }
    }

    report::MatchedClip& clip_;
    const Answer& answer_;
    const ClipInput& input_;
    const SoundOptions& options_;
    kzcat_catalogue& catalogue_;
};

/// What was found, or else what comes near.
std::vector<FoundTrack> tracks_of(const Answer& answer)
{
    if (answer.verdict == KZCAT_VERDICT_MATCH) {
        return answer.matches;
    }
    const bool near = answer.verdict == KZCAT_VERDICT_NOT_SURE && !answer.candidates.empty();
    return near ? std::vector{answer.candidates.front()} : std::vector<FoundTrack>();
}

/// What a line of values consists of.
void add_values(report::MatchedClip& clip, const ClipInput& input)
{
    if (input.kind != ClipKind::values) {
        return;
    }
    noting(clip, name_of(input), [&] {
        const std::vector<int16_t> values = values_in(input.values);
        report::Fingerprint fingerprint = {.name = name_of(input), .values = {}};
        std::copy_n(values.begin(), std::min(values.size(), fingerprint.values.size()),
                    fingerprint.values.begin());
        clip.fingerprints.push_back(fingerprint);
    });
}

} // namespace

void add_pictures(report::MatchedClip& clip, const Answer& answer, const ClipInput& input,
                  const SoundOptions& options, kzcat_catalogue& catalogue)
{
    add_values(clip, input);
    const bool has_codes = input.kind == ClipKind::sound || input.kind == ClipKind::trail;
    if (!has_codes) {
        return;
    }
    if (!can_be_drawn(input.path)) {
        clip.notes.emplace_back("There are no pictures: what comes through a pipe is read once.");
        return;
    }
    Pictures pictures(clip, answer, input, options, catalogue);
    const std::vector<FoundTrack> tracks = tracks_of(answer);
    for (size_t i = 0; i < std::min(tracks.size(), kMostTracks); ++i) {
        pictures.add(tracks[i]);
    }
    if (tracks.size() > kMostTracks) {
        clip.notes.push_back("The pictures are of the first " + std::to_string(kMostTracks) +
                             " tracks.");
    }
    if (tracks.empty() && input.kind == ClipKind::sound) {
        pictures.add_clip();
    }
}

} // namespace kzfp
