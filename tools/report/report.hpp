/// @file
/// Pages that show why a result is what it is: records in, one self-contained HTML page out.
///
/// A page needs no network and no script, follows the reader's light or dark theme, fits a narrow
/// window and prints. Texts in the records may hold any bytes: what is not UTF-8 is shown with
/// replacement characters. All pages are well-formed XML too.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace report {

/// A number or word that is worth a tile of its own.
struct Fact {
    std::string name = {};  ///< such as "place"
    std::string value = {}; ///< such as "0:11.0"
};

/// What stands at the top and bottom of every page.
struct Heading {
    std::string title = {};       ///< such as "clip.mp3 and song.flac"
    std::string subtitle = {};    ///< the result in a sentence; may be empty
    std::string program = {};     ///< such as "kzfp 1.0.0"
    std::string made = {};        ///< when the page was made, as text; may be empty
    std::vector<Fact> facts = {}; ///< shown as tiles; may be empty
};

struct Column {
    std::string name = {};
    bool number = false; ///< set to the right
};

struct Table {
    std::string title = {};
    std::vector<Column> columns = {};
    std::vector<std::vector<std::string>> rows = {}; ///< each with a cell for every column
};

/// A stretch of time.
struct Stretch {
    double begin = 0; ///< seconds
    double end = 0;   ///< seconds
};

/// Sound for a spectrogram. An hour takes no longer to draw than a minute.
struct Sound {
    std::string name = {};
    std::vector<float> samples = {};     ///< one channel, full scale is 1
    uint32_t rate = 0;                   ///< hertz
    double begin = 0;                    ///< seconds of the file at which the samples begin
    std::optional<Stretch> matched = {}; ///< marked; seconds of the file
};

inline constexpr size_t kValueCount = 30;

/// The values of a fingerprint: 15 means, then 15 spreads.
struct Fingerprint {
    std::string name = {};
    std::array<int32_t, kValueCount> values = {};
};

/// The codes of a clip laid against those of a track: code i of the clip belongs to code
/// `clip_at + i` of the track. A clip that runs at another speed has been read at the track's.
struct Trails {
    std::string clip_name = {};
    std::string track_name = {};
    std::vector<uint64_t> clip = {};
    std::vector<uint64_t> track = {};
    int64_t clip_at = 0;                  ///< negative when the clip begins before the track
    double code_seconds = 2048.0 / 11025; ///< of the track
    double clip_begin = 0;                ///< seconds of the clip at its first code
    double clip_speed = 1;                ///< seconds of the track in one of the clip
    std::optional<Stretch> matched = {};  ///< seconds of the clip
    std::optional<double> needed = {};    ///< no clip with a larger share of wrong bits could match
};

/// The largest share of wrong bits with which a clip of so many codes could reach a score, a
/// quarter of whose bits is not compared: (1 - score / sqrt(48 codes)) / 2.
double highest_error_rate(double score, size_t codes);

/// Two or more files beside each other.
struct ComparePage {
    Heading heading = {};
    std::vector<Table> tables = {}; ///< such as the verdict of each pair
    std::vector<Sound> sounds = {};
    std::vector<Fingerprint> fingerprints = {}; ///< each is drawn over the first one
    std::vector<Trails> trails = {};            ///< one for each pair that has sound in common
    std::vector<std::string> notes = {};        ///< such as what could not be drawn, and why
};

/// What ran for a while on a stream.
struct Run {
    enum class Kind {
        track,
        unknown,     ///< sound that no track has
        silence,     ///< nothing to hear
        interruption ///< no samples came, or what came could not be read
    };
    Stretch time = {}; ///< since the beginning of the stream
    Kind kind = Kind::track;
    std::string name = {};    ///< of a track
    std::string details = {}; ///< such as its score and place; may be empty
    uint32_t nth = 1;         ///< 2 when the track runs for the second time
};

/// A clip that was looked up.
struct MatchedClip {
    std::string name = {};
    std::string verdict = {};       ///< "match", "no match", "not sure", "too quiet" or "error"
    std::string sentence = {};      ///< the answer in words, or the error
    std::vector<Fact> facts = {};   ///< such as the score and the place
    std::vector<Sound> sounds = {}; ///< the clip, and the passage of the track when it is at hand
    std::vector<Fingerprint> fingerprints = {};
    std::vector<Trails> trails = {};     ///< one for each track that was found
    std::optional<Table> tracks = {};    ///< matches or candidates
    Stretch time = {};                   ///< of the clip, when it has runs
    std::vector<Run> runs = {};          ///< what ran in a clip of several tracks
    std::vector<std::string> notes = {}; ///< such as what could not be drawn, and why
};

struct MatchPage {
    Heading heading = {};
    std::vector<Table> tables = {}; ///< such as all clips
    std::vector<MatchedClip> clips = {};
};

struct MonitorPage {
    Heading heading = {};
    Stretch time = {};          ///< since the beginning of the stream
    std::vector<Run> runs = {}; ///< in the order of time
    std::vector<Table> tables = {};
};

/// How clips that were degraded in one way were recognised.
struct Kind {
    std::string name = {};                   ///< such as "mp3_64"
    std::string description = {};            ///< such as "MP3 of 64 kbit/s"; may be empty
    uint64_t clips = 0;                      ///< of tracks that are in the catalogue
    uint64_t right = 0;                      ///< of these, the right track was reported
    uint64_t wrong = 0;                      ///< of these, another track was reported
    uint64_t strangers = 0;                  ///< clips of tracks that are not in the catalogue
    uint64_t false_matches = 0;              ///< of these, some track was reported
    std::optional<double> place_median = {}; ///< seconds between the reported and the true place
    std::optional<double> place_p95 = {};    ///< what 95 % stay below
    std::optional<double> milliseconds = {}; ///< a look-up, in the median
    std::string series = {};             ///< kinds with the same one make a curve; empty for none
    std::optional<double> strength = {}; ///< where on the curve's axis
    std::string unit = {};               ///< of the strength, such as "dB"
};

struct EvaluationPage {
    Heading heading = {};
    std::vector<Kind> kinds = {};
    std::vector<std::string> notes = {}; ///< such as what could not be made, and why
    std::vector<Table> tables = {};
};

std::string to_html(const ComparePage& page);
std::string to_html(const MatchPage& page);
std::string to_html(const MonitorPage& page);
std::string to_html(const EvaluationPage& page);

/// A clip's part of a page: many clips need not be held at once.
std::string to_html(const MatchedClip& clip);

/// The page around such parts, whatever `page.clips` has.
std::string to_html(const MatchPage& page, const std::string& clips);

/// One drawing by itself, as an SVG file for documents: it holds its colours for both themes.
std::string to_svg(const Trails& trails);

} // namespace report
