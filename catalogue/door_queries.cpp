// The C interface: queries, and what was recognised.

#include <algorithm>

#include "catalogue/handles.hpp"

namespace {

using namespace kzcat;

constexpr uint32_t kMostCandidates = 1000;

void check_taking(const kzcat_query& query)
{
    if (!query.extractor) {
        throw Failure(KZCAT_ERROR_ORDER,
                      "the query is finished already; create another one for more sound");
    }
    if (query.broken) {
        throw Failure(KZCAT_ERROR_MEMORY, "memory was short while the query took sound, and some "
                                          "may be lost; free some, create another one and feed it "
                                          "from the start");
    }
}

MatchOptions to_match_options(const kzcat_match_options* given)
{
    kzcat_match_options options;
    kzcat_initialize_match_options(&options);
    if (given != nullptr) {
        options = *given;
    }
    require(options.speeds <= 1 && options.passages <= 1 && all_zero(options.reserved),
            "a field of the options is out of range; fill them with "
            "kzcat_initialize_match_options()");
    require(options.candidates <= kMostCandidates, "more than 1000 candidates are wanted; pass up "
                                                   "to 1000");
    // The second best is needed for the summary.
    return {.speeds = options.speeds == 1,
            .candidates = std::max(options.candidates, uint32_t{2}),
            .passages = options.passages == 1};
}

uint32_t to_number(Verdict verdict)
{
    switch (verdict) {
    case Verdict::match:
        return KZCAT_VERDICT_MATCH;
    case Verdict::no_match:
        return KZCAT_VERDICT_NO_MATCH;
    case Verdict::not_sure:
        return KZCAT_VERDICT_NOT_SURE;
    case Verdict::too_quiet:
        break;
    }
    return KZCAT_VERDICT_TOO_QUIET;
}

kzcat_found to_found(const TrackMatch& match)
{
    kzcat_found found;
    found.record.track = match.track;
    found.record.score = match.score;
    found.record.threshold = match.threshold;
    found.record.offset = match.offset;
    found.record.speed = match.speed;
    found.record.tempo = match.tempo;
    found.record.pitch = match.pitch;
    found.record.clip_begin = match.clip_begin;
    found.record.clip_end = match.clip_end;
    found.record.by = KZCAT_BY_TRAIL;
    return found;
}

kzcat_found to_found(const DocumentMatch& match)
{
    kzcat_found found;
    found.record.track = match.track;
    found.record.score = match.score;
    found.record.threshold = match.threshold;
    found.record.offset = match.offset;
    found.record.speed = found.record.tempo = found.record.pitch = 1;
    found.record.by = KZCAT_BY_DOCUMENT;
    found.record.weak = match.weak ? 1 : 0;
    return found;
}

template <class Match>
std::vector<kzcat_found> to_found(Catalogue& catalogue, const std::vector<Match>& matches,
                                  size_t most)
{
    std::vector<kzcat_found> all;
    for (const Match& match : matches) {
        if (all.size() < most) {
            all.push_back(to_found(match));
        }
    }
    catalogue.with_store([&](Store& store) {
        for (kzcat_found& found : all) {
            found.names = names_of(store, found.record.track);
        }
    });
    return all;
}

/// Fills a result with an answer, of either kind.
template <class Answer>
void fill(kzcat_result& result, Catalogue& catalogue, const Answer& answer, size_t candidates)
{
    result.matches = to_found(catalogue, answer.matches, answer.matches.size());
    result.candidates = to_found(catalogue, answer.candidates, candidates);
    result.summary.verdict = to_number(answer.verdict);
    result.summary.match_count = result.matches.size();
    result.summary.candidate_count = result.candidates.size();
    result.summary.runner_up = answer.runner_up;
    result.summary.left_out =
        static_cast<uint32_t>(catalogue.left_out(result.summary.by == KZCAT_BY_DOCUMENT));
}

void look_up(Catalogue& catalogue, const kzcat_query& query, const MatchOptions& options,
             size_t candidates, kzcat_result& result)
{
    if (const auto* values = std::get_if<DocumentValues>(&query.content)) {
        result.summary.by = KZCAT_BY_DOCUMENT;
        result.summary.shards = result.summary.shards_answered = 1;
        fill(result, catalogue, catalogue.recognise(*values, options.candidates), candidates);
        return;
    }
    result.summary.by = KZCAT_BY_TRAIL;
    const auto* bands = std::get_if<QueryBands>(&query.content);
    const Recognised answer = bands != nullptr
                                  ? catalogue.recognise(*bands, options)
                                  : catalogue.recognise(std::get<Trail>(query.content), options);
    result.summary.shards = answer.shards.of;
    result.summary.shards_answered = answer.shards.answered;
    result.summary.clip_seconds = bands != nullptr
                                      ? static_cast<double>(bands->samples) / kWorkingRate
                                      : std::get<Trail>(query.content).seconds();
    fill(result, catalogue, answer, candidates);
}

/// A record with pointers to the texts beside it.
kzcat_match record_of(const kzcat_found& found)
{
    kzcat_match record = found.record;
    record.source = found.names.source.c_str();
    record.title = found.names.title ? found.names.title->c_str() : nullptr;
    record.artist = found.names.artist ? found.names.artist->c_str() : nullptr;
    return record;
}

/// Runs a call that reports one of the tracks that were found.
kzcat_status give_match(const kzcat_result* result, std::vector<kzcat_found> kzcat_result::*list,
                        uint64_t place, kzcat_match* out_match) noexcept
{
    return guarded([=] {
        require(result != nullptr && out_match != nullptr,
                "the result or the record for the match is null; pass both");
        *out_match = {};
        const std::vector<kzcat_found>& all = result->*list;
        if (place >= all.size()) {
            throw Failure(KZCAT_ERROR_NOT_FOUND,
                          "the result has " + std::to_string(all.size()) + " of these");
        }
        *out_match = record_of(all[static_cast<size_t>(place)]);
    });
}

} // namespace

