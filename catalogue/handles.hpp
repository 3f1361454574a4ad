/// @file
/// What the opaque handles of the C interface hold, and how they are created and freed.
#pragma once

#include <algorithm>
#include <cstdint>
#include <deque>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <variant>
#include <vector>

#include "catalogue/catalogue.hpp"
#include "catalogue/failure.hpp"
#include "catalogue/model/extractor.hpp"
#include "catalogue/monitor/monitor.hpp"
#include "catalogue/store/postgresql/jobs.hpp"
#include "kzcat.h"

struct kzcat_catalogue {
    kzcat::Catalogue whole;
};

struct kzcat_builder {
    kzcat::TrailExtractor extractor;
    std::vector<kzcat::Code> codes; ///< that were taken out of it already
    enum { taking, broken, finished } state = taking;
};

struct kzcat_trail {
    kzcat::Trail trail;
    kzcat::DocumentBands document_bands;
};

struct kzcat_track {
    kzcat::TrackInfo info;
};

struct kzcat_query {
    using Content =
        std::variant<std::monostate, kzcat::QueryBands, kzcat::Trail, kzcat::DocumentValues>;

    std::optional<kzcat::QueryExtractor> extractor; ///< until it is finished
    Content content;                                ///< from then on
    bool broken = false;                            ///< sound may have been lost
};

/// What people call a track.
struct kzcat_names {
    std::string source; ///< empty when the track has gone
    std::optional<std::string> title;
    std::optional<std::string> artist;
};

/// A match with the texts that its record points to.
struct kzcat_found {
    kzcat_match record{};
    kzcat_names names;
};

struct kzcat_result {
    kzcat_summary summary{};
    std::vector<kzcat_found> matches;
    std::vector<kzcat_found> candidates;
};

struct kzcat_monitor {
    kzcat_monitor(const kzcat::SoundFormat& format, const kzcat::MonitorOptions& options)
        : whole(format, options)
    {
    }

    struct Event {
        kzcat::MonitorEvent event;
        kzcat_names names;
    };

    kzcat::Monitor whole;
    enum { taking, broken, finished } state = taking;
    std::deque<Event> events; ///< with names; those of `whole` have none yet
    Event taken;              ///< the caller has its texts
    kzcat_names names;        ///< of the track that was heard last
};

struct kzcat_jobs {
    std::unique_ptr<kzcat::Jobs> whole;
    kzcat::Job taken;         ///< the caller has its text
    kzcat::FailedJob visited; ///< and those of this one
};

namespace kzcat {

/// Reads the names of a track from its tags; empty ones when there is no such track.
kzcat_names names_of(Store& store, int64_t track);

/// Checks the place for a handle and clears it, so that it is null whatever fails later.
template <class Handle>
void clear_place(Handle** place)
{
    require(place != nullptr, "the place for the new handle is null; pass one");
    *place = nullptr;
}

/// Frees what a caller's pointer refers to and sets it to null.
template <class Handle>
kzcat_status free_handle(Handle** reference) noexcept
{
    return guarded([reference] {
        require(reference != nullptr,
                "the reference to the handle is null; pass the address of the "
                "pointer that holds it");
        delete *reference;
        *reference = nullptr;
    });
}

/// The bytes that a caller passed.
inline std::span<const std::byte> bytes_of(const void* bytes, uint64_t count)
{
    require(bytes != nullptr || count == 0, "the bytes are null; pass some, or a count of 0");
    require(count <= SIZE_MAX, "there are more bytes than memory has addresses for");
    return {static_cast<const std::byte*>(bytes), static_cast<size_t>(count)};
}

template <class Number, size_t count>
bool all_zero(const Number (&reserved)[count])
{
    return std::all_of(reserved, reserved + count, [](Number number) { return number == 0; });
}

/// Copies what fits, and reports how much there is whatever the room.
template <class Item>
void copy_out(std::span<const Item> items, Item* room, uint64_t capacity, uint64_t* out_count)
{
    *out_count = items.size();
    if (room == nullptr && capacity == 0) {
        return;
    }
    if (capacity < items.size()) {
        throw Failure(KZCAT_ERROR_ROOM, "room for " + std::to_string(items.size()) +
                                            " is needed, there is room for " +
                                            std::to_string(capacity));
    }
    std::ranges::copy(items, room);
}

/// Checks a caller's format; the extractors then refuse what they cannot use.
SoundFormat to_sound_format(const kzcat_format* format);

/// A caller's records as the store has them. They throw Failure.
Source to_source(const kzcat_source& source);
std::vector<Tag> to_tags(const kzcat_tag* tags, uint64_t count);
void require_codes(const kzcat_trail* trail);
NewTrack to_new_track(const kzcat_new_track& track);

/// Reports on a format that an extractor refuses, by the status for that.
template <class Make>
auto with_format_checked(Make make)
{
    try {
        return make();
    } catch (const std::invalid_argument& refusal) {
        throw Failure(KZCAT_ERROR_FORMAT, refusal.what());
    }
}

} // namespace kzcat
