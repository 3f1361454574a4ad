// In the order in which a request can be wrong: its form, whom it is sent to, what it asks for, who
// asks, and how.

#include "kzfp/serve/plan.hpp"

#include <algorithm>
#include <array>
#include <charconv>
#include <iterator>
#include <limits>
#include <optional>

namespace kzfp::serve {

namespace {

constexpr uint64_t kLargestTrail = uint64_t{2} << 20U; // 13 hours
constexpr uint64_t kLargestDocument = uint64_t{64} << 10U;
constexpr uint64_t kLargestValues = uint64_t{4} << 10U;
constexpr uint64_t kLargestTrackTrail = uint64_t{16} << 20U;
constexpr uint32_t kMostTracks = 1000;
constexpr uint32_t kMostCandidates = 100;

/// Fields that would be understood in two ways if there were two of them.
constexpr std::array kSingleHeaders = {"Host",           "Authorization", "Content-Type",
                                       "Content-Length", "Origin",        "Transfer-Encoding"};

enum class Needs { nothing, reading, writing };

struct Way {
    std::string_view method;
    std::string_view route;
    Task task;
    Needs needs;
};

constexpr Way kWays[] = {
    {"POST", "/v1/match", Task::match, Needs::reading},
    {"GET", "/v1/tracks", Task::list_tracks, Needs::reading},
    {"POST", "/v1/tracks", Task::add_track, Needs::writing},
    {"GET", "/v1/tracks/ID", Task::show_track, Needs::reading},
    {"DELETE", "/v1/tracks/ID", Task::remove_track, Needs::writing},
    {"GET", "/v1/tracks/ID/trail", Task::show_trail, Needs::reading},
    {"GET", "/v1/health", Task::health, Needs::nothing},
    {"GET", "/v1/options", Task::options, Needs::nothing},
    {"GET", "/v1/openapi.yaml", Task::description, Needs::nothing},
    {"GET", "/metrics", Task::metrics, Needs::reading},
};

/// Whoever passes requests on must not see another end of the body than the service does.
void check_framing(const RequestHead& head)
{
    const std::string* const coding = header_of(head, "Transfer-Encoding");
    if (coding == nullptr) {
        return;
    }
    if (header_of(head, "Content-Length") != nullptr || !same_name(*coding, "chunked")) {
        refuse(400, "bad_framing",
               "the end of the body is not stated in one way; send Content-Length, or "
               "Transfer-Encoding: chunked, and nothing else",
               {{"Connection", "close"}});
    }
}

void check_headers(const RequestHead& head)
{
    for (const char* const name : kSingleHeaders) {
        const auto count = std::ranges::count_if(
            head.headers, [name](const Header& header) { return same_name(header.name, name); });
        if (count > 1) {
            refuse(400, "repeated_header",
                   std::string("the request has more than one field ") + name + "; send one");
        }
    }
    check_framing(head);
}

/// The number of a track; nothing when it is none.
std::optional<int64_t> track_in(std::string_view text)
{
    int64_t number = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    const bool is_number = error == std::errc() && end == text.data() + text.size();
    return is_number && number > 0 && text.front() != '0' ? std::optional(number) : std::nullopt;
}

/// The pattern of a path, and its number if it has one.
struct Routed {
    std::string route;
    int64_t track = 0;
};

Routed routed(const std::string& path)
{
    constexpr std::string_view kTracks = "/v1/tracks/";
    constexpr std::string_view kTrail = "/trail";
    if (!path.starts_with(kTracks)) {
        return {.route = path};
    }
    std::string_view rest = std::string_view{path}.substr(kTracks.size());
    const bool is_trail = rest.ends_with(kTrail);
    rest.remove_suffix(is_trail ? kTrail.size() : 0);
    const auto track = rest.empty() ? std::nullopt : track_in(rest);
    if (!track) {
        refuse(404, "no_such_track", "tracks have numbers above 0; list them with /v1/tracks");
    }
    return {.route = is_trail ? "/v1/tracks/ID/trail" : "/v1/tracks/ID", .track = *track};
}

std::string allowed_methods(const std::string& route)
{
    std::string methods;
    for (const Way& way : kWays) {
        if (way.route == route) {
            methods.append(methods.empty() ? "" : ", ").append(way.method);
            methods.append(way.method == "GET" ? ", HEAD" : "");
        }
    }
    return methods.empty() ? "GET, HEAD, OPTIONS" : methods + ", OPTIONS";
}

[[noreturn]] void refuse_method(const std::string& route)
{
    const std::string methods = allowed_methods(route);
    refuse(405, "wrong_method", "this address takes other methods: " + methods,
           {{"Allow", methods}});
}

const Way& way_of(const std::string& method, const std::string& route)
{
    static constexpr Way kPage = {"GET", "/", Task::page, Needs::nothing};
    const std::string_view wanted = method == "HEAD" ? "GET" : std::string_view{method};
    bool is_route = false;
    for (const Way& way : kWays) {
        if (way.route == route && way.method == wanted) {
            return way;
        }
        is_route = is_route || way.route == route;
    }
    if (!is_route && route.starts_with("/v1/")) {
        refuse(404, "no_such_address", "there is nothing at this address; /v1/match recognises");
    }
    if (is_route || wanted != "GET") {
        refuse_method(route);
    }
    return kPage;
}

void check_needs(const RequestHead& head, const Way& way, const Rules& rules, Plan& plan)
{
    plan.may_read = may_read(head, rules.access);
    if (way.needs == Needs::writing && !rules.writes) {
        refuse(403, "writing_is_off",
               "this service does not change its catalogue; start it with --write-token-file");
    }
    if (way.needs == Needs::writing && !may_write(head, rules.access)) {
        refuse_without_token(head, "--write-token-file");
    }
    if (way.needs == Needs::reading && !plan.may_read) {
        refuse_without_token(head, "--token-file");
    }
    if (way.needs != Needs::nothing) {
        check_origin(head, rules.access);
    }
}

/// The kind of body that a type stands for.
BodyKind kind_of(const std::string& type)
{
    const std::string name = to_lower(type.substr(0, type.find_first_of("; \t")));
    if (name == "application/x-kzt") {
        return BodyKind::trail;
    }
    if (name == "application/xml" || name == "text/xml") {
        return BodyKind::document;
    }
    if (name == "application/json") {
        return BodyKind::values;
    }
    return name.starts_with("audio/") || name == "video/mp4" || name == "video/webm"
               ? BodyKind::sound
               : BodyKind::none;
}

BodyKind body_of(const RequestHead& head, const Plan& plan, const Rules& rules)
{
    const std::string* const type = header_of(head, "Content-Type");
    const BodyKind kind = type == nullptr ? BodyKind::none : kind_of(*type);
    const bool adds = plan.task == Task::add_track;
    if (kind == BodyKind::none ||
        (adds && (kind == BodyKind::document || kind == BodyKind::values))) {
        refuse(415, "wrong_type",
               adds ? "a track is added from application/x-kzt (a trail) or audio/* (a sound "
                      "file); say which with Content-Type"
                    : "what is looked up is application/x-kzt (a trail), application/xml (a query "
                      "document), application/json (30 values) or audio/* (a sound file); say "
                      "which with Content-Type");
    }
    if (kind == BodyKind::sound && !rules.audio) {
        refuse(403, "audio_is_off",
               "this service takes no sound; send its trail: kzfp fingerprint makes query "
               "documents, the page and libkzcat make trails");
    }
    const std::string* const encoding = header_of(head, "Content-Encoding");
    if (encoding != nullptr && !same_name(*encoding, "identity")) {
        refuse(415, "wrong_encoding", "the body is encoded; send it as it is");
    }
    return kind;
}

uint64_t number_in(const Parameter& parameter, uint64_t lowest, uint64_t highest)
{
    const std::string& text = parameter.value;
    uint64_t number = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (error != std::errc() || end != text.data() + text.size() || number < lowest ||
        number > highest) {
        refuse(400, "bad_parameter",
               parameter.name + " is a whole number from " + std::to_string(lowest) + " to " +
                   std::to_string(highest));
    }
    return number;
}

bool is_on(const Parameter& parameter) { return number_in(parameter, 0, 1) == 1; }

/// Takes a parameter of a look-up; false when it is none.
bool take_of_match(const Parameter& parameter, Lookup& lookup)
{
    if (parameter.name == "top") {
        const auto count = static_cast<uint32_t>(number_in(parameter, 0, kMostCandidates));
        lookup.candidates = count == 0 ? std::nullopt : std::optional(count);
    } else if (parameter.name == "passages") {
        lookup.passages = is_on(parameter);
    } else if (parameter.name == "speeds") {
        lookup.speeds = is_on(parameter);
    } else {
        return false;
    }
    return true;
}

/// The same of a list.
bool take_of_list(const Parameter& parameter, Plan& plan)
{
    constexpr auto kLast = static_cast<uint64_t>(std::numeric_limits<int64_t>::max());
    if (parameter.name == "after") {
        plan.after = static_cast<int64_t>(number_in(parameter, 0, kLast));
    } else if (parameter.name == "limit") {
        plan.count = static_cast<uint32_t>(number_in(parameter, 1, kMostTracks));
    } else if (parameter.name == "source" && !parameter.value.empty()) {
        plan.source = parameter.value;
    } else {
        return false;
    }
    return true;
}

/// The same of a track that is added.
bool take_of_track(const Parameter& parameter, Plan& plan)
{
    constexpr std::array kTags = {"title", "artist", "album", "tracknumber", "date", "genre"};
    if (parameter.name == "source" && !parameter.value.empty()) {
        plan.source = parameter.value;
    } else if (parameter.name == "documents") {
        plan.documents = is_on(parameter);
    } else if (std::ranges::find(kTags, parameter.name) != kTags.end()) {
        if (!is_utf8(parameter.value)) {
            refuse(400, "bad_parameter", parameter.name + " is not UTF-8");
        }
        plan.tags.push_back(parameter);
    } else {
        return false;
    }
    return true;
}

std::string known_parameters(Task task)
{
    switch (task) {
    case Task::match:
        return "there are top, passages and speeds";
    case Task::list_tracks:
        return "there are after, limit and source";
    case Task::add_track:
        return "there are source, title, artist, album, tracknumber, date, genre and documents";
    default:
        return "this address has none";
    }
}

bool take(const Parameter& parameter, Plan& plan)
{
    switch (plan.task) {
    case Task::match:
        return take_of_match(parameter, plan.lookup);
    case Task::list_tracks:
        return take_of_list(parameter, plan);
    case Task::add_track:
        return take_of_track(parameter, plan);
    default:
        return plan.task == Task::page; // whose own scripts may have some
    }
}

/// Parameters that would have no effect beside what else is sent.
void check_fit(const std::vector<Parameter>& parameters, const Plan& plan)
{
    const auto has = [&parameters](std::string_view name) {
        return std::ranges::find(parameters, name, &Parameter::name) != parameters.end();
    };
    if (plan.documents && plan.body == BodyKind::trail) {
        refuse(400, "bad_parameter",
               "documents=1 takes a sound file; a trail answers documents if it was made so");
    }
    if (plan.lookup.passages &&
        (plan.body == BodyKind::document || plan.body == BodyKind::values)) {
        refuse(400, "bad_parameter", "passages=1 takes a trail or sound");
    }
    if (plan.task == Task::list_tracks && has("source") && (has("after") || has("limit"))) {
        refuse(400, "bad_parameter", "source finds one track; leave out after and limit");
    }
}

void take_parameters(const std::vector<Parameter>& parameters, Plan& plan)
{
    for (const Parameter& parameter : parameters) {
        const auto same = std::ranges::count(parameters, parameter.name, &Parameter::name);
        if (same > 1 && plan.task != Task::page) {
            refuse(400, "bad_parameter", "a parameter is there more than once; send it once");
        }
        if (!take(parameter, plan)) {
            refuse(400, "unknown_parameter",
                   "a parameter is unknown or empty; " + known_parameters(plan.task));
        }
    }
    check_fit(parameters, plan);
    if (plan.task == Task::add_track && plan.source.empty()) {
        refuse(400, "source_missing",
               "a track needs a name by which it is found again; add ?source=NAME");
    }
}

/// A body that nobody wants would be taken for the next request if it were left unread.
void check_has_no_body(const RequestHead& head)
{
    const std::string* const length = header_of(head, "Content-Length");
    if ((length != nullptr && *length != "0") || header_of(head, "Transfer-Encoding") != nullptr) {
        refuse(400, "unwanted_body", "this request takes no body; send it without one");
    }
}

} // namespace

Plan plan_of(const RequestHead& head, const Rules& rules)
{
    check_headers(head);
    const Target target = parse_target(head.target);
    check_host(head, rules.access);
    if (head.method == "OPTIONS") {
        return {.task = Task::preflight,
                .route = "(preflight)",
                .path = allowed_methods(routed(target.path).route)};
    }
    const Routed found = routed(target.path);
    const Way& way = way_of(head.method, found.route);
    Plan plan = {.task = way.task, .route = way.route, .track = found.track, .path = target.path};
    check_needs(head, way, rules, plan);
    if (way.method == "POST") {
        plan.body = body_of(head, plan, rules);
    } else {
        check_has_no_body(head);
    }
    take_parameters(target.parameters, plan);
    return plan;
}

uint64_t largest_body(const Plan& plan, const Rules& rules)
{
    switch (plan.body) {
    case BodyKind::trail:
        return plan.task == Task::add_track ? kLargestTrackTrail : kLargestTrail;
    case BodyKind::document:
        return kLargestDocument;
    case BodyKind::values:
        return kLargestValues;
    case BodyKind::sound:
        return rules.largest_body;
    case BodyKind::none:
        break;
    }
    return 0;
}

Reply body_too_large(uint64_t largest)
{
    return error_reply(413, "body_too_large",
                       "the body is larger than the " + std::to_string(largest) +
                           " bytes that this address takes of its kind; send less, such as a "
                           "shorter part");
}

} // namespace kzfp::serve
