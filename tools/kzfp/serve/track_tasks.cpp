// Tracks look like those of `kzfp list --format json`.

#include "kzfp/serve/track_tasks.hpp"

#include <algorithm>
#include <cmath>
#include <filesystem>

#include "audio/source.hpp"
#include "kzfp/catalogue/sound.hpp"
#include "kzfp/catalogue/tracks.hpp"
#include "kzfp/output/encoding.hpp"
#include "kzfp/output/json_object.hpp"
#include "kzfp/serve/clips.hpp"

namespace kzfp::serve {

namespace {

constexpr double kLongestTrack = 12 * 3600; ///< seconds

[[noreturn]] void refuse_track(int64_t track)
{
    refuse(404, "no_such_track",
           "there is no track " + std::to_string(track) + "; list them with /v1/tracks");
}

Track track_at(kzcat_catalogue& catalogue, int64_t number)
{
    Track track = found<Track>(kzcat_get_track, &catalogue, number);
    if (!track) {
        refuse_track(number);
    }
    return track;
}

/// The first tag of a name, or null.
JsonObject tag_in(const Track& track, std::string_view name)
{
    for (const kzcat_tag& tag : tags_of(track)) {
        if (tag.name == name) {
            return tag.value;
        }
    }
    return nullptr;
}

/// The bytes of names that are not UTF-8 are there too, since JSON cannot show these.
void set_sources(JsonObject& object, const Track& track, bool hide_sources)
{
    object["sources"] = JsonObject::array();
    JsonObject bytes = JsonObject::array();
    bool all_are_text = true;
    for (const kzcat_source& source : sources_of(track)) {
        const std::string name = hide_sources ? file_name_of(source.uri) : source.uri;
        const bool is_text = is_utf8(name);
        all_are_text = all_are_text && is_text;
        object["sources"].push_back(name);
        bytes.push_back(is_text ? JsonObject() : JsonObject(to_hexadecimal(name)));
    }
    if (!all_are_text) {
        object["sources_bytes"] = bytes;
    }
}

JsonObject to_object(const Track& track, bool hide_sources)
{
    const kzcat_track_facts facts = facts_of(track);
    JsonObject object = JsonObject::object_t();
    object["track"] = facts.track;
    for (const char* const name : {"title", "artist", "album"}) {
        object[name] = tag_in(track, name);
    }
    object["tags"] = JsonObject::object();
    for (const kzcat_tag& tag : tags_of(track)) {
        object["tags"][tag.name].push_back(tag.value); // there may be several of one name
    }
    set_sources(object, track, hide_sources);
    object["seconds"] =
        std::round(1e4 * static_cast<double>(facts.samples) / facts.sample_rate) / 1e4;
    object["codes"] = facts.code_count;
    object["documents"] = facts.answers_documents != 0;
    object["added"] = facts.added;
    return object;
}

Reply reply_with(const JsonObject& tracks, const JsonObject& next)
{
    JsonObject object = make_object();
    object["tracks"] = tracks;
    object["next"] = next;
    return json_reply(200, to_line(object));
}

/// What is posted as a track.
Recording recording_of(const Plan& plan, std::string& body)
{
    if (plan.body == BodyKind::trail) {
        Recording recording;
        recording.trail = trail_of(body);
        const std::string name = std::filesystem::path(plan.source).stem().string();
        recording.tags.push_back({.name = "title", .value = audio::to_utf8(name)});
        return recording;
    }
    try {
        const MemoryFile file(body);
        std::string().swap(body);
        SoundOptions options;
        options.section.length = kLongestTrack + 1;
        Recording recording =
            read_recording(file.path(), options, plan.documents, file_name_of(plan.source));
        if (recording.seconds > kLongestTrack) {
            refuse(413, "sound_too_long", "the sound is longer than 12 hours; send it in parts");
        }
        return recording;
    } catch (const audio::FileError& error) {
        refuse_sound(error.what());
    }
}

/// The tags of the request, and those of the file whose names it does not have.
std::vector<kzcat_tag> tags_for(const Plan& plan, const Recording& recording)
{
    std::vector<kzcat_tag> tags;
    for (const Parameter& tag : plan.tags) {
        tags.push_back({.name = tag.name.c_str(), .value = tag.value.c_str()});
    }
    for (const audio::Tag& tag : recording.tags) {
        if (std::ranges::find(plan.tags, tag.name, &Parameter::name) == plan.tags.end()) {
            tags.push_back({.name = tag.name.c_str(), .value = tag.value.c_str()});
        }
    }
    return tags;
}

kzcat_added added_to(kzcat_catalogue& catalogue, const Plan& plan, const Recording& recording)
{
    const std::vector<kzcat_tag> tags = tags_for(plan, recording);
    const kzcat_new_track track = {
        .trail = recording.trail.get(),
        .source = {.uri = plan.source.c_str(), .size = -1, .mtime_ns = -1, .hash = nullptr},
        .tags = tags.data(),
        .tag_count = tags.size()};
    kzcat_added added = {};
    const kzcat_status status = kzcat_add(&catalogue, &track, 1, &added);
    if (status == KZCAT_ERROR_INVALID_ARGUMENT || status == KZCAT_ERROR_OTHER_PROFILE) {
        refuse(400, "bad_track", kzcat_get_error_text());
    }
    check(status);
    return added;
}

} // namespace

Reply list_tracks(kzcat_catalogue& catalogue, const Plan& plan, bool hide_sources)
{
    JsonObject tracks = JsonObject::array();
    if (!plan.source.empty()) {
        const auto track = found<Track>(kzcat_find_source, &catalogue, plan.source.c_str());
        if (!track) {
            refuse(404, "no_such_source", "no track has this source; list them with /v1/tracks");
        }
        tracks.push_back(to_object(track, hide_sources));
        return reply_with(tracks, nullptr);
    }
    int64_t last = 0;
    bool is_more = false;
    visit_tracks(catalogue, plan.after, [&](const Track& track) {
        is_more = tracks.size() == plan.count;
        if (!is_more) {
            tracks.push_back(to_object(track, hide_sources));
            last = facts_of(track).track;
        }
        return !is_more;
    });
    return reply_with(tracks, is_more ? JsonObject(last) : JsonObject());
}

Reply show_track(kzcat_catalogue& catalogue, const Plan& plan, bool hide_sources)
{
    const Track track = track_at(catalogue, plan.track);
    JsonObject object = make_object();
    object.update(to_object(track, hide_sources));
    return json_reply(200, to_line(object));
}

Reply show_trail(kzcat_catalogue& catalogue, const Plan& plan)
{
    const Trail trail = found<Trail>(kzcat_get_trail, &catalogue, plan.track);
    if (!trail) {
        refuse_track(plan.track);
    }
    uint64_t size = 0;
    check(kzcat_trail_write(trail.get(), nullptr, 0, &size));
    std::string bytes(size, '\0');
    check(kzcat_trail_write(trail.get(), bytes.data(), size, &size));
    return {.status = 200, .type = "application/x-kzt", .body = std::move(bytes)};
}

Addition add_track(kzcat_catalogue& catalogue, const Plan& plan, std::string& body)
{
    const Recording recording = recording_of(plan, body);
    const kzcat_added added = added_to(catalogue, plan, recording);
    JsonObject object = make_object();
    object["track"] = added.track;
    object["added"] = added.is_new != 0;
    if (!recording.warning.empty()) {
        object["warning"] = recording.warning;
    }
    Reply reply = json_reply(added.is_new != 0 ? 201 : 200, to_line(object));
    reply.headers = {{"Location", "/v1/tracks/" + std::to_string(added.track)}};
    return {.reply = std::move(reply), .was_there = added.is_new == 0};
}

Reply remove_track(kzcat_catalogue& catalogue, const Plan& plan)
{
    if (!was_found(kzcat_remove_track(&catalogue, plan.track))) {
        refuse_track(plan.track);
    }
    return {.status = 204, .type = {}, .body = {}};
}

} // namespace kzfp::serve
