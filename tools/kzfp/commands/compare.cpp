// `kzfp compare`: whether two files have sound in common, and how they lie to each other.

#include <cmath>
#include <string>
#include <utility>

#include "kzfp/catalogue/answer.hpp"
#include "kzfp/catalogue/files.hpp"
#include "kzfp/catalogue/sound.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription =
    "Compares two sound files: whether one is from the other, and where it begins there.";

constexpr const char* kFooter =
    "Exit: 0 the files were compared, whatever came of it; 1 a file could not "
    "be read; 2 wrong usage.";

struct CompareSettings {
    std::string first;
    std::string second;
    TextOrJson format = TextOrJson::text;
};

/// A file in both forms: as a track and as a clip.
struct Compared {
    std::string path;
    Recording recording;
    double seconds = 0;
};

/// An error in one file, with its name.
template <class Work>
auto naming(const std::string& path, Work work)
{
    try {
        return work();
    } catch (const audio::FileError& error) {
        throw audio::FileError(path + ": " + error.what());
    } catch (const CatalogueError& error) {
        throw audio::FileError(path + ": " + error.what());
    }
}

Compared read(const std::string& path)
{
    return naming(path, [&path] {
        if (path == "-" || state_of(path).size < 0) {
            throw audio::FileError(
                "is read twice, so it must be a file; write the sound to one first");
        }
        Compared compared = {.path = path, .recording = read_recording(path, {}, false)};
        kzcat_trail_facts facts;
        check(kzcat_trail_get_facts(compared.recording.trail.get(), &facts));
        compared.seconds = static_cast<double>(facts.samples) / facts.sample_rate;
        return compared;
    });
}

/// Looks the sound of `clip` up in a catalogue of `track` alone.
Answer look_up_in(const Compared& track, const Compared& clip)
{
    const auto catalogue =
        made<Catalogue>(kzcat_open, static_cast<const char*>(nullptr),
                        uint32_t{KZCAT_ACCESS_CREATE}, static_cast<const kzcat_settings*>(nullptr));
    const kzcat_new_track added = {
        .trail = track.recording.trail.get(),
        .source = {.uri = track.path.c_str(), .size = -1, .mtime_ns = -1, .hash = nullptr},
        .tags = nullptr,
        .tag_count = 0};
    check(kzcat_add(catalogue.get(), &added, 1, nullptr));
    const Clip sound = naming(clip.path, [&clip] { return read_clip(clip.path, {}); });
    return look_up(*catalogue, *sound.query, clip.path, {});
}

/// The same finding seen from the other file: its place and speed in the first one.
void turn_round(FoundTrack& found, const std::string& source)
{
    found.offset = -found.offset / found.tempo / found.speed;
    found.speed = 1 / found.speed;
    found.tempo = 1 / found.tempo;
    found.pitch = 1 / found.pitch;
    found.source = source;
}

std::string to_line(const Answer& answer, const Compared& first, const Compared& second)
{
    const std::string pair = first.path + " and " + second.path;
    if (answer.verdict == KZCAT_VERDICT_TOO_QUIET) {
        return pair + ": too quiet or too short to say anything";
    }
    if (answer.verdict != KZCAT_VERDICT_MATCH || answer.matches.empty()) {
        return pair + ": " + (answer.verdict == KZCAT_VERDICT_NOT_SURE ? "not sure" : "different");
    }
    const FoundTrack& found = answer.matches.front();
    const bool whole = std::fabs(found.offset) < 1 && std::fabs(first.seconds - second.seconds) < 2;
    char score[64];
    std::snprintf(score, sizeof score, ", score %.1f (%.1f needed)", found.score, found.threshold);
    if (whole) {
        return pair + ": the same recording" + change_text(found) + score;
    }
    return second.path + " begins at " + clock_text(found.offset) + " of " + first.path +
           change_text(found) + score;
}

void compare(const CompareSettings& settings)
{
    const Compared first = read(settings.first);
    const Compared second = read(settings.second);
    const bool turned = first.seconds < second.seconds;
    Answer answer = turned ? look_up_in(second, first) : look_up_in(first, second);
    if (turned) {
        answer.file = second.path;
        for (FoundTrack& found : answer.matches) {
            turn_round(found, first.path);
        }
    }
    for (const Compared* file : {&first, &second}) {
        if (!file->recording.warning.empty()) {
            write_message(file->path + ": " + file->recording.warning);
        }
    }
    write_output(settings.format == TextOrJson::json
                     ? to_json(answer, {})
                     : without_control_characters(to_line(answer, first, second)) + '\n');
}

} // namespace

ExitStatus run_compare(const Arguments& arguments)
{
    CLI::App parser(kDescription, program_name(arguments));
    parser.footer(kFooter);
    CompareSettings settings;
    parser.add_option("FIRST", settings.first, "A sound file")->required()->type_name("");
    parser.add_option("SECOND", settings.second, "Another one")->required()->type_name("");
    add_format_option(parser, settings.format);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    try {
        compare(settings);
        return all_done;
    } catch (const audio::FileError& error) {
        write_message(error.what());
    } catch (const CatalogueError& error) {
        write_message(settings.first + " and " + settings.second + ": " + error.what());
    }
    return some_file_failed;
}

} // namespace kzfp
