// Trails are made of all that the catalogue does not have, strangers too: they say how long a track
// is, and whether it has the very same codes as another.

#include "kzfp/evaluate/music.hpp"

#include <algorithm>
#include <filesystem>
#include <map>
#include <new>
#include <numeric>
#include <optional>
#include <string_view>
#include <utility>

#include "kzfp/catalogue/files.hpp"
#include "kzfp/catalogue/in_order.hpp"
#include "kzfp/catalogue/sound.hpp"
#include "kzfp/evaluate/random.hpp"
#include "kzfp/output/interruption.hpp"

namespace kzfp::evaluate {

namespace {

constexpr size_t kBatch = 64;    ///< tracks in one transaction
constexpr size_t kStrangers = 3; ///< one track in so many stays out of the catalogue

/// A file that was read, or why it was not.
struct ReadFile {
    MusicTrack track;
    Recording recording; ///< unless the catalogue has it already
    std::string complaint;
    bool failed = false;
};

double seconds_of(const Trail& trail)
{
    kzcat_trail_facts facts;
    check(kzcat_trail_get_facts(trail.get(), &facts));
    return static_cast<double>(facts.samples) / facts.sample_rate;
}

void read_sound(ReadFile& file)
{
    if (content_of_file(file.track.path) != Content::sound) {
        throw audio::FileError("is no sound file, from which clips could be cut");
    }
    file.recording = read_recording(file.track.path, {}, false);
    file.complaint = file.recording.warning;
    file.track.seconds = seconds_of(file.recording.trail);
}

/// Reads a file by a function and notes what went wrong.
template <class Read>
ReadFile attempt(const std::string& path, Read read)
{
    ReadFile file;
    file.track.path = path;
    try {
        if (!interrupted()) {
            read(file);
        }
        return file;
    } catch (const audio::FileError& error) {
        file.complaint = error.what();
    } catch (const CatalogueError& error) {
        file.complaint = error.what();
    } catch (const std::bad_alloc&) {
        file.complaint = "not enough memory";
    }
    file.failed = true;
    return file;
}

/// Two trails are taken for the same when the number and a hash of their codes agree.
using CodesKey = std::pair<size_t, size_t>;

CodesKey key_of(const Trail& trail)
{
    kzcat_trail_facts facts;
    check(kzcat_trail_get_facts(trail.get(), &facts));
    std::vector<uint64_t> codes(facts.code_count);
    uint64_t count = 0;
    check(kzcat_trail_get_codes(trail.get(), codes.data(), codes.size(), &count));
    // NOLINTNEXTLINE(cppcoreguidelines-pro-type-reinterpret-cast): bytes of the codes
    const std::string_view bytes(reinterpret_cast<const char*>(codes.data()),
                                 codes.size() * sizeof(uint64_t));
    return {codes.size(), std::hash<std::string_view>()(bytes)};
}

/// Collects files in their order.
class Collection {
public:
    /// False when the file has nothing new to offer.
    bool take(const ReadFile& file)
    {
        if (!file.complaint.empty()) {
            music_.complaints.push_back(file.track.path + ": " + file.complaint);
        }
        music_.failed += file.failed ? 1U : 0U;
        if (file.failed || file.track.seconds <= 0) {
            return false;
        }
        if (file.recording.trail) {
            const auto [place, is_new] =
                by_codes_.try_emplace(key_of(file.recording.trail), file.track.path);
            if (!is_new) {
                music_.identical.push_back({.one = place->second, .other = file.track.path});
                return false;
            }
        }
        music_.tracks.push_back(file.track);
        return true;
    }
    Music& music() { return music_; }

private:
    Music music_;
    std::map<CodesKey, std::string> by_codes_;
};

/// Adds trails in batches and notes the ids that they get.
class Adder {
public:
    Adder(kzcat_catalogue& catalogue, Music& music) : catalogue_(catalogue), music_(music) {}

    /// The track that was taken last.
    void add(Trail trail)
    {
        waiting_.emplace_back(music_.tracks.size() - 1, std::move(trail));
        if (waiting_.size() >= kBatch) {
            write();
        }
    }

