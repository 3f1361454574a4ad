/**
 * @file
 * libkzcat for C++17 and later: handles that free themselves, containers in, values out. All of it
 * is in this header; programs link the C library.
 *
 *     auto catalogue = kz::catalogue::open("music.kzc").value();
 *     auto clip = kz::query::of(samples, 44100, 2).value();
 *     for (const kz::match& match : catalogue.recognise(clip).value().matches)
 *         std::printf("%s at %.1f s\n", match.source.c_str(), match.offset);
 *
 * Samples, failures and handles are as in kzsdk/kzsdk.hpp; statuses of failures are KZCAT_ERROR_...
 * Records of the C interface that hold no text are returned as they are. What this header does not
 * offer can be done with handle() and kzcat.h, which states threads and processes too: a catalogue
 * serves any number of threads at once, and so does what never changes.
 */
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "kzcat.h"
#include "kzsdk/kzsdk.hpp"

namespace kz {
inline namespace cxx1 {

namespace detail {

inline error catalogue_failure(kzcat_status status) { return {status, kzcat_get_error_text()}; }

inline result<void> catalogue_outcome(kzcat_status status)
{
    return status == KZCAT_OK ? result<void>() : catalogue_failure(status);
}

/** What a call that fills a record gave. */
template <class Record, class Call>
result<Record> filled(Call call)
{
    Record record = {};
    const kzcat_status status = call(&record);
    return status == KZCAT_OK ? result<Record>(record) : catalogue_failure(status);
}

/** What a call that makes a handle gave. */
template <class Owner, class Handle, class Call>
result<Owner> made(Call call)
{
    Handle* handle = nullptr;
    const kzcat_status status = call(&handle);
    return status == KZCAT_OK ? result<Owner>(Owner(handle)) : catalogue_failure(status);
}

/** What a call gave that reports a count, and then fills an array. */
template <class Element, class Call>
result<std::vector<Element>> array_of(Call call)
{
    std::vector<Element> elements;
    uint64_t count = 0;
    kzcat_status status = call(nullptr, uint64_t{0}, &count);
    if (status == KZCAT_ERROR_ROOM || (status == KZCAT_OK && count > 0)) {
        elements.resize(static_cast<size_t>(count));
        status = call(elements.data(), count, &count);
    }
    if (status != KZCAT_OK) {
        return catalogue_failure(status);
    }
    return elements;
}

inline kzcat_format c_format(const format& of) { return {of.encoding, of.rate, of.channels, 0}; }

inline std::string text_or_none(const char* text) { return text != nullptr ? text : ""; }

inline error other_samples() { return {KZCAT_ERROR_INVALID_ARGUMENT, kOtherSamples}; }

} // namespace detail

/** Version of the catalogue's library that the program runs with: "MAJOR.MINOR.PATCH". */
inline std::string catalogue_version() { return kzcat_get_version(); }

/** What is stored of a recording: 43 bytes for a second of sound. Never changes. */
class trail {
public:
    explicit trail(kzcat_trail* owned) : handle_(owned) {}

    /** Of sound; @p documents: also what answers query documents. */
    static result<trail> of(const sound& samples, const format& of, bool documents = false);
    static result<trail> of(const sound& samples, uint32_t rate, uint32_t channels)
    {
        return trail::of(samples, format{samples.encoding(), rate, channels});
    }
    /** Of the bytes of a .kzt file, which may have any content. */
    static result<trail> read(const sound& bytes)
    {
        return detail::made<trail, kzcat_trail>(
            [&](kzcat_trail** out) { return kzcat_trail_read(bytes.bytes(), bytes.size(), out); });
    }

    /** The bytes of a .kzt file, without what answers documents. */
    result<std::vector<uint8_t>> write() const
    {
        return detail::array_of<uint8_t>([this](void* bytes, uint64_t room, uint64_t* size) {
            return kzcat_trail_write(handle(), bytes, room, size);
        });
    }
    result<kzcat_trail_facts> facts() const
    {
        return detail::filled<kzcat_trail_facts>(
            [this](kzcat_trail_facts* out) { return kzcat_trail_get_facts(handle(), out); });
    }
    result<std::vector<uint64_t>> codes() const
    {
        return detail::array_of<uint64_t>([this](uint64_t* codes, uint64_t room, uint64_t* count) {
            return kzcat_trail_get_codes(handle(), codes, room, count);
        });
    }
    /** A part: @p count codes from @p first on. */
    result<trail> cut(uint64_t first, uint64_t count) const
    {
        return detail::made<trail, kzcat_trail>(
            [&](kzcat_trail** out) { return kzcat_trail_cut(handle(), first, count, out); });
    }

    kzcat_trail* handle() const noexcept { return handle_.get(); }

private:
    detail::owner<kzcat_trail, kzcat_trail_free> handle_;
};

/** Lays two trails over each other: see kzcat_alignment. */
inline result<kzcat_alignment> align(const trail& first, const trail& second)
{
    return detail::filled<kzcat_alignment>([&](kzcat_alignment* out) {
        return kzcat_trail_align(first.handle(), second.handle(), out);
    });
}

/** Sound on its way to a trail, fed in pieces of any length. One thread at a time. */
class trail_builder {
public:
    static result<trail_builder> create(const format& of, bool documents = false)
    {
        const kzcat_format format = detail::c_format(of);
        kzcat_builder_settings settings;
        kzcat_builder* made = nullptr;
        kzcat_initialize_builder_settings(&settings);
        settings.documents = documents ? 1 : 0;
        const kzcat_status status = kzcat_builder_create(&format, &settings, &made);
        if (status != KZCAT_OK) {
            return detail::catalogue_failure(status);
        }
        return trail_builder(made, of.encoding);
    }
    result<void> feed(const sound& samples)
    {
        if (!samples.fits(encoding_)) {
            return detail::other_samples();
        }
        return detail::catalogue_outcome(
            kzcat_builder_feed(handle(), samples.bytes(), samples.size()));
    }
    /** The trail of the sound so far; more may be fed afterwards. */
    result<trail> so_far()
    {
        return detail::made<trail, kzcat_trail>(
            [this](kzcat_trail** out) { return kzcat_builder_get_trail(handle(), out); });
    }
    /** Ends the sound; only once. */
    result<trail> finish()
    {
        return detail::made<trail, kzcat_trail>(
            [this](kzcat_trail** out) { return kzcat_builder_finish(handle(), out); });
    }

    kzcat_builder* handle() const noexcept { return handle_.get(); }

private:
    trail_builder(kzcat_builder* made, uint32_t encoding) : handle_(made), encoding_(encoding) {}

    detail::owner<kzcat_builder, kzcat_builder_free> handle_;
    uint32_t encoding_;
};

inline result<trail> trail::of(const sound& samples, const format& of, bool documents)
{
    result<trail_builder> builder = trail_builder::create(of, documents);
    if (!builder) {
        return builder.error();
    }
    const result<void> fed = builder->feed(samples);
    return fed ? builder->finish() : fed.error();
}

/** A clip to be recognised. Once finished it never changes. */
class query {
public:
    /** To be fed and finished; one thread at a time until then. */
    static result<query> create(const format& of)
    {
        const kzcat_format format = detail::c_format(of);
        kzcat_query* made = nullptr;
        const kzcat_status status = kzcat_query_create(&format, &made);
        return status == KZCAT_OK ? result<query>(query(made, of.encoding))
                                  : detail::catalogue_failure(status);
    }
    /** Finished, of a whole clip. About 14 s of sound are a good length. */
    static result<query> of(const sound& samples, const format& of)
    {
        result<query> made = create(of);
        result<void> done = made ? made->feed(samples) : result<void>(made.error());
        if (done) {
            done = made->finish();
        }
        return done ? std::move(made) : done.error();
    }
    static result<query> of(const sound& samples, uint32_t rate, uint32_t channels)
    {
        return query::of(samples, format{samples.encoding(), rate, channels});
    }
    static result<query> of(const trail& recording)
    {
        return wrap([&](kzcat_query** out) {
            return kzcat_query_create_from_trail(recording.handle(), out);
        });
    }
    static result<query> of_document(const std::string& text)
    {
        return wrap([&](kzcat_query** out) {
            return kzcat_query_create_from_document(text.data(), text.size(), out);
        });
    }
    static result<query> of_fingerprint(const fingerprint& numbers)
    {
        return wrap([&](kzcat_query** out) {
            return kzcat_query_create_from_values(
                numbers.values.data(), static_cast<uint32_t>(numbers.values.size()), out);
        });
    }

    result<void> feed(const sound& samples)
    {
        if (!samples.fits(encoding_)) {
            return detail::other_samples();
        }
        return detail::catalogue_outcome(
            kzcat_query_feed(handle(), samples.bytes(), samples.size()));
    }
    result<void> finish() { return detail::catalogue_outcome(kzcat_query_finish(handle())); }

    kzcat_query* handle() const noexcept { return handle_.get(); }

private:
    query(kzcat_query* made, uint32_t encoding) : handle_(made), encoding_(encoding) {}

    template <class Call>
    static result<query> wrap(Call call)
    {
        kzcat_query* made = nullptr;
        const kzcat_status status = call(&made);
        return status == KZCAT_OK ? result<query>(query(made, 0))
                                  : detail::catalogue_failure(status);
    }

    detail::owner<kzcat_query, kzcat_query_free> handle_;
    uint32_t encoding_;
};

/** A track in which a clip was found: as kzcat_match, with texts of its own. */
struct match {
    int64_t track = 0;
    std::string source; /**< empty when the track has gone since */
    std::string title;  /**< empty when there is none */
    std::string artist; /**< empty when there is none */
    double score = 0;
    double threshold = 0;
    double offset = 0; /**< seconds of the track at which the clip begins */
    double speed = 1;
    double tempo = 1;
    double pitch = 1;
    double clip_begin = 0; /**< seconds of the clip where what was found begins */
    double clip_end = 0;   /**< and ends */
    uint32_t by = 0;       /**< one of KZCAT_BY_... */
    bool weak = false;     /**< no more than a hint */
};

/** What was concluded about a clip. */
struct answer {
    kzcat_summary summary = {};
    std::vector<match> matches;    /**< tracks that reached their threshold, best first */
    std::vector<match> candidates; /**< the best ones whatever their score */

    bool matched() const noexcept { return summary.verdict == KZCAT_VERDICT_MATCH; }
    /** "match", "no match", "not sure" or "too quiet". */
    std::string verdict() const { return kzcat_verdict_text(summary.verdict); }
};

/** How a clip is looked up, with what is usual. */
inline kzcat_match_options usual_match_options()
{
    kzcat_match_options options;
    kzcat_initialize_match_options(&options);
    return options;
}

struct tag {
    std::string name; /**< "title", "artist", ...: in lower case */
    std::string value;
};

/** A file or other place that a track came from. */
struct source {
    std::string uri;
    int64_t size = -1;           /**< of the file in bytes; -1 when it is none */
    int64_t mtime_ns = -1;       /**< nanoseconds since 1970; -1 when unknown */
    std::vector<uint8_t> hash{}; /**< SHA-256 of the file, KZCAT_HASH_SIZE bytes; may be empty */
};

/** A track to be added. */
struct new_track {
    const kz::trail* trail = nullptr; /**< the caller's */
    kz::source source{};
    std::vector<tag> tags{};
};

/** A track of a catalogue. */
struct track {
    kzcat_track_facts facts = {};
    std::vector<tag> tags{};
    std::vector<source> sources{};

    int64_t id() const noexcept { return facts.track; }
    double seconds() const noexcept
    {
        const double samples = static_cast<double>(facts.samples);
        return facts.sample_rate != 0 ? samples / facts.sample_rate : 0;
    }
    /** The value of a tag; empty when there is none. */
    std::string tag_value(const std::string& name) const
    {
        for (const tag& each : tags) {
            if (each.name == name) {
                return each.value;
            }
        }
        return {};
    }
};

/** A fault of a catalogue; the track is 0 when no single one is concerned. */
struct fault {
    int64_t track = 0;
    std::string text;
};

/** Receives how far a long call is; returns whether to go on. */
using progress = std::function<bool(uint64_t done, uint64_t total)>;

namespace detail {

inline match match_of(const kzcat_match& found)
{
    return {found.track,
            text_or_none(found.source),
            text_or_none(found.title),
            text_or_none(found.artist),
            found.score,
            found.threshold,
            found.offset,
            found.speed,
            found.tempo,
            found.pitch,
            found.clip_begin,
            found.clip_end,
            found.by,
            found.weak != 0};
}

/** Copies a result of the C interface, and frees it. */
inline result<answer> answer_of(kzcat_result* found)
{
    const owner<kzcat_result, kzcat_result_free> held(found);
    answer copy;
    kzcat_match one = {};
    kzcat_status status = kzcat_result_get_summary(found, &copy.summary);
    for (uint64_t i = 0; status == KZCAT_OK && i < copy.summary.match_count; ++i) {
        status = kzcat_result_get_match(found, i, &one);
        copy.matches.push_back(match_of(one));
    }
    for (uint64_t i = 0; status == KZCAT_OK && i < copy.summary.candidate_count; ++i) {
        status = kzcat_result_get_candidate(found, i, &one);
        copy.candidates.push_back(match_of(one));
    }
    return status == KZCAT_OK ? result<answer>(std::move(copy)) : catalogue_failure(status);
}

/** Copies a track of the C interface, and frees it. */
inline result<track> track_of(kzcat_track* found)
{
    const owner<kzcat_track, kzcat_track_free> held(found);
    track copy;
    kzcat_tag tag = {};
    kzcat_source source = {};
    kzcat_status status = kzcat_track_get_facts(found, &copy.facts);
    for (uint32_t i = 0; status == KZCAT_OK && i < copy.facts.tag_count; ++i) {
        status = kzcat_track_get_tag(found, i, &tag);
        copy.tags.push_back({text_or_none(tag.name), text_or_none(tag.value)});
    }
    for (uint32_t i = 0; status == KZCAT_OK && i < copy.facts.source_count; ++i) {
        status = kzcat_track_get_source(found, i, &source);
        std::vector<uint8_t> hash{};
        if (source.hash != nullptr) {
            hash.assign(source.hash, source.hash + KZCAT_HASH_SIZE);
        }
        copy.sources.push_back(
            {text_or_none(source.uri), source.size, source.mtime_ns, std::move(hash)});
    }
    return status == KZCAT_OK ? result<track>(std::move(copy)) : catalogue_failure(status);
}

/** What the callbacks of a long call reach. */
struct watching {
    const progress* watch;
    const std::function<void(fault)>* report;
    bool threw;
};

inline uint8_t go_on(void* context, uint64_t done, uint64_t total) noexcept
{
    auto& watched = *static_cast<watching*>(context);
    bool wanted = !watched.threw;
    if (wanted && watched.watch != nullptr && *watched.watch) {
        watched.threw = !completes([&] { wanted = (*watched.watch)(done, total); });
    }
    return wanted && !watched.threw ? 1 : 0;
}

inline void take_fault(void* context, int64_t track, const char* text) noexcept
{
    auto& watched = *static_cast<watching*>(context);
    if (!watched.threw && *watched.report) {
        watched.threw = !completes([&] { (*watched.report)({track, text}); });
    }
}

inline error callback_failure()
{
    return {KZCAT_ERROR_CANCELLED, "The caller's own function threw: correct that, and repeat."};
}

} // namespace detail

/** Keeps recordings and names clips. Any number of threads may use it at once. */
class catalogue {
public:
    /** One of KZCAT_ACCESS_...; the path may be the address of a PostgreSQL server. */
    static result<catalogue> open(const std::string& path, uint32_t access = KZCAT_ACCESS_READ,
                                  const kzcat_settings* settings = nullptr)
    {
        return detail::made<catalogue, kzcat_catalogue>(
            [&](kzcat_catalogue** out) { return kzcat_open(path.c_str(), access, settings, out); });
    }
    /** Empty, and gone when it is closed. */
    static result<catalogue> in_memory()
    {
        return detail::made<catalogue, kzcat_catalogue>([](kzcat_catalogue** out) {
            return kzcat_open(nullptr, KZCAT_ACCESS_CREATE, nullptr, out);
        });
    }
    explicit catalogue(kzcat_catalogue* owned) : handle_(owned) {}

    result<answer> recognise(const query& clip,
                             const kzcat_match_options& options = usual_match_options()) const
    {
        kzcat_result* found = nullptr;
        const kzcat_status status = kzcat_recognise(handle(), clip.handle(), &options, &found);
        return status == KZCAT_OK ? detail::answer_of(found) : detail::catalogue_failure(status);
    }

    /** On disk when it returns. A track with the same codes gains the source and the tags. */
    result<kzcat_added> add(const trail& recording, const source& from,
                            const std::vector<tag>& tags = {})
    {
        const result<std::vector<kzcat_added>> added = add({new_track{&recording, from, tags}});
        return added ? result<kzcat_added>(added->front()) : added.error();
    }
    /** All of them or none. */
    result<std::vector<kzcat_added>> add(const std::vector<new_track>& tracks);

    result<void> remove(int64_t track)
    {
        return detail::catalogue_outcome(kzcat_remove_track(handle(), track));
    }
    /** Removes a source, and its track when it was the last one. */
    result<void> remove_source(const std::string& uri)
    {
        return detail::catalogue_outcome(kzcat_remove_source(handle(), uri.c_str()));
    }

    /** The first track whose id is above @p after; nothing behind the last one. */
    result<std::optional<track>> next_track(int64_t after) const
    {
        const result<track> found = read_track(
            [&](kzcat_track** out) { return kzcat_get_next_track(handle(), after, out); });
        if (found) {
            return std::optional<track>(*found);
        }
        if (found.error().status() == KZCAT_ERROR_NOT_FOUND) {
            return std::optional<track>();
        }
        return found.error();
    }
    /** All tracks; of a large catalogue take them one by one with next_track(). */
    result<std::vector<track>> tracks() const;
    result<track> get_track(int64_t id) const
    {
        return read_track([&](kzcat_track** out) { return kzcat_get_track(handle(), id, out); });
    }
    result<track> find_source(const std::string& uri) const
    {
        return read_track(
            [&](kzcat_track** out) { return kzcat_find_source(handle(), uri.c_str(), out); });
    }
    result<trail> get_trail(int64_t id) const
    {
        return detail::made<trail, kzcat_trail>(
            [&](kzcat_trail** out) { return kzcat_get_trail(handle(), id, out); });
    }

    /** What it holds; @p open_index: also how it is looked through, which may take a while. */
    result<kzcat_facts> facts(bool open_index = false) const
    {
        return detail::filled<kzcat_facts>(
            [&](kzcat_facts* out) { return kzcat_get_facts(handle(), open_index ? 1 : 0, out); });
    }
    /**
     * Reads everything and returns how many faults there are. Functions that throw end it with
     * KZCAT_ERROR_CANCELLED; they must not use this catalogue.
     */
    result<uint64_t> verify(const std::function<void(fault)>& report = {},
                            const progress& watch = {}) const
    {
        uint64_t faults = 0;
        detail::watching watched = {&watch, &report, false};
        const kzcat_status status =
            kzcat_verify(handle(), detail::take_fault, detail::go_on, &watched, &faults);
        if (watched.threw) {
            return detail::callback_failure();
        }
        return status == KZCAT_OK ? result<uint64_t>(faults) : detail::catalogue_failure(status);
    }
    /** Adds all tracks of another catalogue; may be repeated. */
    result<kzcat_merged> merge(const catalogue& other, const progress& watch = {})
    {
        kzcat_merged merged = {};
        detail::watching watched = {&watch, nullptr, false};
        const kzcat_status status =
            kzcat_merge(handle(), other.handle(), detail::go_on, &watched, &merged);
        if (watched.threw) {
            return detail::callback_failure();
        }
        return status == KZCAT_OK ? result<kzcat_merged>(merged)
                                  : detail::catalogue_failure(status);
    }

    kzcat_catalogue* handle() const noexcept { return handle_.get(); }

private:
    template <class Call>
    static result<track> read_track(Call call)
    {
        kzcat_track* found = nullptr;
        const kzcat_status status = call(&found);
        return status == KZCAT_OK ? detail::track_of(found) : detail::catalogue_failure(status);
    }

    detail::owner<kzcat_catalogue, kzcat_close> handle_;
};

inline result<std::vector<kzcat_added>> catalogue::add(const std::vector<new_track>& tracks)
{
    std::vector<std::vector<kzcat_tag>> tags(tracks.size());
    std::vector<kzcat_new_track> records;
    std::vector<kzcat_added> added(tracks.size());
    for (size_t i = 0; i < tracks.size(); ++i) {
        const new_track& each = tracks[i];
        if (!each.source.hash.empty() && each.source.hash.size() != KZCAT_HASH_SIZE) {
            return error(KZCAT_ERROR_INVALID_ARGUMENT,
                         "A hash has another size than 32 bytes: pass a SHA-256, or none.");
        }
        for (const tag& each_tag : each.tags) {
            tags[i].push_back({each_tag.name.c_str(), each_tag.value.c_str()});
        }
        const uint8_t* hash = each.source.hash.empty() ? nullptr : each.source.hash.data();
        records.push_back({each.trail != nullptr ? each.trail->handle() : nullptr,
                           {each.source.uri.c_str(), each.source.size, each.source.mtime_ns, hash},
                           tags[i].data(),
                           tags[i].size()});
    }
    const kzcat_status status = kzcat_add(handle(), records.data(), records.size(), added.data());
    if (status != KZCAT_OK) {
        return detail::catalogue_failure(status);
    }
    return added;
}

inline result<std::vector<track>> catalogue::tracks() const
{
    std::vector<track> all;
    for (int64_t after = 0;;) {
        result<std::optional<track>> next = next_track(after);
        if (!next) {
            return next.error();
        }
        if (!next->has_value()) {
            return all;
        }
        after = (*next)->id();
        all.push_back(std::move(**next));
    }
}

/** Something that was noticed about a stream: as kzcat_event, with texts of its own. */
struct event {
    kzcat_event facts = {}; /**< its texts are null */
    std::string source;     /**< empty when no track is heard, or it has gone since */
    std::string title;      /**< empty when there is none */
    std::string artist;     /**< empty when there is none */
};

/** A stream that is followed: what ran from when to when. One thread at a time. */
class monitor {
public:
    static result<monitor> create(const format& of, const kzcat_monitor_options* options = nullptr)
    {
        const kzcat_format format = detail::c_format(of);
        kzcat_monitor* made = nullptr;
        const kzcat_status status = kzcat_monitor_create(&format, options, &made);
        return status == KZCAT_OK ? result<monitor>(monitor(made, of.encoding))
                                  : detail::catalogue_failure(status);
    }

    /** Feeds what follows, cut anywhere, looks it up, and returns what was noticed. */
    result<std::vector<event>> feed(const catalogue& tracks, const sound& samples)
    {
        if (!samples.fits(encoding_)) {
            return detail::other_samples();
        }
        return events_after(
            kzcat_monitor_feed(handle(), tracks.handle(), samples.bytes(), samples.size()));
    }
    /** Leaves out a part of the stream that was lost, 0 to 86400 s. */
    result<std::vector<event>> skip(const catalogue& tracks, double seconds)
    {
        return events_after(kzcat_monitor_skip(handle(), tracks.handle(), seconds));
    }
    /** Ends the stream, and with it what is going on. */
    result<std::vector<event>> finish(const catalogue& tracks)
    {
        return events_after(kzcat_monitor_finish(handle(), tracks.handle()));
    }

    kzcat_monitor* handle() const noexcept { return handle_.get(); }

private:
    monitor(kzcat_monitor* made, uint32_t encoding) : handle_(made), encoding_(encoding) {}

    /** After a failure events stay until the next call. */
    result<std::vector<event>> events_after(kzcat_status status)
    {
        std::vector<event> events;
        kzcat_event next = {};
        if (status != KZCAT_OK) {
            return detail::catalogue_failure(status);
        }
        while (kzcat_monitor_next_event(handle(), &next) == KZCAT_OK) {
            event copy = {next, detail::text_or_none(next.source), detail::text_or_none(next.title),
                          detail::text_or_none(next.artist)};
            copy.facts.source = copy.facts.title = copy.facts.artist = nullptr;
            events.push_back(std::move(copy));
        }
        return events;
    }

    detail::owner<kzcat_monitor, kzcat_monitor_free> handle_;
    uint32_t encoding_;
};

} // namespace cxx1
} // namespace kz
