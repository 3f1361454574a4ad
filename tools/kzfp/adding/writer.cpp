// Many tracks in one transaction take hardly longer than one, since it is the wait for the disk
// that takes the time.

#include "kzfp/adding/writer.hpp"

#include <algorithm>
#include <utility>

#include "kzfp/catalogue/tracks.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

constexpr size_t kBatch = 64; ///< tracks in one transaction
constexpr auto kLongestWait = std::chrono::seconds(2);

} // namespace

NewTracks::NewTracks(std::span<Arrival* const> arrivals) : tags_(arrivals.size())
{
    for (size_t i = 0; i < arrivals.size(); ++i) {
        for (const audio::Tag& tag : arrivals[i]->recording.tags) {
            tags_[i].push_back({.name = tag.name.c_str(), .value = tag.value.c_str()});
        }
        tracks_.push_back({.trail = arrivals[i]->recording.trail.get(),
                           .source = source_of(*arrivals[i]),
                           .tags = tags_[i].data(),
                           .tag_count = tags_[i].size()});
    }
}

void note_added(Arrival& arrival, const kzcat_added& added)
{
    arrival.track = added.track;
    arrival.outcome = added.is_new != 0 ? Outcome::added : Outcome::known;
}

bool move_source(kzcat_catalogue& catalogue, const Arrival& arrival)
{
    const kzcat_source source = source_of(arrival);
    if (!was_found(kzcat_add_source(&catalogue, arrival.track, &source))) {
        return false;
    }
    const auto track = found<Track>(kzcat_get_track, &catalogue, arrival.track);
    const auto sources = track ? sources_of(track) : std::vector<kzcat_source>();
    for (const kzcat_source& other : sources) {
        const bool same_bytes = other.hash != nullptr &&
                                std::equal(arrival.hash->begin(), arrival.hash->end(), other.hash);
        if (other.uri != arrival.path && same_bytes && is_gone(other.uri)) {
            was_found(kzcat_remove_source(&catalogue, other.uri));
        }
    }
    return true;
}

Writer::Writer(kzcat_catalogue& catalogue, const Reader& reader, const OutputOptions& output,
               size_t files)
    : catalogue_(catalogue), reader_(reader), format_(output.format),
      progress_(files, output.progress)
{
    write_output(first_line_of_arrivals(format_));
}

void Writer::take(Arrival arrival)
{
    if (arrival.outcome == Outcome::left) {
        ++counts_.at(static_cast<size_t>(Outcome::left));
        return;
    }
    progress_.show(++taken_, arrival.path);
    waiting_.push_back(std::move(arrival));
    if (waiting_.size() >= kBatch ||
        std::chrono::steady_clock::now() - last_write_ >= kLongestWait) {
        write();
    }
}

void Writer::write()
{
    move_sources(); // before other sound takes their places, and their tracks with the last one
    add_tracks();
    for (const Arrival& arrival : waiting_) {
        report(arrival);
    }
    waiting_.clear();
    last_write_ = std::chrono::steady_clock::now();
}

void Writer::add_tracks()
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

/// All of them or none; false when none because of one that cannot be kept, which is then reported
/// as failed if it is the only one.
bool Writer::add_together(std::span<Arrival* const> arrivals)
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
            arrivals.front()->error = error.what();
        }
        return false;
    }
}

void Writer::add(std::span<Arrival* const> arrivals)
{
    const NewTracks tracks(arrivals);
    std::vector<kzcat_added> added(arrivals.size());
    check(kzcat_add(&catalogue_, tracks.all().data(), added.size(), added.data()));
    for (size_t i = 0; i < arrivals.size(); ++i) {
        note_added(*arrivals[i], added[i]);
    }
}

/// A track can have gone since its file was read, for example when two files have taken each
/// other's names. That file is then read again.
void Writer::move_sources()
{
    for (Arrival& arrival : waiting_) {
        while (arrival.outcome == Outcome::moved && !move_source(catalogue_, arrival)) {
            arrival = reader_.read({.path = arrival.path, .trouble = {}});
        }
    }
}

void Writer::report(const Arrival& arrival)
{
    ++counts_.at(static_cast<size_t>(arrival.outcome));
    if (arrival.outcome == Outcome::left) {
        return;
    }
    progress_.clear();
    if (arrival.outcome == Outcome::failed) {
        failures_.push_back(arrival.path + ": " + arrival.error);
        write_message(failures_.back());
    } else if (!arrival.warning.empty()) {
        write_message(arrival.path + ": " + arrival.warning);
    }
    write_output(line_of(arrival, format_));
}

} // namespace kzfp