    void write()
    {
        std::vector<kzcat_new_track> tracks;
        for (const auto& [place, trail] : waiting_) {
            tracks.push_back({.trail = trail.get(),
                              .source = {.uri = music_.tracks[place].path.c_str(),
                                         .size = -1,
                                         .mtime_ns = -1,
                                         .hash = nullptr},
                              .tags = nullptr,
                              .tag_count = 0});
        }
        std::vector<kzcat_added> added(tracks.size());
        check(kzcat_add(&catalogue_, tracks.data(), tracks.size(), added.data()));
        for (size_t i = 0; i < added.size(); ++i) {
            music_.tracks[waiting_[i].first].id = added[i].track;
        }
        waiting_.clear();
    }

private:
    kzcat_catalogue& catalogue_;
    Music& music_;
    std::vector<std::pair<size_t, Trail>> waiting_;
};

/// Which of the files stay out.
std::vector<bool> drawn_strangers(size_t count, uint64_t seed)
{
    std::vector<size_t> order(count);
    std::iota(order.begin(), order.end(), size_t{0});
    Random random(seed, "strangers");
    for (size_t i = count; i > 1; --i) {
        std::swap(order[i - 1], order[random.below(i)]);
    }
    std::vector<bool> strangers(count, false);
    for (size_t i = 0; i < count / kStrangers; ++i) {
        strangers[order[i]] = true;
    }
    return strangers;
}

kzcat_track_facts facts_of(const Track& track)
{
    kzcat_track_facts facts;
    check(kzcat_track_get_facts(track.get(), &facts));
    return facts;
}

Track find_track(kzcat_catalogue& catalogue, const std::string& path)
{
    auto track = found<Track>(kzcat_find_source, &catalogue, path.c_str());
    if (!track) {
        std::error_code error;
        const std::string full = std::filesystem::canonical(path, error).string();
        track = found<Track>(kzcat_find_source, &catalogue, full.c_str());
    }
    if (!track && state_of(path).size >= 0) {
        const FileHash hash = hash_of(path);
        track = found<Track>(kzcat_find_hash, &catalogue, hash.data());
    }
    return track;
}

} // namespace

size_t Music::known() const
{
    return static_cast<size_t>(std::ranges::count_if(tracks, &MusicTrack::is_known));
}

double Music::seconds() const
{
    return std::accumulate(tracks.begin(), tracks.end(), 0.0,
                           [](double sum, const MusicTrack& track) { return sum + track.seconds; });
}

Music make_catalogue(const std::vector<std::string>& files, const std::string& catalogue,
                     uint64_t seed, size_t jobs, const FileDone& done)
{
    const Catalogue opened = open_catalogue(catalogue, KZCAT_ACCESS_CREATE);
    const std::vector<bool> strangers = drawn_strangers(files.size(), seed);
    Collection collection;
    Adder adder(*opened, collection.music());
    in_order(
        files.size(), jobs, [&](size_t i) { return attempt(files[i], read_sound); },
        [&](size_t i, ReadFile file) {
            if (collection.take(file) && !strangers[i]) {
                adder.add(std::move(file.recording.trail));
            }
            done(i + 1, files[i]);
        });
    adder.write();
    return std::move(collection.music());
}

Music look_up_files(const std::vector<std::string>& files, const std::string& catalogue,
                    size_t jobs, const FileDone& done)
{
    const Catalogue opened = open_catalogue(catalogue, KZCAT_ACCESS_READ);
    Collection collection;
    const auto read = [&](ReadFile& file) {
        const Track track = find_track(*opened, file.track.path);
        if (!track) {
            read_sound(file);
            return;
        }
        const kzcat_track_facts facts = facts_of(track);
        file.track.id = facts.track;
        file.track.seconds = static_cast<double>(facts.samples) / facts.sample_rate;
    };
    in_order(
        files.size(), jobs, [&](size_t i) { return attempt(files[i], read); },
        [&](size_t i, const ReadFile& file) {
            collection.take(file);
            done(i + 1, files[i]);
        });
    return std::move(collection.music());
}

} // namespace kzfp::evaluate