kzcat_names kzcat::names_of(Store& store, int64_t track)
{
    kzcat_names names;
    const auto info = store.find_track(track);
    if (!info) {
        return names; // removed meanwhile
    }
    if (!info->sources.empty()) {
        names.source = info->sources.front().uri;
    }
    for (const Tag& tag : info->tags) {
        if (tag.name == "title" && !names.title) {
            names.title = tag.value;
        } else if (tag.name == "artist" && !names.artist) {
            names.artist = tag.value;
        }
    }
    return names;
}

kzcat_status kzcat_query_create(const kzcat_format* format, kzcat_query** out_query) noexcept
{
    return guarded([=] {
        clear_place(out_query);
        const SoundFormat sound = to_sound_format(format);
        auto query = std::make_unique<kzcat_query>();
        with_format_checked([&] { query->extractor.emplace(sound); });
        *out_query = query.release();
    });
}

kzcat_status kzcat_query_feed(kzcat_query* query, const void* bytes, uint64_t byte_count) noexcept
{
    return guarded([=] {
        require(query != nullptr, "the query is null; create one");
        const auto taken = bytes_of(bytes, byte_count);
        check_taking(*query);
        query->broken = true;
        query->extractor->feed(taken);
        query->broken = false;
    });
}

kzcat_status kzcat_query_finish(kzcat_query* query) noexcept
{
    return guarded([=] {
        require(query != nullptr, "the query is null; create one");
        check_taking(*query);
        query->broken = true;
        query->content = query->extractor->finish();
        query->broken = false;
        query->extractor.reset();
    });
}

kzcat_status kzcat_query_create_from_trail(const kzcat_trail* trail,
                                           kzcat_query** out_query) noexcept
{
    return guarded([=] {
        clear_place(out_query);
        require(trail != nullptr, "the trail is null; pass one");
        auto query = std::make_unique<kzcat_query>();
        query->content = trail->trail;
        *out_query = query.release();
    });
}

kzcat_status kzcat_query_create_from_document(const char* text, uint64_t byte_count,
                                              kzcat_query** out_query) noexcept
{
    return guarded([=] {
        clear_place(out_query);
        const auto bytes = bytes_of(text, byte_count);
        auto query = std::make_unique<kzcat_query>();
        query->content = read_document({text, bytes.size()});
        *out_query = query.release();
    });
}

kzcat_status kzcat_query_create_from_values(const int16_t* values, uint32_t count,
                                            kzcat_query** out_query) noexcept
{
    return guarded([=] {
        clear_place(out_query);
        require(values != nullptr, "the values are null; pass 30");
        require(count == kDocumentValueCount, "a document has 30 values; pass as many");
        auto query = std::make_unique<kzcat_query>();
        query->content = checked_values({values, count});
        *out_query = query.release();
    });
}

kzcat_status kzcat_query_free(kzcat_query** query_ref) noexcept { return free_handle(query_ref); }

const char* kzcat_verdict_text(uint32_t verdict) noexcept
{
    switch (verdict) {
    case KZCAT_VERDICT_MATCH:
        return "match";
    case KZCAT_VERDICT_NO_MATCH:
        return "no match";
    case KZCAT_VERDICT_NOT_SURE:
        return "not sure";
    case KZCAT_VERDICT_TOO_QUIET:
        return "too quiet";
    default:
        return "";
    }
}

kzcat_status kzcat_initialize_match_options(kzcat_match_options* options) noexcept
{
    return guarded([=] {
        require(options != nullptr, "the options are null; pass a record");
        *options = {};
        options->speeds = 1;
        options->candidates = 2;
    });
}

kzcat_status kzcat_recognise(kzcat_catalogue* catalogue, const kzcat_query* query,
                             const kzcat_match_options* options, kzcat_result** out_result) noexcept
{
    return guarded([=] {
        clear_place(out_result);
        require(catalogue != nullptr && query != nullptr,
                "the catalogue or the query is null; pass both");
        if (query->extractor) {
            throw Failure(KZCAT_ERROR_ORDER,
                          "the query is not finished; call kzcat_query_finish() first");
        }
        const MatchOptions chosen = to_match_options(options);
        const size_t wanted = options == nullptr ? 2 : options->candidates;
        auto result = std::make_unique<kzcat_result>();
        look_up(catalogue->whole, *query, chosen, wanted, *result);
        *out_result = result.release();
    });
}

kzcat_status kzcat_result_get_summary(const kzcat_result* result,
                                      kzcat_summary* out_summary) noexcept
{
    return guarded([=] {
        require(result != nullptr && out_summary != nullptr,
                "the result or the record for the summary is null; pass both");
        *out_summary = result->summary;
    });
}

kzcat_status kzcat_result_get_match(const kzcat_result* result, uint64_t place,
                                    kzcat_match* out_match) noexcept
{
    return give_match(result, &kzcat_result::matches, place, out_match);
}

kzcat_status kzcat_result_get_candidate(const kzcat_result* result, uint64_t place,
                                        kzcat_match* out_match) noexcept
{
    return give_match(result, &kzcat_result::candidates, place, out_match);
}

kzcat_status kzcat_result_free(kzcat_result** result_ref) noexcept
{
    return free_handle(result_ref);
}
