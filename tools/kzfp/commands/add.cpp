// `kzfp add`: sound files into a catalogue. Files are read by several threads; what they give is
// written by one, in the order of the files, so that the ids do not depend on the threads.

#include <array>
#include <chrono>
#include <cstdint>
#include <new>
#include <optional>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include <nlohmann/json.hpp>

#include "kzfp/catalogue/files.hpp"
#include "kzfp/catalogue/in_order.hpp"
#include "kzfp/catalogue/sound.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/output/progress.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription =
    "Adds sound files to CATALOGUE, which is made when there is none. Of a folder, the sound "
    "files\n"
    "below it are added. A file that has not changed since it was added is passed over, so an\n"
    "interrupted run is simply repeated; one that was only moved is not read again as sound.";

constexpr const char* kFooter =
    "Exit: 0 all files are in the catalogue; 1 a file could not be read as a whole (one line each\n"
    "      on standard error), the others are there; 2 wrong usage.";

constexpr size_t kBatch = 64; ///< tracks in one transaction
constexpr auto kLongestWait = std::chrono::seconds(2);

struct AddSettings {
    std::string catalogue;
    std::vector<std::string> files;
    TextOrJson format = TextOrJson::text;
    bool documents = false;
    size_t jobs = 1;
};

/// What became of a file.
enum class Outcome { added, known, moved, unchanged, failed };

constexpr std::array<const char*, 5> kOutcomes = {"added", "known", "moved", "unchanged", "error"};

/// A file on its way into the catalogue.
struct Arrival {
    std::string path;
    Outcome outcome = Outcome::failed;
    std::string trouble; ///< why it failed, or what was wrong although it did not
    int64_t track = 0;
    FileState state;
    std::optional<FileHash> hash;
    Recording recording; ///< of one that is to be added
};

kzcat_source source_of(const Arrival& arrival)
{
    return {.uri = arrival.path.c_str(),
            .size = arrival.state.size,
            .mtime_ns = arrival.state.mtime_ns,
            .hash = arrival.hash ? arrival.hash->data() : nullptr};
}

kzcat_track_facts facts_of(const Track& track)
{
    kzcat_track_facts facts;
    check(kzcat_track_get_facts(track.get(), &facts));
    return facts;
}

std::vector<kzcat_source> sources_of(const Track& track)
{
    std::vector<kzcat_source> sources(facts_of(track).source_count);
    for (uint32_t i = 0; i < sources.size(); ++i) {
        check(kzcat_track_get_source(track.get(), i, &sources[i]));
    }
    return sources;
}

/// Reads files in any thread, as far as the catalogue does not have them.
class Reader {
public:
    Reader(kzcat_catalogue& catalogue, const AddSettings& settings)
        : catalogue_(catalogue), settings_(settings)
    {
    }

    Arrival read(const ListedFile& file) const
    {
        Arrival arrival;
        arrival.path = file.path;
        arrival.trouble = file.trouble;
        if (!file.trouble.empty()) {
            return arrival;
        }
        try {
            look_at(arrival);
        } catch (const audio::FileError& error) {
            arrival.trouble = error.what();
        } catch (const CatalogueError& error) {
            arrival.trouble = error.what();
        } catch (const std::bad_alloc&) {
            arrival.trouble = "not enough memory";
        }
        return arrival;
    }

private:
    void look_at(Arrival& arrival) const
    {
        if (arrival.path == "-") {
            throw audio::FileError("has no name by which the track could be found again; write it "
                                   "to a file, and add that");
        }
        check_is_not_of(settings_.catalogue, arrival.path);
        arrival.state = state_of(arrival.path);
        if (arrival.state.size >= 0) {
            if (is_unchanged(arrival)) {
                arrival.outcome = Outcome::unchanged;
                return;
            }
            arrival.hash = hash_of(arrival.path);
            if (is_known_by_hash(arrival)) {
                arrival.outcome = Outcome::moved;
                return;
            }
        }
        arrival.recording = read_recording(arrival.path, {}, settings_.documents);
        arrival.trouble = arrival.recording.warning;
        arrival.outcome = Outcome::added;
    }

    bool serves(const Track& track) const
    {
        return !settings_.documents || facts_of(track).answers_documents != 0;
    }

