// Who may use a service: tokens, names, origins, TLS, and where it dares to listen.

#include "service.hpp"

#include <filesystem>

namespace {

using namespace kz::test;
using nlohmann::json;

constexpr const char* kRead = "0123456789abcdef-read";
constexpr const char* kWrite = "0123456789abcdef-write";

class ServeAccess : public ServiceTest {
protected:
    static Service start_guarded()
    {
        static int count = 0;
        return start({own_catalogue("guarded" + std::to_string(++count) + ".kzc"), "--token-file",
                      token_file("read", kRead), "--write-token-file",
                      token_file("write", kWrite)});
    }

    static Response with(const Service& service, const std::string& token,
                         const std::string& target)
    {
        return service.ask("GET", target, {.headers = {"Authorization: " + token}});
    }

    /// What a service that is not to start says, without the way to the files.
    static std::string refusal(std::vector<std::string> options)
    {
        options.insert(options.begin(), {"serve", catalogue()});
        const ProcessResult result = kzfp(options);
        EXPECT_EQ(1, result.status);
        EXPECT_EQ("", result.out);
        return result.err;
    }
};

TEST_F(ServeAccess, ReadingTakesATokenWhereThereIsOne)
{
    const Service service = start_guarded();
    for (const char* const target :
         {"/v1/tracks", "/v1/tracks/1", "/v1/tracks/1/trail", "/metrics"}) {
        const Response without = service.get(target);
        EXPECT_EQ(401, without.status) << target;
        EXPECT_EQ("token_missing", without.error());
        EXPECT_EQ("Bearer realm=\"kzfp\"", without.headers.at("www-authenticate"));
        for (const std::string wrong :
             {"Bearer x", "Bearer ", "Basic 0123456789abcdef-read", "0123456789abcdef-read",
              "Bearer 0123456789abcdef-rea", "Bearer 0123456789abcdef-read2"}) {
            EXPECT_EQ("token_wrong", with(service, wrong, target).error()) << wrong;
        }
        EXPECT_EQ(200, with(service, std::string("Bearer ") + kRead, target).status) << target;
        EXPECT_EQ(200, with(service, std::string("bearer  ") + kWrite, target).status) << target;
    }
    EXPECT_EQ(401, service.post("/v1/match", "application/x-kzt", trail_file(clip(1))).status);
}

TEST_F(ServeAccess, TheReadTokenDoesNotAllowWriting)
{
    const Service service = start_guarded();
    const auto removed = [&service](const char* token) {
        return service.ask("DELETE", "/v1/tracks/1",
                           {.headers = {std::string("Authorization: Bearer ") + token}});
    };
    EXPECT_EQ(401, removed(kRead).status);
    EXPECT_EQ(204, removed(kWrite).status);
}

TEST_F(ServeAccess, HealthSaysLittleWithoutAToken)
{
    const Service service = start_guarded();
    EXPECT_EQ(json({{"status", "ok"}}), service.get("/v1/health").json());
    const json all = with(service, std::string("Bearer ") + kRead, "/v1/health").json();
    EXPECT_EQ(3, all["tracks"]);
    const json options = service.get("/v1/options").json();
    EXPECT_EQ(true, options["token"]);
    EXPECT_EQ(true, options["write"]);
}

TEST_F(ServeAccess, TokenFilesHaveToBeSecretAndLong)
{
    const std::string open = scratch_->write("open", std::string(kRead) + "\n");
    std::filesystem::permissions(open, std::filesystem::perms(0644));
    EXPECT_TRUE(contains(refusal({"--token-file", open}), "chmod o= ")) << open;
    for (const char* const token : {"short", "", "0123456789 abcdef 0123456789"}) {
        EXPECT_TRUE(contains(refusal({"--token-file", token_file("bad", token)}), "is no token"))
            << token;
        std::filesystem::remove(scratch_->path("bad"));
    }
    EXPECT_TRUE(contains(refusal({"--token-file", "/nonexistent"}), "No such file"));
}

TEST_F(ServeAccess, OtherMachinesNeedATokenAndTls)
{
    EXPECT_TRUE(contains(refusal({"--listen", "0.0.0.0:0"}), "--insecure"));
    EXPECT_TRUE(contains(refusal({"--listen", "0.0.0.0:0", "--token-file", token_file("r", kRead)}),
                         "--insecure"));
    const Service service(*scratch_, {catalogue(), "--listen", "0.0.0.0:0", "--insecure"});
    EXPECT_EQ(200, service.get("/v1/health").status);
}

TEST_F(ServeAccess, OnlyItsOwnNamesAreAnswered)
{
    const Service service = start({catalogue(), "--host", "Music.Example"});
    const auto status = [&service](const std::string& host) {
        return service.ask("GET", "/v1/health", {.headers = {"Host: " + host}}).status;
    };
    for (const char* const host : {"localhost", "localhost:99", "127.0.0.1:8080", "[::1]:80",
                                   "192.168.1.2", "music.example", "MUSIC.example:443"}) {
        EXPECT_EQ(200, status(host)) << host;
    }
    for (const char* const host :
         {"evil.example", "localhost.evil.example", "127.0.0.1.evil.example", "[::1", "a:b:c"}) {
        EXPECT_EQ(421, status(host)) << host;
    }
    const Response twice =
        service.ask("GET", "/v1/health", {.headers = {"Host: localhost", "Host: localhost"}});
    EXPECT_EQ(400, twice.status);
}

TEST_F(ServeAccess, OtherOriginsAreAllowedByName)
{
    const Service service = start({catalogue(), "--allow-origin", "https://a.example"});
    const auto asked = [&service](const std::string& method, const std::string& origin) {
        return service.ask(method, "/v1/tracks", {.headers = {"Origin: " + origin}});
    };
    const Response allowed = asked("GET", "https://a.example");
    EXPECT_EQ(200, allowed.status);
    EXPECT_EQ("https://a.example", allowed.headers.at("access-control-allow-origin"));
    EXPECT_TRUE(contains(allowed.headers.at("vary"), "Origin"));
    const Response other = asked("GET", "https://b.example");
    EXPECT_EQ("other_origin", other.error());
    EXPECT_FALSE(other.headers.contains("access-control-allow-origin"));
    const Response preflight = asked("OPTIONS", "https://a.example");
    EXPECT_EQ(204, preflight.status);
    EXPECT_TRUE(contains(preflight.headers.at("access-control-allow-methods"), "GET"));
    EXPECT_TRUE(contains(preflight.headers.at("access-control-allow-headers"), "Authorization"));
    EXPECT_EQ(403, asked("OPTIONS", "https://b.example").status);
    EXPECT_EQ(200, asked("GET", "http://127.0.0.1").status); // its own page
}

TEST_F(ServeAccess, SoundCanBeSwitchedOff)
{
    const Service service = start({catalogue(), "--no-audio"});
    const Response response = service.post("/v1/match", "audio/wav", wav(clip(1)));
    EXPECT_EQ(403, response.status);
    EXPECT_EQ("audio_is_off", response.error());
    EXPECT_EQ(false, service.get("/v1/options").json()["audio"]);
    EXPECT_EQ(200, service.post("/v1/match", "application/x-kzt", trail_file(clip(1))).status);
}

TEST_F(ServeAccess, TlsIsServedWithACertificate)
{
    const std::string key = scratch_->path("key.pem");
    const std::string certificate = scratch_->path("cert.pem");
    const ProcessResult made =
        run({"/usr/bin/env", "openssl", "req", "-x509", "-newkey", "rsa:2048", "-nodes", "-keyout",
             key, "-out", certificate, "-days", "2", "-subj", "/CN=localhost", "-addext",
             "subjectAltName=DNS:localhost"});
    ASSERT_EQ(0, made.status) << made.err;
    const Service service = start({catalogue(), "--tls-cert", certificate, "--tls-key", key});
    EXPECT_TRUE(service.output().starts_with("kzfp: listening on https://")) << service.output();
    const std::string url = "https://localhost:" + std::to_string(service.port()) + "/v1/match";
    const std::string trail = scratch_->write("tls.kzt", trail_file(clip(2)));
    const std::vector<std::string> asking = {"/usr/bin/env",
                                             "curl",
                                             "-sS",
                                             "--cacert",
                                             certificate,
                                             "-H",
                                             "Content-Type: application/x-kzt",
                                             "--data-binary",
                                             "@" + trail,
                                             url};
    const ProcessResult asked = run(asking);
    ASSERT_EQ(0, asked.status) << asked.err;
    EXPECT_EQ("match", json::parse(asked.out)["verdict"]);
    std::vector<std::string> old = asking;
    old.insert(old.end(), {"--tls-max", "1.1"});
    EXPECT_NE(0, run(old).status);
}

TEST_F(ServeAccess, BadCertificatesAreReported)
{
    const std::string file = scratch_->write("no.pem", "no certificate");
    const std::string message =
        refusal({"--listen", "127.0.0.1:0", "--tls-cert", file, "--tls-key", file});
    EXPECT_TRUE(contains(message, "--tls-cert")) << message;
    EXPECT_EQ(2, kzfp({"serve", catalogue(), "--tls-cert", file}).status);
}

TEST_F(ServeAccess, BadPlacesAreRefusedWithACure)
{
    for (const char* const place :
         {"8080", "127.0.0.1", "127.0.0.1:", "127.0.0.1:99999", "::1:80", ":80", "[::1]"}) {
        EXPECT_TRUE(contains(refusal({"--listen", place}), "is no place to listen at")) << place;
    }
    EXPECT_TRUE(contains(refusal({"--listen", "192.0.2.1:1"}), "cannot be listened at"));
    const Service service = start({catalogue()});
    EXPECT_TRUE(contains(refusal({"--listen", "127.0.0.1:" + std::to_string(service.port())}),
                         "Address already in use"));
}

TEST_F(ServeAccess, AMissingLibraryIsNamedWithItsCure)
{
    ProcessSetup setup;
    setup.environment = {"LD_PRELOAD=" KZFP_MISSING_LIBRARIES, "MISSING_LIBRARIES=libmicrohttpd"};
    const ProcessResult result = kzfp({"serve", catalogue(), "--listen", "127.0.0.1:0"}, setup);
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "install it (Debian: libmicrohttpd12)")) << result.err;
}

TEST_F(ServeAccess, CataloguesThatAreMissingAreReported)
{
    const ProcessResult result =
        kzfp({"serve", "/nonexistent/music.kzc", "--listen", "127.0.0.1:0"});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(result.err.starts_with("/nonexistent/music.kzc: ")) << result.err;
}

TEST_F(ServeAccess, NamesThatNoRequestHasAreRefused)
{
    const auto refused = [](const char* option, const char* value) {
        const ProcessResult result =
            kzfp({"serve", "/nonexistent/music.kzc", "--listen", "127.0.0.1:0", option, value});
        return result.status == 1 && contains(result.err, option) &&
               contains(result.err, "; give ");
    };
    for (const char* const host : {"https://music.example", "music.example/", "a:b", ""}) {
        EXPECT_TRUE(refused("--host", host)) << host;
    }
    for (const char* const origin : {"https://a.example/", "a.example", "https://", ""}) {
        EXPECT_TRUE(refused("--allow-origin", origin)) << origin;
    }
    EXPECT_FALSE(refused("--host", "music.example:8443"));
    EXPECT_FALSE(refused("--allow-origin", "https://a.example:8443"));
}

} // namespace
