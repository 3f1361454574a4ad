#include "kzfp/duplicates/material.hpp"

#include <algorithm>
#include <new>
#include <utility>

#include "kzfp/catalogue/in_order.hpp"
#include "kzfp/catalogue/sound.hpp"
#include "kzfp/catalogue/tracks.hpp"
#include "kzfp/output/interruption.hpp"
#include "kzfp/output/progress.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

std::vector<HeldFile> files_of(const Track& track)
{
    std::vector<HeldFile> files;
    for (const kzcat_source& source : sources_of(track)) {
        HeldFile file = {.path = source.uri, .size = source.size, .hash = {}};
        if (source.hash != nullptr) {
            file.hash.emplace();
            std::copy_n(source.hash, file.hash->size(), file.hash->begin());
        }
        files.push_back(std::move(file));
    }
    return files;
}

double sounding_seconds(const kzcat_trail& trail, const kzcat_track_facts& facts)
{
    std::vector<uint64_t> codes(static_cast<size_t>(facts.code_count));
    uint64_t count = 0;
    check(kzcat_trail_get_codes(&trail, codes.data(), codes.size(), &count));
    const auto silent = std::ranges::count(codes, uint64_t{0});
    const double share = 1 - static_cast<double>(silent) / static_cast<double>(codes.size());
    return share * static_cast<double>(facts.samples) / facts.sample_rate;
}

HeldRecording recording_of(kzcat_catalogue& catalogue, const Track& track)
{
    const kzcat_track_facts facts = facts_of(track);
    HeldRecording recording;
    recording.track = facts.track;
    recording.codes = facts.code_count;
    recording.seconds = static_cast<double>(facts.samples) / facts.sample_rate;
    recording.files = files_of(track);
    recording.trail = made<Trail>(kzcat_get_trail, &catalogue, facts.track);
    recording.sounding = sounding_seconds(*recording.trail, facts);
    return recording;
}

/// A file that was read, or why it could not be.
struct ReadFile {
    FileState state;
    std::optional<FileHash> hash;
    Recording recording;
    std::string trouble;
};

ReadFile read_file(const ListedFile& file, const SoundOptions& sound)
{
    ReadFile read;
    read.trouble = file.trouble;
    if (!read.trouble.empty() || interrupted()) {
        return read;
    }
    try {
        if (file.path == "-") {
            throw audio::FileError("standard input is one recording; name files or folders");
        }
        read.state = state_of(file.path);
        if (read.state.size >= 0) {
            read.hash = hash_of(file.path);
        }
        read.recording = read_recording(file.path, sound, false);
    } catch (const audio::FileError& error) {
        read.trouble = error.what();
    } catch (const CatalogueError& error) {
        read.trouble = error.what();
    } catch (const std::bad_alloc&) {
        read.trouble = "not enough memory";
    }
    return read;
}

double seconds_of(const kzcat_trail& trail)
{
    kzcat_trail_facts facts;
    check(kzcat_trail_get_facts(&trail, &facts));
    return static_cast<double>(facts.samples) / facts.sample_rate;
}

void add(kzcat_catalogue& catalogue, const std::string& path, const ReadFile& read)
{
    const kzcat_new_track track = {.trail = read.recording.trail.get(),
                                   .source = {.uri = path.c_str(),
                                              .size = read.state.size,
                                              .mtime_ns = read.state.mtime_ns,
                                              .hash = read.hash ? read.hash->data() : nullptr},
                                   .tags = nullptr,
                                   .tag_count = 0};
    check(kzcat_add(&catalogue, &track, 1, nullptr));
}

} // namespace

std::vector<HeldRecording> recordings_of(kzcat_catalogue& catalogue, const Complain& complain)
{
    std::vector<HeldRecording> recordings;
    visit_tracks(catalogue, 0, [&](const Track& track) {
        try {
            recordings.push_back(recording_of(catalogue, track));
        } catch (const CatalogueError& error) {
            if (error.status != KZCAT_ERROR_DAMAGED) {
                throw;
            }
            complain("track " + std::to_string(facts_of(track).track), error.what());
        }
        return !interrupted();
    });
    return recordings;
}

Catalogue catalogue_of_files(const std::vector<std::string>& named, const SoundOptions& sound,
                             size_t jobs, ProgressMode mode, const Complain& complain)
{
    auto catalogue =
        made<Catalogue>(kzcat_open, static_cast<const char*>(nullptr),
                        uint32_t{KZCAT_ACCESS_CREATE}, static_cast<const kzcat_settings*>(nullptr));
    const FileList list = list_files(named);
    Progress progress(list.files.size(), mode);
    in_order(
        list.files.size(), jobs, [&](size_t i) { return read_file(list.files[i], sound); },
        [&](size_t i, const ReadFile& read) {
            const std::string& path = list.files[i].path;
            if (!read.trouble.empty() && !interrupted()) {
                progress.clear();
                complain(path, read.trouble);
            } else if (!read.recording.warning.empty() && !interrupted()) {
                progress.clear();
                write_message(path + ": " + read.recording.warning);
            }
            if (read.recording.trail) {
                add(*catalogue, path, read);
                progress.show(i + 1, path, seconds_of(*read.recording.trail));
            }
        });
    return catalogue;
}

} // namespace kzfp
