// The threads of the HTTP server only look at heads; whatever reads the catalogue or decodes sound
// is done by threads of its own, which it waits for in a queue.

#include "kzfp/serve/service.hpp"

#include <chrono>
#include <filesystem>
#include <new>
#include <system_error>
#include <thread>
#include <utility>

#include "audio/source.hpp"
#include "kzfp/catalogue/files.hpp"
#include "kzfp/output/json_object.hpp"
#include "kzfp/output/write.hpp"
#include "kzfp/serve/clips.hpp"
#include "kzfp/serve/connections.hpp"
#include "kzfp/serve/track_tasks.hpp"

namespace kzfp::serve {

namespace {

constexpr unsigned kRefreshEvery = 10; ///< ticks
constexpr auto kQuiet = std::chrono::milliseconds(300);
constexpr auto kGrace = std::chrono::seconds(5); ///< for what is worked on when the time is over
constexpr auto kLastAnswers = std::chrono::seconds(1);
constexpr auto kLook = std::chrono::milliseconds(10);

Reply busy(const char* code, const char* message)
{
    Reply reply = error_reply(503, code, message);
    reply.headers = {{"Retry-After", "1"}};
    return reply;
}

/// The interface's description where it is installed; empty elsewhere.
std::string installed_description()
{
    namespace fs = std::filesystem;
    std::error_code error;
    const fs::path folder = fs::read_symlink("/proc/self/exe", error).parent_path();
    for (const char* const place :
         {"../share/kzfp/openapi.yaml", "../../../../docs/openapi.yaml"}) {
        if (!error && fs::exists(folder / place, error)) {
            return contents_of((folder / place).string(), size_t{1} << 20U);
        }
        error.clear();
    }
    return {};
}

/// What a failure of the catalogue is to a client: it is told no paths and no addresses.
Refusal refusal_of(const CatalogueError& error)
{
    if (error.status == KZCAT_ERROR_BUSY) {
        return {.reply = busy("catalogue_busy", "another program changes the catalogue; try again"),
                .reason = "catalogue_busy"};
    }
    if (error.status == KZCAT_ERROR_OTHER_PROFILE) {
        return {.reply = error_reply(400, "other_profile",
                                     "the clip was made by another profile; make its trail again"),
                .reason = "other_profile"};
    }
    write_message(std::string("the catalogue has failed: ") + error.what());
    if (error.status == KZCAT_ERROR_FULL) {
        return {.reply = error_reply(507, "disk_full", "there is no room to keep it"),
                .reason = "disk_full"};
    }
    return {.reply = error_reply(500, "catalogue_failed",
                                 "the catalogue could not be used; the service's messages say why"),
            .reason = "catalogue_failed"};
}

void set_refusal(Exchange& exchange, Refusal refusal)
{
    exchange.reply = std::move(refusal.reply);
    exchange.reason = std::move(refusal.reason);
}

/// Sets the reply to what `make` gives, or to what was wrong.
template <class Make>
void set_reply(Exchange& exchange, Make make) noexcept
{
    try {
        exchange.reply = make();
    } catch (Refusal& refusal) {
        set_refusal(exchange, std::move(refusal));
    } catch (const CatalogueError& error) {
        set_refusal(exchange, refusal_of(error));
    } catch (const std::bad_alloc&) {
        set_refusal(exchange, {.reply = busy("memory", "memory is short; try again later"),
                               .reason = "memory"});
    } catch (const std::exception& error) {
        write_message(std::string("a request failed: ") + error.what());
        set_refusal(exchange, {.reply = error_reply(500, "failed",
                                                    "the request failed; the "
                                                    "service's messages say why"),
                               .reason = "failed"});
    }
}

bool is_at_once(Task task)
{
    switch (task) {
    case Task::health:
    case Task::options:
    case Task::metrics:
    case Task::description:
    case Task::page:
    case Task::preflight:
        return true;
    default:
        return false;
    }
}

bool is_change(Task task) { return task == Task::add_track || task == Task::remove_track; }

Reply preflight(const Exchange& exchange, const Access& access)
{
    Reply reply = {.status = 204, .type = {}, .body = {}};
    reply.headers = {{"Allow", exchange.plan.path}};
    if (header_of(exchange.head, "Origin") == nullptr) {
        return reply;
    }
    if (!is_allowed_origin(exchange.head, access)) {
        check_origin(exchange.head, access);
        return reply;
    }
    reply.headers.push_back({"Access-Control-Allow-Methods", exchange.plan.path});
    reply.headers.push_back({"Access-Control-Allow-Headers", "Authorization, Content-Type"});
    reply.headers.push_back({"Access-Control-Max-Age", "600"});
    return reply;
}

/// What every answer has.
void add_headers(Exchange& exchange, const Access& access)
{
    std::vector<Header>& headers = exchange.reply->headers;
    headers.push_back({"X-Content-Type-Options", "nosniff"});
    if (exchange.plan.task != Task::page || exchange.reply->status >= 400) {
        headers.push_back({"Cache-Control", "no-store"});
        headers.push_back(
            {"Content-Security-Policy", "default-src 'none'; frame-ancestors 'none'"});
    }
    if (is_allowed_origin(exchange.head, access)) {
        headers.push_back({"Access-Control-Allow-Origin", *header_of(exchange.head, "Origin")});
        headers.push_back({"Access-Control-Expose-Headers", "Location, Retry-After"});
    }
    if (!access.origins.empty()) {
        headers.push_back({"Vary", "Origin"});
    }
}

} // namespace

Service::Service(const ServiceSettings& settings, Catalogues& catalogue)
    : settings_(settings), catalogue_(catalogue),
      page_(settings.page.empty() ? PageFiles() : PageFiles(settings.page)),
      description_(installed_description()), log_(settings.log, settings.log_addresses),
      lookups_(settings.lookups, settings.places, [this](Exchange& exchange) { work(exchange); }),
      changes_(1, settings.places, [this](Exchange& exchange) { work(exchange); }),
      server_(std::make_unique<HttpServer>(settings.http, *this))
{
    served_.count_down();
}

Service::~Service() = default;

void Service::begin(Exchange& exchange) noexcept
{
    try {
        exchange.plan = plan_of(exchange.head, settings_.rules);
        exchange.largest_body = largest_body(exchange.plan, settings_.rules);
    } catch (Refusal& refusal) {
        set_refusal(exchange, std::move(refusal));
    } catch (const std::exception&) {
        set_reply(exchange, [] { return busy("memory", "memory is short; try again later"); });
    }
    if (exchange.reply) {
        add_headers(exchange, settings_.rules.access);
    }
}

void Service::complete(Exchange& exchange) noexcept
{
    try {
        add_headers(exchange, settings_.rules.access);
    } catch (const std::bad_alloc&) {
        return; // an answer with fewer headers
    }
}

WorkQueue& Service::queue_of(const Exchange& exchange)
{
    return is_change(exchange.plan.task) ? changes_ : lookups_;
}

bool Service::takes_longer(Exchange& exchange) noexcept
{
    if (!is_at_once(exchange.plan.task) && queue_of(exchange).reserve()) {
        return true;
    }
    set_reply(exchange, [this, &exchange] {
        if (!is_at_once(exchange.plan.task) && queue_of(exchange).is_closed()) {
            exchange.reason = "stopping";
            return busy("stopping", "the service stops; try again");
        }
        if (!is_at_once(exchange.plan.task)) {
            exchange.reason = "queue_full";
            return busy("queue_full", "too many requests wait already; try again in a second");
        }
        return answer_at_once(exchange);
    });
    add_headers(exchange, settings_.rules.access);
    return false;
}

void Service::submit(Exchange& exchange) noexcept { queue_of(exchange).push(exchange); }

Reply Service::answer_at_once(const Exchange& exchange) const
{
    switch (exchange.plan.task) {
    case Task::health:
        return health(exchange);
    case Task::options:
        return options();
    case Task::metrics: {
        served_.wait(); // the first request can be faster than the constructor
        const Catalogues::Facts facts = catalogue_.facts();
        return {.status = 200,
                .type = "text/plain; version=0.0.4; charset=utf-8",
                .body = metrics_.text({.queue_length = lookups_.length(),
                                       .queue_capacity = lookups_.places(),
                                       .connections = server_->connections(),
                                       .tracks = facts.tracks,
                                       .codes = facts.codes})};
    }
    case Task::description:
        if (description_.empty()) {
            refuse(404, "no_such_address",
                   "the description is not installed; docs/service.md has it");
        }
        return {.status = 200, .type = "application/yaml", .body = description_};
    case Task::preflight:
        return preflight(exchange, settings_.rules.access);
    default:
        return page_.reply(exchange.head, exchange.plan.path);
    }
}

Reply Service::health(const Exchange& exchange) const
{
    const Catalogues::Facts facts = catalogue_.facts();
    JsonObject object = JsonObject::object_t();
    object["status"] = drains_ ? "draining" : facts.is_read ? "ok" : "failing";
    if (exchange.plan.may_read) {
        object["version"] = KZFP_VERSION;
        object["tracks"] = facts.tracks;
        object["codes"] = facts.codes;
        object["profile"] = "standard";
    }
    return json_reply(drains_ || !facts.is_read ? 503 : 200, to_line(object));
}

Reply Service::options() const
{
    JsonObject object = JsonObject::object_t();
    object["version"] = KZFP_VERSION;
    object["audio"] = settings_.rules.audio;
    object["token"] = settings_.rules.access.read.is_set();
    object["max_body"] = settings_.rules.largest_body;
    object["longest_clip"] = settings_.longest_clip;
    object["write"] = settings_.rules.writes;
    return json_reply(200, to_line(object));
}

Reply Service::answer(Exchange& exchange)
{
    const Plan& plan = exchange.plan;
    const auto reading = catalogue_.reading();
    switch (plan.task) {
    case Task::match: {
        const auto begin = std::chrono::steady_clock::now();
        Found found =
            find_clip(*reading, plan, exchange.body,
                      {.longest = settings_.longest_clip, .hide_sources = settings_.hide_sources});
        const std::chrono::duration<double> took = std::chrono::steady_clock::now() - begin;
        metrics_.count_lookup(word_of(plan.body), found.verdict, took.count());
        return std::move(found.reply);
    }
    case Task::list_tracks:
        return list_tracks(*reading, plan, settings_.hide_sources);
    case Task::show_track:
        return show_track(*reading, plan, settings_.hide_sources);
    case Task::show_trail:
        return show_trail(*reading, plan);
    case Task::add_track: {
        Addition addition = add_track(catalogue_.writing(), plan, exchange.body);
        if (addition.was_there && plan.documents) {
            catalogue_.open_again();
        }
        catalogue_.refresh();
        return std::move(addition.reply);
    }
    default: {
        Reply reply = remove_track(catalogue_.writing(), plan);
        catalogue_.refresh();
        return reply;
    }
    }
}

void Service::work(Exchange& exchange) noexcept
{
    set_reply(exchange, [this, &exchange] { return answer(exchange); });
    finish(exchange);
}

void Service::finish(Exchange& exchange)
{
    std::string().swap(exchange.body);
    add_headers(exchange, settings_.rules.access);
    served_.wait();
    server_->resume(exchange);
}

void Service::end(const Exchange& exchange, bool sent) noexcept
{
    try {
        metrics_.count_request(std::string(exchange.plan.route),
                               exchange.reply && sent ? exchange.reply->status : 0);
        if (!exchange.reason.empty()) {
            metrics_.count_refusal(exchange.reason);
        }
        log_.write(exchange, sent);
    } catch (const std::exception&) {
        return; // a line less
    }
}

void Service::tick()
{
    server_->close_slow_ones();
    if (++ticks_ % kRefreshEvery == 0) {
        catalogue_.refresh();
    }
}

/// Clients that keep their connections are told with their next answer that these end, so it takes
/// a while without requests until all have been.
size_t Service::drain(uint32_t seconds)
{
    drains_ = true;
    server_->stop_accepting();
    wait_for_quiet(Clock::now() + std::chrono::seconds(seconds));
    for (WorkQueue* const queue : {&lookups_, &changes_}) {
        for (Exchange* const exchange : queue->close()) {
            set_reply(*exchange, [] { return busy("stopping", "the service stops; try again"); });
            exchange->reason = "stopping";
            finish(*exchange);
        }
    }
    const auto end = Clock::now() + kGrace;
    const size_t left = lookups_.busy_at(end) + changes_.busy_at(end);
    wait_for_quiet(Clock::now() + kLastAnswers);
    if (left == 0) {
        server_->stop();
    }
    return left;
}

void Service::wait_for_quiet(Clock::time_point end) const
{
    auto quiet_since = Clock::now();
    while (Clock::now() < end && Clock::now() - quiet_since < kQuiet) {
        std::this_thread::sleep_for(kLook);
        if (server_->exchanges() != 0) {
            quiet_since = Clock::now();
        }
    }
}

} // namespace kzfp::serve