    bool is_unchanged(Arrival& arrival) const
    {
        const auto track = found<Track>(kzcat_find_source, &catalogue_, arrival.path.c_str());
        if (!track || !serves(track)) {
            return false;
        }
        for (const kzcat_source& source : sources_of(track)) {
            if (source.uri == arrival.path && source.size == arrival.state.size &&
                source.mtime_ns == arrival.state.mtime_ns) {
                arrival.track = facts_of(track).track;
                return true;
            }
        }
        return false;
    }

    bool is_known_by_hash(Arrival& arrival) const
    {
        const auto track = found<Track>(kzcat_find_hash, &catalogue_,
                                        static_cast<const uint8_t*>(arrival.hash->data()));
        if (!track || !serves(track)) {
            return false;
        }
        arrival.track = facts_of(track).track;
        return true;
    }

    kzcat_catalogue& catalogue_;
    const AddSettings& settings_;
};

std::string to_json(const Arrival& arrival)
{
    nlohmann::ordered_json object = nlohmann::ordered_json::object_t();
    object["file"] = arrival.path;
    object["outcome"] = kOutcomes.at(static_cast<size_t>(arrival.outcome));
    object["track"] = nullptr;
    if (arrival.track != 0) {
        object["track"] = arrival.track;
    }
    if (arrival.outcome == Outcome::failed) {
        object["error"] = arrival.trouble;
    }
    return object.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace) + '\n';
}

/// Puts what was read into the catalogue and reports each file once it is on disk.
class Writer {
public:
    Writer(kzcat_catalogue& catalogue, const AddSettings& settings, const Reader& reader,
           size_t files)
        : catalogue_(catalogue), settings_(settings), reader_(reader), progress_(files)
    {
    }

    void take(Arrival arrival)
    {
        progress_.show(++taken_, arrival.path);
        waiting_.push_back(std::move(arrival));
        if (waiting_.size() >= kBatch ||
            std::chrono::steady_clock::now() - last_write_ >= kLongestWait) {
            write();
        }
    }

    void write()
    {
        move_sources(); // before other sound takes their places, and their tracks with the last one
        add_tracks();
        for (const Arrival& arrival : waiting_) {
            report(arrival);
        }
        waiting_.clear();
        last_write_ = std::chrono::steady_clock::now();
    }

    bool all_well() const { return !trouble_; }

    /// "12 added, 1 known, ..."
    std::string summary(uint64_t passed_over) const
    {
        std::string text;
        for (size_t i = 0; i < counts_.size(); ++i) {
            const char* const word =
                i == static_cast<size_t>(Outcome::failed) ? "failed" : kOutcomes.at(i);
            if (counts_.at(i) != 0) {
                text += (text.empty() ? "" : ", ") + std::to_string(counts_.at(i)) + " " + word;
            }
        }
        text = text.empty() ? "nothing to add" : text;
        if (passed_over != 0) {
            text += "; " + std::to_string(passed_over) +
                    (passed_over == 1 ? " file that is" : " files that are") +
                    " no sound passed over";
        }
        return text;
    }

private:
    void add_tracks()
    {
        std::vector<Arrival*> arrivals;
        for (Arrival& arrival : waiting_) {
            if (arrival.outcome == Outcome::added) {
                arrivals.push_back(&arrival);
            }
        }
        if (!add_together(arrivals)) {
            for (Arrival* const arrival : arrivals) {
                add_together(std::span(&arrival, 1));
            }
        }
    }

    /// All of them or none; false when none because of one that cannot be kept, which is then
    /// reported as failed if it is the only one.
    bool add_together(std::span<Arrival* const> arrivals)
    {
        try {
            add(arrivals);
            return true;
        } catch (const CatalogueError& error) {
            if (error.status != KZCAT_ERROR_INVALID_ARGUMENT &&
                error.status != KZCAT_ERROR_OTHER_PROFILE) {
                throw;
            }
            if (arrivals.size() == 1) {
                arrivals.front()->outcome = Outcome::failed;
                arrivals.front()->trouble = error.what();
            }
            return false;
        }
    }

