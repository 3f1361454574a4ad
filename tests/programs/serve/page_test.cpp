// The files of the page, and the headers that they are sent with.

#include "service.hpp"

#include <filesystem>

namespace {

using namespace kz::test;

class ServePage : public ServiceTest {
protected:
    static void SetUpTestSuite()
    {
        ServiceTest::SetUpTestSuite();
        scratch_->write("web/index.html", "<!DOCTYPE html><title>t</title>");
        scratch_->write("web/app/main.js", "export {};");
        scratch_->write("web/app/main.js.gz", "packed");
        scratch_->write("web/kzsdk/kzsdk.wasm", std::string("\0asm", 4));
        scratch_->write("web/a b.svg", "<svg/>");
        scratch_->write("web/.secret", "secret");
        scratch_->write("secret.txt", "secret");
        service_ = new Service(start({catalogue(), "--page", scratch_->path("web")}));
    }
    static void TearDownTestSuite()
    {
        delete service_;
        ServiceTest::TearDownTestSuite();
    }

    static Service* service_;
};

Service* ServePage::service_ = nullptr;

TEST_F(ServePage, FilesHaveTheirTypes)
{
    for (const auto& [path, type] : {std::pair("/", "text/html; charset=utf-8"),
                                     std::pair("/index.html", "text/html; charset=utf-8"),
                                     std::pair("/?clip=1", "text/html; charset=utf-8"),
                                     std::pair("/app/main.js", "text/javascript; charset=utf-8"),
                                     std::pair("/kzsdk/kzsdk.wasm", "application/wasm"),
                                     std::pair("/a%20b.svg", "image/svg+xml")}) {
        const Response response = service_->get(path);
        EXPECT_EQ(200, response.status) << path;
        EXPECT_EQ(type, response.headers.at("content-type")) << path;
    }
    EXPECT_EQ(std::string("\0asm", 4), service_->get("/kzsdk/kzsdk.wasm").body);
}

TEST_F(ServePage, OnlyItsOwnScriptsMayRun)
{
    const Response response = service_->get("/");
    const std::string& policy = response.headers.at("content-security-policy");
    EXPECT_TRUE(policy.starts_with("default-src 'none'; script-src 'self' 'wasm-unsafe-eval';"));
    EXPECT_FALSE(contains(policy, "unsafe-inline"));
    EXPECT_TRUE(contains(policy, "frame-ancestors 'none'"));
    EXPECT_EQ("nosniff", response.headers.at("x-content-type-options"));
    EXPECT_EQ("no-referrer", response.headers.at("referrer-policy"));
    EXPECT_EQ("microphone=(self)", response.headers.at("permissions-policy"));
    EXPECT_EQ("same-origin", response.headers.at("cross-origin-opener-policy"));
    EXPECT_EQ("no-cache", response.headers.at("cache-control"));
}

TEST_F(ServePage, FilesThatAreKnownAreNotSentAgain)
{
    const std::string tag = service_->get("/app/main.js").headers.at("etag");
    const auto status = [](const std::string& known) {
        return service_->ask("GET", "/app/main.js", {.headers = {"If-None-Match: " + known}})
            .status;
    };
    EXPECT_EQ(304, status(tag));
    EXPECT_EQ(304, status("\"x\", " + tag));
    EXPECT_EQ(200, status("\"x\""));
}

TEST_F(ServePage, PackedFilesGoToThoseWhoTakeThem)
{
    const auto asked = [](const std::string& encodings) {
        return service_->ask("GET", "/app/main.js", {.headers = {"Accept-Encoding: " + encodings}});
    };
    const Response packed = asked("br, gzip");
    EXPECT_EQ("packed", packed.body);
    EXPECT_EQ("gzip", packed.headers.at("content-encoding"));
    EXPECT_EQ("export {};", asked("br").body);
    EXPECT_EQ("export {};", asked("gzip;q=0").body);
    EXPECT_NE(packed.headers.at("etag"), asked("br").headers.at("etag"));
    EXPECT_TRUE(contains(packed.headers.at("vary"), "Accept-Encoding"));
}

TEST_F(ServePage, NothingElseOfTheDiskIsServed)
{
    for (const char* const path :
         {"/../secret.txt", "/%2e%2e/secret.txt", "/..%2fsecret.txt", "/.secret", "//etc/passwd",
          "/app/../../secret.txt", "/app", "/app/", "/app/main.js.gz", "/etc/passwd"}) {
        EXPECT_EQ(404, service_->get(path).status) << path;
    }
}

TEST_F(ServePage, HeadSendsNoBody)
{
    const Response response = service_->ask("HEAD", "/app/main.js");
    EXPECT_EQ(200, response.status);
    EXPECT_EQ("10", response.headers.at("content-length"));
    EXPECT_EQ(405, service_->ask("PUT", "/index.html").status);
}

TEST_F(ServePage, CanBeSwitchedOff)
{
    const Service service = start({catalogue(), "--no-page"});
    const Response response = service.get("/");
    EXPECT_EQ(404, response.status);
    EXPECT_TRUE(contains(response.body, "--page")) << response.body;
}

TEST_F(ServePage, FoldersWithoutAnIndexAreRefused)
{
    const ProcessResult result = kzfp(
        {"serve", catalogue(), "--listen", "127.0.0.1:0", "--page", scratch_->path("web/app")});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "index.html")) << result.err;
    EXPECT_EQ(
        1,
        kzfp({"serve", catalogue(), "--listen", "127.0.0.1:0", "--page", "/nonexistent"}).status);
}

} // namespace
