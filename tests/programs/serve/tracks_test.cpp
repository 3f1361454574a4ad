// Listing, adding and removing tracks over HTTP.

#include "service.hpp"

#include <set>

namespace {

using namespace kz::test;
using nlohmann::json;

constexpr const char* kToken = "0123456789abcdef-write";

class ServeTracks : public ServiceTest {
protected:
    static Service start_writing(const std::string& name)
    {
        return start({own_catalogue(name), "--write-token-file", token_file(name + ".w", kToken)});
    }

    static Response change(const Service& service, const std::string& method,
                           const std::string& target, const std::string& type = {},
                           const std::string& body = {})
    {
        Sent sent = {.headers = {"Authorization: Bearer " + std::string(kToken)}};
        if (!type.empty()) {
            sent.headers.push_back("Content-Type: " + type);
            sent.body = body;
        }
        return service.ask(method, target, sent);
    }
};

TEST_F(ServeTracks, AreListedInPages)
{
    const Service service = start({catalogue()});
    const json first = service.get("/v1/tracks?limit=2").json();
    ASSERT_EQ(2u, first["tracks"].size()) << first;
    EXPECT_EQ(2, first["next"]);
    const json rest = service.get("/v1/tracks?after=2").json();
    ASSERT_EQ(1u, rest["tracks"].size()) << rest;
    EXPECT_EQ(nullptr, rest["next"]);
    EXPECT_EQ(3, rest["tracks"][0]["track"]);
    EXPECT_EQ(path_of(3), rest["tracks"][0]["sources"][0]);
    const json all = service.get("/v1/tracks?limit=3").json();
    EXPECT_EQ(nullptr, all["next"]) << all;
}

TEST_F(ServeTracks, AreFoundByTheirSources)
{
    const Service service = start({catalogue()});
    const json found = service.get("/v1/tracks?source=" + path_of(2)).json();
    ASSERT_EQ(1u, found["tracks"].size()) << found;
    EXPECT_EQ(2, found["tracks"][0]["track"]);
    EXPECT_EQ("no_such_source", service.get("/v1/tracks?source=nothing").error());
}

TEST_F(ServeTracks, HaveFactsAndATrail)
{
    const Service service = start({catalogue()});
    const json facts = service.get("/v1/tracks/2").json();
    EXPECT_EQ("piece2", facts["title"]) << facts;
    EXPECT_EQ(nullptr, facts["artist"]);
    EXPECT_NEAR(30, facts["seconds"].get<double>(), 0.1);
    EXPECT_EQ(true, facts["documents"]);
    const Response trail = service.get("/v1/tracks/2/trail");
    EXPECT_EQ("application/x-kzt", trail.headers.at("content-type"));
    EXPECT_EQ(trail_file(piece(2)), trail.body);
    for (const char* const target :
         {"/v1/tracks/99", "/v1/tracks/99/trail", "/v1/tracks/0", "/v1/tracks/-1", "/v1/tracks/x",
          "/v1/tracks/99999999999999999999", "/v1/tracks/", "/v1/tracks/1/", "/v1/tracks/02"}) {
        EXPECT_EQ(404, service.get(target).status) << target;
    }
}

TEST_F(ServeTracks, AreAddedFromTrails)
{
    const Service service = start_writing("adding.kzc");
    const std::string trail = trail_file(piece(8));
    const std::string target = "/v1/tracks?source=radio%2Feight&title=Acht+%C3%BCber&artist=A";
    const Response added = change(service, "POST", target, "application/x-kzt", trail);
    ASSERT_EQ(201, added.status) << added.body;
    EXPECT_EQ(true, added.json()["added"]);
    EXPECT_EQ("/v1/tracks/4", added.headers.at("location"));
    const Response again = change(service, "POST", target, "application/x-kzt", trail);
    EXPECT_EQ(200, again.status) << again.body;
    EXPECT_EQ(false, again.json()["added"]);
    EXPECT_EQ(4, again.json()["track"]);
    const std::string clip = trail_file(part(piece(8), 3, 12));
    const json found = service.post("/v1/match", "application/x-kzt", clip).json()["matches"][0];
    EXPECT_EQ("radio/eight", found["source"]) << found;
    EXPECT_EQ("Acht \u00fcber", found["title"]);
}

TEST_F(ServeTracks, AreAddedFromSound)
{
    const Service service = start_writing("sound.kzc");
    const Response added = change(service, "POST", "/v1/tracks?source=live/nine.wav&documents=1",
                                  "audio/wav", wav(piece(9)));
    ASSERT_EQ(201, added.status) << added.body;
    const json facts = service.get(added.headers.at("location")).json();
    EXPECT_EQ("nine", facts["title"]) << facts;
    EXPECT_EQ(true, facts["documents"]);
    EXPECT_EQ(422, change(service, "POST", "/v1/tracks?source=x", "audio/wav", "no sound").status);
}

TEST_F(ServeTracks, ThatAreTooShortAreRefused)
{
    const Service service = start_writing("short.kzc");
    const Response response =
        change(service, "POST", "/v1/tracks?source=x", "audio/wav", wav(part(piece(1), 0, 0.25)));
    EXPECT_EQ(422, response.status) << response.body;
    EXPECT_TRUE(contains(response.body, "too short")) << response.body;
}

TEST_F(ServeTracks, ThatGainDocumentsAnswerThemAtOnce)
{
    const Service service = start_writing("gain.kzc");
    const std::string document = output_of({scratch_->write("ten.wav", wav(piece(10)))});
    const auto verdict = [&] {
        return service.post("/v1/match", "application/xml", document).json()["verdict"];
    };
    for (const char* const documents : {"0", "1"}) {
        const std::string target = std::string("/v1/tracks?source=ten&documents=") + documents;
        change(service, "POST", target, "audio/wav", wav(piece(10)));
        EXPECT_EQ(documents[0] == '1' ? "match" : "no match", verdict()) << documents;
    }
}

TEST_F(ServeTracks, WithNamesThatAreNotUtf8CanBeFoundAgain)
{
    const Service service = start_writing("bytes.kzc");
    change(service, "POST", "/v1/tracks?source=p%ff", "application/x-kzt", trail_file(piece(8)));
    const json found = service.get("/v1/tracks?source=p%ff").json();
    ASSERT_EQ(1u, found["tracks"].size()) << found;
    EXPECT_EQ("70ff", found["tracks"][0]["sources_bytes"][0]);
    EXPECT_FALSE(service.get("/v1/tracks/1").json().contains("sources_bytes"));
}

TEST_F(ServeTracks, AreRemoved)
{
    const Service service = start_writing("removing.kzc");
    const Response removed = change(service, "DELETE", "/v1/tracks/2");
    EXPECT_EQ(204, removed.status) << removed.body;
    EXPECT_EQ("", removed.body);
    EXPECT_EQ(404, change(service, "DELETE", "/v1/tracks/2").status);
    const std::string trail = trail_file(clip(2));
    EXPECT_EQ("no match", service.post("/v1/match", "application/x-kzt", trail).json()["verdict"]);
    EXPECT_EQ(2, service.get("/v1/health").json()["tracks"]);
}

TEST_F(ServeTracks, AreNotChangedWithoutAWriteToken)
{
    const Service service = start({catalogue()});
    EXPECT_EQ("writing_is_off", change(service, "DELETE", "/v1/tracks/1").error());
    EXPECT_EQ(200, service.get("/v1/tracks/1").status);
    const Service writing = start_writing("guarded.kzc");
    const Response response = writing.ask("DELETE", "/v1/tracks/1");
    EXPECT_EQ(401, response.status);
    EXPECT_EQ("token_missing", response.error());
    EXPECT_EQ(200, writing.get("/v1/tracks/1").status);
}

TEST_F(ServeTracks, NeedASourceAndKnownParameters)
{
    const Service service = start_writing("needs.kzc");
    const std::string trail = trail_file(piece(8));
    const auto error_of = [&](const std::string& target, const std::string& type) {
        return change(service, "POST", target, type, trail).error();
    };
    EXPECT_EQ("source_missing", error_of("/v1/tracks", "application/x-kzt"));
    EXPECT_EQ("unknown_parameter", error_of("/v1/tracks?source=", "application/x-kzt"));
    EXPECT_EQ("unknown_parameter", error_of("/v1/tracks?source=a&x=1", "application/x-kzt"));
    EXPECT_EQ("bad_parameter", error_of("/v1/tracks?source=a&title=%ff", "application/x-kzt"));
    EXPECT_EQ("wrong_type", error_of("/v1/tracks?source=a", "application/xml"));
    EXPECT_EQ("bad_trail",
              change(service, "POST", "/v1/tracks?source=a", "application/x-kzt", trail.substr(9))
                  .error());
    EXPECT_EQ(3u, service.get("/v1/tracks").json()["tracks"].size());
}

} // namespace
