// The size and the time of change are looked at first, then the bytes, then the sound. They are
// noted before the file is read: one that changes meanwhile is read again by the next run.

#include "kzfp/adding/reader.hpp"

#include <new>

#include "audio/source.hpp"
#include "kzfp/catalogue/tracks.hpp"
#include "kzfp/output/interruption.hpp"

namespace kzfp {

Arrival Reader::read(const ListedFile& file) const
{
    Arrival arrival;
    arrival.path = file.path;
    arrival.error = file.trouble;
    if (!file.trouble.empty()) {
        return arrival;
    }
    if (interrupted()) {
        arrival.outcome = Outcome::left;
        return arrival;
    }
    try {
        look_at(arrival);
    } catch (const audio::FileError& error) {
        arrival.error = error.what();
    } catch (const CatalogueError& error) {
        arrival.error = error.what();
    } catch (const std::bad_alloc&) {
        arrival.error = "not enough memory";
    }
    return arrival;
}

void Reader::look_at(Arrival& arrival) const
{
    if (arrival.path == "-") {
        throw audio::FileError("has no name by which the track could be found again; write it "
                               "to a file, and add that");
    }
    check_is_not_of(path_, arrival.path);
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
    arrival.recording = read_recording(arrival.path, sound_, documents_);
    arrival.warning = arrival.recording.warning;
    arrival.outcome = Outcome::added;
}

bool Reader::serves(const Track& track) const
{
    return !documents_ || facts_of(track).answers_documents != 0;
}

bool Reader::is_unchanged(Arrival& arrival) const
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

bool Reader::is_known_by_hash(Arrival& arrival) const
{
    const auto track = found<Track>(kzcat_find_hash, &catalogue_,
                                    static_cast<const uint8_t*>(arrival.hash->data()));
    if (!track || !serves(track)) {
        return false;
    }
    arrival.track = facts_of(track).track;
    return true;
}

} // namespace kzfp
