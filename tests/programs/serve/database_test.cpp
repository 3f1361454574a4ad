// A service whose catalogue is on a PostgreSQL server.

#include "service.hpp"

#include "support/postgres.hpp"

namespace {

using namespace kz::test;

TEST(ServeDatabase, IsLookedThroughAndChangedLikeAFile)
{
    if (!postgres_obstacle().empty()) {
        GTEST_SKIP() << postgres_obstacle();
    }
    const PostgresServer server({.tcp = true, .password = "right", .settings = {}});
    const ScratchDirectory scratch;
    const std::string address = server.tcp_url("postgres", "postgres:right");
    output_of({"add", address, scratch.write("one.wav", wav(piece(1)))});
    const std::string token = scratch.write("token", "0123456789abcdef\n");
    std::filesystem::permissions(token, std::filesystem::perms::owner_read);
    Service service(scratch, {address, "--listen", "127.0.0.1:0", "--write-token-file", token});
    const auto source_of = [&service](uint64_t seed) {
        const std::string trail = trail_file(part(piece(seed), 5, 12));
        const auto answer = service.post("/v1/match", "application/x-kzt", trail).json();
        return answer["matches"].empty() ? "" : answer["matches"][0].value("source", "");
    };
    EXPECT_EQ(scratch.path("one.wav"), source_of(1));
    const Response added = service.ask(
        "POST", "/v1/tracks?source=two",
        {.headers = {"Authorization: Bearer 0123456789abcdef", "Content-Type: application/x-kzt"},
         .body = trail_file(piece(2))});
    EXPECT_EQ(201, added.status) << added.body;
    EXPECT_EQ("two", source_of(2));
    EXPECT_EQ(2, service.get("/v1/health").json()["tracks"]);
    EXPECT_EQ(0, service.stop());
    EXPECT_FALSE(contains(service.messages(), "right")) << service.messages();
}

TEST(ServeDatabase, FailuresTellClientsNoAddresses)
{
    if (!postgres_obstacle().empty()) {
        GTEST_SKIP() << postgres_obstacle();
    }
    PostgresServer server({.tcp = true, .password = "right", .settings = {}});
    const ScratchDirectory scratch;
    const std::string address = server.tcp_url("postgres", "postgres:right");
    output_of({"add", address, scratch.write("one.wav", wav(piece(1)))});
    Service service(scratch, {address, "--listen", "127.0.0.1:0"});
    server.kill9();
    const Response response = service.get("/v1/tracks");
    EXPECT_EQ(500, response.status) << response.body;
    EXPECT_EQ("catalogue_failed", response.error());
    EXPECT_FALSE(contains(response.body, "127.0.0.1")) << response.body;
    EXPECT_TRUE(contains(service.messages(), "the catalogue has failed: ")) << service.messages();
    EXPECT_EQ(0, service.stop());
}

} // namespace