    void add(std::span<Arrival* const> arrivals)
    {
        std::vector<std::vector<kzcat_tag>> tags(arrivals.size());
        std::vector<kzcat_new_track> tracks;
        for (size_t i = 0; i < arrivals.size(); ++i) {
            for (const audio::Tag& tag : arrivals[i]->recording.tags) {
                tags[i].push_back({.name = tag.name.c_str(), .value = tag.value.c_str()});
            }
            tracks.push_back({.trail = arrivals[i]->recording.trail.get(),
                              .source = source_of(*arrivals[i]),
                              .tags = tags[i].data(),
                              .tag_count = tags[i].size()});
        }
        std::vector<kzcat_added> added(tracks.size());
        check(kzcat_add(&catalogue_, tracks.data(), tracks.size(), added.data()));
        for (size_t i = 0; i < arrivals.size(); ++i) {
            arrivals[i]->track = added[i].track;
            arrivals[i]->outcome = added[i].is_new != 0 ? Outcome::added : Outcome::known;
        }
    }

    /// A track can have gone since its file was read, for example when two files have taken each
    /// other's names. That file is then read again.
    void move_sources()
    {
        for (Arrival& arrival : waiting_) {
            while (arrival.outcome == Outcome::moved && !move_source(arrival)) {
                arrival = reader_.read({.path = arrival.path, .trouble = {}});
            }
        }
    }

    /// The same bytes at another path; false when their track is gone. Where they were before is
    /// forgotten when it is certain that nothing is there any more.
    bool move_source(const Arrival& arrival)
    {
        const kzcat_source source = source_of(arrival);
        if (!was_found(kzcat_add_source(&catalogue_, arrival.track, &source))) {
            return false;
        }
        const auto track = found<Track>(kzcat_get_track, &catalogue_, arrival.track);
        const auto sources = track ? sources_of(track) : std::vector<kzcat_source>();
        for (const kzcat_source& other : sources) {
            const bool same_bytes =
                other.hash != nullptr &&
                std::equal(arrival.hash->begin(), arrival.hash->end(), other.hash);
            if (other.uri != arrival.path && same_bytes && is_gone(other.uri)) {
                was_found(kzcat_remove_source(&catalogue_, other.uri));
            }
        }
        return true;
    }

    void report(const Arrival& arrival)
    {
        ++counts_.at(static_cast<size_t>(arrival.outcome));
        progress_.clear();
        if (!arrival.trouble.empty()) {
            trouble_ = true;
            write_message(arrival.path + ": " + arrival.trouble);
        }
        if (settings_.format == TextOrJson::json) {
            write_output(to_json(arrival));
        } else if (arrival.outcome != Outcome::failed && arrival.outcome != Outcome::unchanged) {
            write_output(
                without_control_characters(kOutcomes.at(static_cast<size_t>(arrival.outcome)) +
                                           std::string(" ") + arrival.path) +
                '\n');
        }
    }

    kzcat_catalogue& catalogue_;
    const AddSettings& settings_;
    const Reader& reader_;
    Progress progress_;
    size_t taken_ = 0;
    std::vector<Arrival> waiting_;
    std::chrono::steady_clock::time_point last_write_ = std::chrono::steady_clock::now();
    std::array<uint64_t, kOutcomes.size()> counts_ = {};
    bool trouble_ = false;
};

ExitStatus add_all(const AddSettings& settings)
{
    const Catalogue catalogue = open_catalogue(settings.catalogue, KZCAT_ACCESS_CREATE);
    const FileList list = list_files(settings.files);
    const Reader reader(*catalogue, settings);
    Writer writer(*catalogue, settings, reader, list.files.size());
    in_order(
        list.files.size(), settings.jobs, [&](size_t i) { return reader.read(list.files[i]); },
        [&](size_t, Arrival arrival) { writer.take(std::move(arrival)); });
    writer.write();
    if (settings.format == TextOrJson::text) {
        write_output(writer.summary(list.passed_over) + '\n');
    }
    return writer.all_well() ? all_done : some_file_failed;
}

} // namespace

ExitStatus run_add(const Arguments& arguments)
{
    CLI::App parser(kDescription, program_name(arguments));
    parser.footer(kFooter);
    AddSettings settings;
    add_catalogue_option(parser, settings.catalogue);
    parser.add_option("FILE", settings.files, "Sound files, trails (.kzt) and folders")
        ->required()
        ->type_name("");
    add_format_option(parser, settings.format);
    parser.add_flag("--documents", settings.documents,
                    "Also keep what answers query documents: 59 bytes more for\n"
                    "each second of sound, beside 43");
    add_jobs_option(parser, settings.jobs);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    try {
        return add_all(settings);
    } catch (const CatalogueError& error) {
        write_message(message_about(settings.catalogue, error));
        return some_file_failed;
    }
}

} // namespace kzfp
