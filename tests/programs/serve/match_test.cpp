// Looking clips up over HTTP: every kind of body, its answer, and what is said of bad ones.

#include "service.hpp"

#include <string>

namespace {

using namespace kz::test;
using nlohmann::json;

/// The tests share a service.
class ServeMatch : public ServiceTest {
protected:
    static void SetUpTestSuite()
    {
        ServiceTest::SetUpTestSuite();
        service_ = new Service(start({catalogue(), "--queue", "1000"}));
    }
    static void TearDownTestSuite()
    {
        delete service_;
        ServiceTest::TearDownTestSuite();
    }

    static Service* service_;
};

Service* ServeMatch::service_ = nullptr;

/// What `kzfp match` prints, without the name of the file.
json printed_for(const std::vector<std::string>& arguments)
{
    std::vector<std::string> all = {"match", "-f", "json"};
    all.insert(all.end(), arguments.begin(), arguments.end());
    json answer = json::parse(output_of(all));
    answer.erase("file");
    return answer;
}

/// An answer without what only the service says.
json common_part(json answer)
{
    for (const char* const name : {"by", "took", "clip_seconds", "worth"}) {
        EXPECT_TRUE(std::string(name) == "worth" || answer.contains(name)) << name;
        answer.erase(name);
    }
    return answer;
}

TEST_F(ServeMatch, TrailsAreAnsweredAsKzfpMatchDoes)
{
    const std::string trail = trail_file(clip(2));
    const Response response = service_->post("/v1/match", "application/x-kzt", trail);
    ASSERT_EQ(200, response.status) << response.body;
    EXPECT_EQ("application/json", response.headers.at("content-type"));
    const json answer = response.json();
    EXPECT_EQ("match", answer["verdict"]);
    EXPECT_EQ("trail", answer["by"]);
    EXPECT_EQ(path_of(2), answer["matches"][0]["source"]);
    EXPECT_NEAR(5, answer["matches"][0]["offset"].get<double>(), 0.1);
    EXPECT_NEAR(12, answer["clip_seconds"].get<double>(), 0.1);
    EXPECT_FALSE(answer.contains("worth"));
    EXPECT_EQ(printed_for({catalogue(), scratch_->write("clip.kzt", trail)}), common_part(answer));
}

TEST_F(ServeMatch, SoundIsAnsweredAsKzfpMatchDoes)
{
    const std::string sound = wav(clip(3));
    for (const char* const type : {"audio/wav", "audio/x-wav; rate=1", "Audio/Mpeg"}) {
        const Response response = service_->post("/v1/match", type, sound);
        ASSERT_EQ(200, response.status) << response.body;
        EXPECT_EQ(printed_for({catalogue(), scratch_->write("clip.wav", sound)}),
                  common_part(response.json()));
    }
}

TEST_F(ServeMatch, DocumentsAndValuesSayWhatTheyAreWorth)
{
    const std::string document = output_of({path_of(1)});
    const json values = json::parse(output_of({"-f", "json", path_of(1)}))["values"];
    for (const auto& [type, body] :
         {std::pair("application/xml", document), std::pair("text/xml; charset=utf-8", document),
          std::pair("application/json", json({{"values", values}}).dump())}) {
        const Response response = service_->post("/v1/match", type, body);
        ASSERT_EQ(200, response.status) << response.body;
        const json answer = response.json();
        EXPECT_EQ("document", answer["by"]);
        EXPECT_TRUE(contains(answer["worth"], "14.22 s")) << answer;
        EXPECT_EQ(path_of(1), answer["matches"][0]["source"]);
        EXPECT_EQ(printed_for({catalogue(), scratch_->write("clip.xml", document)}),
                  common_part(answer));
    }
}

TEST_F(ServeMatch, TopAddsCandidates)
{
    const std::string trail = trail_file(piece(77, 12));
    const json answer = service_->post("/v1/match?top=2", "application/x-kzt", trail).json();
    EXPECT_EQ("no match", answer["verdict"]);
    ASSERT_EQ(2u, answer["candidates"].size()) << answer;
    EXPECT_EQ("unlikely", answer["candidates"][0]["sure"]);
    EXPECT_FALSE(service_->post("/v1/match?top=0", "application/x-kzt", trail)
                     .json()
                     .contains("candidates"));
}

TEST_F(ServeMatch, PassagesAreASetList)
{
    std::vector<int16_t> samples = part(piece(2), 5, 22);
    const std::vector<int16_t> more = part(piece(1), 2, 25);
    samples.insert(samples.end(), more.begin(), more.end());
    const Response response =
        service_->post("/v1/match?passages=1&speeds=0", "audio/wav", wav(samples));
    const json answer = response.json();
    ASSERT_EQ(2u, answer["matches"].size()) << answer;
    EXPECT_NEAR(22, answer["matches"][1]["clip_begin"].get<double>(), 3);
    EXPECT_NEAR(47, answer["seconds"].get<double>(), 0.1);
    EXPECT_TRUE(answer["gaps"].is_array());
}

TEST_F(ServeMatch, ChunkedBodiesAreTaken)
{
    const std::string trail = trail_file(clip(2));
    Connection connection(service_->port());
    connection.send("POST /v1/match HTTP/1.1\r\nHost: localhost\r\nTransfer-Encoding: chunked\r\n"
                    "Content-Type: application/x-kzt\r\n\r\n");
    for (size_t at = 0; at < trail.size(); at += 100) {
        const std::string piece = trail.substr(at, 100);
        char size[16];
        std::snprintf(size, sizeof size, "%zx\r\n", piece.size());
        connection.send(size + piece + "\r\n");
    }
    connection.send("0\r\n\r\n");
    EXPECT_EQ("match", connection.receive().json()["verdict"]);
}

TEST_F(ServeMatch, AConnectionServesManyRequests)
{
    const std::string trail = trail_file(clip(2));
    const std::string request = request_text(
        "POST", "/v1/match", {.headers = {"Content-Type: application/x-kzt"}, .body = trail});
    Connection connection(service_->port());
    for (int i = 0; i < 20; ++i) {
        ASSERT_TRUE(connection.send(request));
        ASSERT_EQ("match", connection.receive().json()["verdict"]) << i;
    }
    ASSERT_TRUE(connection.send(request + request)); // both at once
    EXPECT_EQ("match", connection.receive().json()["verdict"]);
    EXPECT_EQ("match", connection.receive().json()["verdict"]);
}

TEST_F(ServeMatch, BadBodiesAreRefusedWithACode)
{
    const std::string trail = trail_file(clip(2));
    struct Bad {
        const char* type;
        std::string body;
        int status;
        const char* error;
    };
    for (const Bad& bad :
         {Bad{"application/x-kzt", trail.substr(0, trail.size() - 1), 400, "bad_trail"},
          Bad{"application/x-kzt", "", 400, "bad_trail"},
          Bad{"application/xml", "<KZFPX_FP_QUERY>", 400, "bad_document"},
          Bad{"application/json", "{\"values\": [1, 2, 3]}", 400, "bad_values"},
          Bad{"application/json", "{\"values\": 1}", 400, "bad_values"},
          Bad{"application/json", "[[[[", 400, "bad_values"},
          Bad{"audio/wav", "this is no sound", 422, "unreadable_audio"},
          Bad{"audio/flac", "", 422, "unreadable_audio"},
          Bad{"text/plain", "x", 415, "wrong_type"}}) {
        const Response response = service_->post("/v1/match", bad.type, bad.body);
        EXPECT_EQ(bad.status, response.status) << bad.type << response.body;
        EXPECT_EQ(bad.error, response.error()) << response.body;
        EXPECT_GT(response.json()["error"].value("message", "").size(), 30u) << response.body;
    }
    EXPECT_EQ(415, service_->ask("POST", "/v1/match", {.body = trail}).status);
}

TEST_F(ServeMatch, MessagesNameNoPathsOfTheServer)
{
    const Response response = service_->post("/v1/match", "audio/wav", "this is no sound");
    EXPECT_FALSE(contains(response.body, "/proc")) << response.body;
    EXPECT_FALSE(contains(response.body, "/tmp")) << response.body;
}

TEST_F(ServeMatch, SourcesCanBeHidden)
{
    const Service service = start({catalogue(), "--hide-sources"});
    const std::string trail = trail_file(clip(2));
    const Response response = service.post("/v1/match?top=1", "application/x-kzt", trail);
    EXPECT_EQ("piece2.wav", response.json()["matches"][0]["source"]) << response.body;
    EXPECT_FALSE(contains(response.body, scratch_->path())) << response.body;
    EXPECT_FALSE(contains(service.get("/v1/tracks").body, scratch_->path()));
    EXPECT_FALSE(contains(service.get("/v1/tracks/1").body, scratch_->path()));
}

TEST_F(ServeMatch, TracksOfOtherProgramsAreFoundAtOnce)
{
    const Service service = start({own_catalogue("growing.kzc")});
    const std::string trail = trail_file(part(piece(9), 5, 12));
    EXPECT_EQ("no match", service.post("/v1/match", "application/x-kzt", trail).json()["verdict"]);
    output_of({"add", scratch_->path("growing.kzc"), scratch_->write("nine.wav", wav(piece(9)))});
    EXPECT_EQ("match", service.post("/v1/match", "application/x-kzt", trail).json()["verdict"]);
}

} // namespace
