// Requests as a network can send them: any method, target, headers and body. Each is understood, or
// refused with a status of the client's and an error that is JSON with a code and a sentence; what
// is understood keeps within what was allowed.

#include <array>
#include <filesystem>
#include <fstream>
#include <string>
#include <system_error>

#include <nlohmann/json.hpp>

#include "audio/source.hpp"
#include "fuzz.hpp"
#include "kzfp/serve/clips.hpp"
#include "kzfp/serve/page_files.hpp"
#include "kzfp/serve/plan.hpp"

namespace kz::fuzz {

namespace {

using namespace ::kzfp::serve;

constexpr const char* kMethods[] = {"GET", "HEAD", "POST", "DELETE", "OPTIONS", "PUT"};

constexpr const char* kTargets[] = {"/",
                                    "/v1/match",
                                    "/v1/match?top=3&passages=1&speeds=0",
                                    "/v1/tracks",
                                    "/v1/tracks?after=2&limit=9",
                                    "/v1/tracks?source=",
                                    "/v1/tracks?documents=1&title=%C3%BC&source=",
                                    "/v1/tracks/7",
                                    "/v1/tracks/7/trail",
                                    "/v1/health",
                                    "/v1/options",
                                    "/v1/openapi.yaml",
                                    "/metrics",
                                    "/app/main.js"};

constexpr const char* kNames[] = {"Host",           "Authorization",     "Content-Type",
                                  "Content-Length", "Transfer-Encoding", "Origin",
                                  "If-None-Match",  "Accept-Encoding",   "Content-Encoding"};

constexpr const char* kValues[] = {"localhost",
                                   "[::1]:80",
                                   "music.example",
                                   "Bearer 0123456789abcdef",
                                   "application/x-kzt",
                                   "application/json; charset=utf-8",
                                   "text/xml",
                                   "audio/wav",
                                   "0",
                                   "chunked",
                                   "https://a.example",
                                   "gzip;q=0, *",
                                   "\"\", *"};

template <size_t count>
std::string text_of(Choices& choices, const char* const (&known)[count])
{
    std::string text = one_in(choices, 4) ? "" : choices.PickValueInArray(known);
    return one_in(choices, 3) ? text + choices.ConsumeRandomLengthString(64) : text;
}

RequestHead some_head(Choices& choices)
{
    RequestHead head = {.method = text_of(choices, kMethods),
                        .target = text_of(choices, kTargets),
                        .headers = {{"Host", "localhost"}}};
    for (auto count = choices.ConsumeIntegralInRange<int>(0, 6); count > 0; --count) {
        head.headers.push_back({text_of(choices, kNames), text_of(choices, kValues)});
    }
    if (one_in(choices, 3)) {
        head.headers.erase(head.headers.begin());
    }
    return head;
}

Rules some_rules(Choices& choices)
{
    Rules rules;
    rules.audio = choices.ConsumeBool();
    rules.writes = choices.ConsumeBool();
    rules.access.hosts = {"music.example"};
    if (choices.ConsumeBool()) {
        rules.access.read = Token("0123456789abcdef");
    }
    if (rules.writes) {
        rules.access.write = Token("0123456789abcdef");
    }
    if (choices.ConsumeBool()) {
        rules.access.origins = {choices.ConsumeBool() ? "*" : "https://a.example"};
    }
    return rules;
}

void check_refusal(const Refusal& refusal)
{
    ASSERT_GE(refusal.reply.status, 400U);
    ASSERT_LT(refusal.reply.status, 500U);
    const auto object = nlohmann::json::parse(refusal.reply.body);
    ASSERT_EQ(refusal.reason, object.at("error").at("code"));
    ASSERT_NE("", object.at("error").at("message"));
}

void check_plan(const RequestHead& head, const Plan& plan, const Rules& rules)
{
    ASSERT_NE(Task::none, plan.task);
    ASSERT_EQ(head.method == "POST", plan.body != BodyKind::none);
    ASSERT_EQ(plan.body == BodyKind::none, largest_body(plan, rules) == 0);
    ASSERT_LE(plan.lookup.candidates.value_or(1), 100U);
    ASSERT_GE(plan.lookup.candidates.value_or(1), 1U);
    ASSERT_GE(plan.count, 1U);
    ASSERT_LE(plan.count, 1000U);
    ASSERT_GE(plan.after, 0);
    const bool has_number = plan.route.find("ID") != std::string_view::npos;
    ASSERT_EQ(has_number, plan.track > 0);
    const bool changes = plan.task == Task::add_track || plan.task == Task::remove_track;
    ASSERT_TRUE(!changes || (rules.writes && may_write(head, rules.access)));
    ASSERT_TRUE(plan.body != BodyKind::sound || rules.audio);
    ASSERT_TRUE(plan.task != Task::add_track || !plan.source.empty());
}

/// A page of two files, one of which is packed too.
const PageFiles& page()
{
    static const PageFiles files = [] {
        namespace fs = std::filesystem;
        std::string folder = (fs::temp_directory_path() / "kz-fuzz-XXXXXX").string();
        if (::mkdtemp(folder.data()) == nullptr) {
            throw std::system_error(errno, std::generic_category(), folder);
        }
        fs::create_directory(folder + "/app");
        for (const char* const name : {"/index.html", "/app/main.js", "/app/main.js.gz"}) {
            std::ofstream(folder + name) << name;
        }
        PageFiles read(folder);
        fs::remove_all(folder);
        return read;
    }();
    return files;
}

void send_page(const RequestHead& head, const Plan& plan)
{
    const Reply reply = page().reply(head, plan.path);
    ASSERT_TRUE(reply.status == 304 || (reply.shared && reply.shared->size() > 10));
}

void look_at_body(const std::string& body)
{
    try {
        ASSERT_EQ(30U, values_of(body).size());
    } catch (const Refusal& refusal) {
        check_refusal(refusal);
    }
    try {
        ASSERT_NE(nullptr, trail_of(body).get());
    } catch (const Refusal& refusal) {
        check_refusal(refusal);
    }
}

} // namespace

void run(Choices& choices)
{
    const Rules rules = some_rules(choices);
    const RequestHead head = some_head(choices);
    try {
        const Plan plan = plan_of(head, rules);
        check_plan(head, plan, rules);
        if (plan.task == Task::page) {
            send_page(head, plan);
        }
    } catch (const Refusal& refusal) {
        check_refusal(refusal);
    }
    look_at_body(choices.ConsumeRemainingBytesAsString());
}

} // namespace kz::fuzz
