// Tracks are added in batches, each of which is on disk as a whole or not at all. A line that
// cannot be used is left out and reported; the others are added.

#include "kzfp/exchange/importer.hpp"

#include "audio/source.hpp"
#include "kzfp/exchange/line_reader.hpp"
#include "kzfp/output/interruption.hpp"

namespace kzfp {

namespace {

constexpr size_t kBatch = 64; ///< tracks in one transaction

/// The library's records of tracks, which point into what they were made from.
struct Records {
    std::vector<std::vector<kzcat_source>> sources;
    std::vector<std::vector<kzcat_tag>> tags;
    std::vector<kzcat_stored_track> tracks;

    void append(const ExportedTrack& track)
    {
        sources.emplace_back();
        for (const ExportedSource& source : track.sources) {
            sources.back().push_back(
                {.uri = source.path.c_str(),
                 .size = source.size,
                 .mtime_ns = source.mtime_ns,
                 .hash = source.hash.empty()
                             ? nullptr
                             : reinterpret_cast<const uint8_t*>(source.hash.data())});
        }
        tags.emplace_back();
        for (const ExportedTag& tag : track.tags) {
            tags.back().push_back({.name = tag.name.c_str(), .value = tag.value.c_str()});
        }
        // The arrays of a list stay where they are when the list of lists grows.
        tracks.push_back({.trail = track.trail.get(),
                          .sources = sources.back().data(),
                          .source_count = sources.back().size(),
                          .tags = tags.back().data(),
                          .tag_count = tags.back().size(),
                          .added = track.added,
                          .reserved = {}});
    }
};

} // namespace

void Importer::import(const std::string& path)
{
    try {
        read_lines(path);
    } catch (const audio::FileError&) {
        write(); // what came before is kept, wherever the file fails
        throw;
    }
    imported_.interrupted = interrupted();
    write();
    if (imported_.interrupted) {
        return;
    }
    if (begin_ == 0) {
        throw audio::FileError("is empty; export the catalogue again");
    }
    if (!ended_) {
        miss(0, "it ends without its last line, so it was cut off; what it has was imported");
    }
}

void Importer::read_lines(const std::string& path)
{
    LineReader reader(path);
    std::string text;
    // Without its rest, a line that was being read says nothing.
    while (!interrupted() && reader.next(text) && !interrupted()) {
        read(reader.number(), text);
    }
}

void Importer::read(uint64_t line, const std::string& text)
{
    try {
        std::visit(
            [this, line](auto&& content) { take(line, std::forward<decltype(content)>(content)); },
            read_line(text));
    } catch (const LineError& error) {
        if (begin_ == 0) { // in a file that is no export, every line would be refused
            throw audio::FileError(std::string("cannot be imported, as its first line shows: ") +
                                   error.what());
        }
        refuse(line, error.what());
    }
    show_(line - begin_, expected_);
}

/// Exports may follow one another.
void Importer::take(uint64_t line, const ExportBegin& begin)
{
    if (begin_ != 0 && !ended_) {
        miss(line, "the export before it has no last line, so it was cut off; what it has was "
                   "imported");
    }
    begin_ = line;
    expected_ = begin.tracks;
    ended_ = false;
}

void Importer::take(uint64_t line, ExportedTrack track)
{
    if (begin_ == 0) {
        throw LineError("it is a track, but an export begins with a line about itself; export it "
                        "again");
    }
    waiting_.push_back({line, std::move(track)});
    if (waiting_.size() >= kBatch) {
        write();
    }
}

void Importer::take(uint64_t line, const ExportEnd& end)
{
    if (begin_ == 0) {
        throw LineError("it is the last one of an export; export it again");
    }
    ended_ = true;
    const uint64_t lines = line - begin_ - 1;
    if (lines != end.tracks) {
        miss(line, std::to_string(end.tracks) + " tracks were exported, but there are " +
                       std::to_string(lines) + " lines before it; what is there was imported");
    }
}

void Importer::write()
{
    if (!write_together(waiting_)) {
        for (const Numbered& one : waiting_) {
            write_together(std::span(&one, 1));
        }
    }
    waiting_.clear();
}

/// All of them or none; false when none because of one that cannot be kept, which is then refused
/// if it is the only one.
bool Importer::write_together(std::span<const Numbered> tracks)
{
    Records records;
    for (const Numbered& one : tracks) {
        records.append(one.track);
    }
    std::vector<kzcat_added> added(tracks.size());
    const kzcat_status status =
        kzcat_import(&catalogue_, records.tracks.data(), records.tracks.size(), added.data());
    if (status == KZCAT_ERROR_INVALID_ARGUMENT || status == KZCAT_ERROR_OTHER_PROFILE) {
        if (tracks.size() == 1) {
            refuse(tracks.front().line, kzcat_get_error_text());
        }
        return false;
    }
    check(status);
    for (const kzcat_added& one : added) {
        ++(one.is_new != 0 ? imported_.tracks_new : imported_.tracks_known);
    }
    return true;
}

void Importer::refuse(uint64_t line, const std::string& reason)
{
    ++imported_.refused;
    report_(line, reason);
}

void Importer::miss(uint64_t line, const std::string& what)
{
    imported_.whole = false;
    report_(line, what);
}

} // namespace kzfp
