// What a service tells about itself: health, options, metrics, its log, and its methods.

#include "service.hpp"

#include <chrono>
#include <regex>
#include <thread>

namespace {

using namespace kz::test;
using nlohmann::json;

class ServeReports : public ServiceTest {
protected:
    /// The value of a line of metrics; -1 when there is none.
    static double metric(const std::string& text, const std::string& name)
    {
        const size_t at = text.find("\n" + name + " ");
        return at == std::string::npos ? -1 : std::stod(text.substr(at + name.size() + 2));
    }

    /// Lines of the log, once there are so many.
    static std::vector<std::string> log_of(const Service& service, size_t lines)
    {
        std::vector<std::string> found;
        for (int i = 0; i < 10'000 && found.size() < lines; ++i) {
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
            std::istringstream text(service.messages());
            found.clear();
            for (std::string line; std::getline(text, line) && !text.eof();) {
                found.push_back(line);
            }
        }
        return found;
    }
};

TEST_F(ServeReports, HealthCountsTheCatalogue)
{
    const Service service = start({catalogue()});
    const Response response = service.get("/v1/health");
    EXPECT_EQ(200, response.status);
    EXPECT_EQ("no-store", response.headers.at("cache-control"));
    const json health = response.json();
    EXPECT_EQ("ok", health["status"]);
    EXPECT_EQ(KZFP_VERSION, health["version"]);
    EXPECT_EQ(3, health["tracks"]);
    EXPECT_GT(health["codes"], 400);
    EXPECT_EQ("standard", health["profile"]);
}

TEST_F(ServeReports, OptionsSayWhatIsTaken)
{
    const Service service = start({catalogue(), "--max-body", "5000"});
    EXPECT_EQ(json({{"version", KZFP_VERSION},
                    {"audio", true},
                    {"token", false},
                    {"max_body", 5000},
                    {"longest_clip", 600},
                    {"write", false}}),
              service.get("/v1/options").json());
}

TEST_F(ServeReports, MetricsCountWhatHappened)
{
    const Service service = start({catalogue(), "--queue", "7"});
    const std::string known = trail_file(clip(2));
    const std::string stranger = trail_file(piece(77, 12));
    service.post("/v1/match", "application/x-kzt", known);
    service.post("/v1/match", "application/x-kzt", known);
    service.post("/v1/match", "application/x-kzt", stranger);
    service.post("/v1/match", "audio/wav", "no sound");
    const Response response = service.get("/metrics");
    EXPECT_EQ("text/plain; version=0.0.4; charset=utf-8", response.headers.at("content-type"));
    const std::string& text = response.body;
    EXPECT_EQ(2, metric(text, R"(kzfp_lookups_total{kind="trail",verdict="match"})")) << text;
    EXPECT_EQ(1, metric(text, R"(kzfp_lookups_total{kind="trail",verdict="no match"})"));
    EXPECT_EQ(3, metric(text, "kzfp_lookup_seconds_count"));
    EXPECT_EQ(3, metric(text, R"(kzfp_lookup_seconds_bucket{le="+Inf"})"));
    EXPECT_EQ(3, metric(text, R"(kzfp_requests_total{route="/v1/match",status="200"})"));
    EXPECT_EQ(1, metric(text, R"(kzfp_requests_total{route="/v1/match",status="422"})"));
    EXPECT_EQ(1, metric(text, R"(kzfp_refused_total{reason="unreadable_audio"})"));
    EXPECT_EQ(7, metric(text, "kzfp_queue_capacity"));
    EXPECT_EQ(3, metric(text, "kzfp_catalogue_tracks"));
    EXPECT_GT(metric(text, "process_resident_memory_bytes"), 1e6);
}

TEST_F(ServeReports, MetricsAreWellFormed)
{
    const Service service = start({catalogue()});
    service.post("/v1/match", "application/x-kzt", trail_file(clip(1)));
    std::istringstream text(service.get("/metrics").body);
    static const std::regex kLine(
        R"((# (HELP|TYPE) [a-z_]+ .+|[a-z_]+(\{[a-z]+="[^"]*"(,[a-z]+="[^"]*")*\})? [0-9.e+-]+))");
    for (std::string line; std::getline(text, line);) {
        EXPECT_TRUE(std::regex_match(line, kLine)) << line;
    }
}

TEST_F(ServeReports, TheLogHoldsNothingThatWasSent)
{
    const Service service = start({catalogue()});
    service.ask("GET", "/v1/tracks?source=private-name",
                {.headers = {"Authorization: Bearer private-token"}});
    service.get("/v1/tracks/2");
    service.get("/private-path");
    service.ask("PRIVATE", "/v1/match");
    const std::vector<std::string> lines = log_of(service, 4);
    ASSERT_EQ(4u, lines.size());
    static const std::regex kLine(
        R"(\d{4}-\d\d-\d\dT\d\d:\d\d:\d\dZ [A-Z]+ [^ ]+ \d+( [a-z_]+)? \d+\.\d+ s)");
    for (const std::string& line : lines) {
        EXPECT_TRUE(std::regex_match(line, kLine)) << line;
        EXPECT_FALSE(contains(line, "private")) << line;
        EXPECT_FALSE(contains(line, "PRIVATE")) << line;
        EXPECT_FALSE(contains(line, "127.0.0.1")) << line;
    }
    EXPECT_TRUE(contains(service.messages(), " GET /v1/tracks/ID 200 ")) << service.messages();
}

TEST_F(ServeReports, TheLogCanBeJsonWithAddresses)
{
    const Service service = start({catalogue(), "--log", "json", "--log-addresses"});
    service.get("/v1/tracks/99");
    const json line = json::parse(log_of(service, 1).at(0));
    EXPECT_EQ("GET", line["method"]);
    EXPECT_EQ("/v1/tracks/ID", line["route"]);
    EXPECT_EQ(404, line["status"]);
    EXPECT_EQ("no_such_track", line["error"]);
    EXPECT_EQ("127.0.0.1", line["address"]);
}

TEST_F(ServeReports, OtherMethodsAreToldWhichThereAre)
{
    const Service service = start({catalogue()});
    const Response wrong = service.ask("PUT", "/v1/match");
    EXPECT_EQ(405, wrong.status);
    EXPECT_EQ("POST, OPTIONS", wrong.headers.at("allow"));
    EXPECT_EQ("GET, HEAD, DELETE, OPTIONS",
              service.ask("POST", "/v1/tracks/1", {.body = ""}).headers.at("allow"));
    const Response asked = service.ask("OPTIONS", "/v1/tracks");
    EXPECT_EQ(204, asked.status);
    EXPECT_EQ("GET, HEAD, POST, OPTIONS", asked.headers.at("allow"));
    EXPECT_EQ("no_such_address", service.get("/v1/nothing").error());
}

TEST_F(ServeReports, HeadIsAnsweredLikeGet)
{
    const Service service = start({catalogue()});
    const Response response = service.ask("HEAD", "/v1/tracks");
    EXPECT_EQ(200, response.status);
    EXPECT_EQ(std::to_string(service.get("/v1/tracks").body.size()),
              response.headers.at("content-length"));
}

} // namespace
