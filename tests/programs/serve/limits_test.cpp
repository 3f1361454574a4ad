// What a service does with too much: large bodies, slow clients, many connections, a full queue.

#include "service.hpp"

#include <atomic>
#include <thread>

namespace {

using namespace kz::test;
using nlohmann::json;

class ServeLimits : public ServiceTest {
protected:
    static Response send_in_parts(const Service& service, const std::string& head,
                                  const std::string& body)
    {
        Connection connection(service.port());
        connection.send(head);
        connection.send(body);
        return connection.receive();
    }
};

TEST_F(ServeLimits, LargeBodiesAreRefusedBeforeTheyAreSent)
{
    const Service service = start({catalogue(), "--max-body", "100000"});
    Connection connection(service.port());
    connection.send("POST /v1/match HTTP/1.1\r\nHost: localhost\r\nContent-Type: audio/wav\r\n"
                    "Content-Length: 100001\r\nExpect: 100-continue\r\n\r\n");
    const Response response = connection.receive();
    EXPECT_EQ(413, response.status);
    EXPECT_EQ("body_too_large", response.error());
    EXPECT_TRUE(contains(response.body, "100000 bytes")) << response.body;
}

TEST_F(ServeLimits, ClientsThatSendTooMuchGetTheAnswer)
{
    const Service service = start({catalogue(), "--max-body", "100000"});
    const std::string body(3'000'000, 'x');
    EXPECT_EQ("body_too_large", service.post("/v1/match", "audio/wav", body).error());
    char size[16];
    std::snprintf(size, sizeof size, "%zx\r\n", body.size());
    const Response chunked =
        send_in_parts(service,
                      "POST /v1/match HTTP/1.1\r\nHost: localhost\r\nContent-Type: audio/wav\r\n"
                      "Transfer-Encoding: chunked\r\n\r\n",
                      size + body + "\r\n0\r\n\r\n");
    EXPECT_EQ("body_too_large", chunked.error());
}

TEST_F(ServeLimits, EachKindOfBodyHasItsOwn)
{
    const Service service = start({catalogue()});
    for (const auto& [type, largest] :
         {std::pair("application/json", 4096), std::pair("application/xml", 65536),
          std::pair("application/x-kzt", 2 << 20)}) {
        const auto error = [&service, type = type](size_t size) {
            return service.post("/v1/match", type, std::string(size, ' ')).error();
        };
        EXPECT_NE("body_too_large", error(static_cast<size_t>(largest))) << type;
        EXPECT_EQ("body_too_large", error(static_cast<size_t>(largest) + 1)) << type;
    }
}

TEST_F(ServeLimits, ClipsLongerThanTenMinutesAreRefused)
{
    const Service service = start({catalogue()});
    const uint32_t samples = 601 * 4000;
    const std::string sound = wav_header(4000, 1, samples * 2) + std::string(samples * 2, '\0');
    const Response response = service.post("/v1/match", "audio/wav", sound);
    EXPECT_EQ(413, response.status) << response.body;
    EXPECT_EQ("clip_too_long", response.error());
    EXPECT_TRUE(contains(response.body, "600 s")) << response.body;
}

TEST_F(ServeLimits, LengthIsThatOfTrailsToo)
{
    const Service service = start({catalogue(), "--longest-clip", "20"});
    for (const auto& [seconds, error] : {std::pair(25, "clip_too_long"), std::pair(19, "")}) {
        const std::vector<int16_t> samples = part(piece(1), 0, seconds);
        EXPECT_EQ(error,
                  service.post("/v1/match", "application/x-kzt", trail_file(samples)).error());
        EXPECT_EQ(error, service.post("/v1/match", "audio/wav", wav(samples)).error());
    }
}

TEST_F(ServeLimits, SlowHeadsAreToldSo)
{
    Service service = start({catalogue(), "--deadline", "1"});
    Connection connection(service.port());
    connection.send("POST /v1/match HTTP/1.1\r\nHost: loc");
    const Response response = connection.receive();
    EXPECT_EQ(408, response.status);
    EXPECT_EQ("too_slow", response.error());
    EXPECT_TRUE(connection.is_closed_soon());
}

TEST_F(ServeLimits, BodiesThatDribbleAreToldSo)
{
    Service service = start({catalogue(), "--deadline", "1"});
    Connection connection(service.port());
    connection.send("POST /v1/match HTTP/1.1\r\nHost: localhost\r\nContent-Type: audio/wav\r\n"
                    "Content-Length: 1000\r\n\r\n");
    std::atomic<bool> ended = false;
    std::thread dribble([&] {
        for (int i = 0; i < 600 && !ended && connection.send("x"); ++i) {
            std::this_thread::sleep_for(std::chrono::milliseconds(100));
        }
    });
    EXPECT_EQ(408, connection.receive().status);
    ended = true;
    dribble.join();
}

TEST_F(ServeLimits, TheDeadlineBeginsWithTheRequest)
{
    Service service = start({catalogue(), "--deadline", "1", "--timeout", "60"});
    Connection connection(service.port());
    for (int i = 0; i < 2; ++i) {
        connection.send(request_text("GET", "/v1/health"));
        EXPECT_EQ(200, connection.receive().status);
        std::this_thread::sleep_for(std::chrono::milliseconds(2500));
    }
}

TEST_F(ServeLimits, SilentConnectionsAreClosed)
{
    Service service = start({catalogue(), "--timeout", "1"});
    Connection connection(service.port());
    connection.send("GET /v1/health HTTP/1.1\r\nHost: localhost\r\n\r\n");
    EXPECT_EQ(200, connection.receive().status);
    EXPECT_TRUE(connection.is_closed_soon());
}

TEST_F(ServeLimits, SlowClientsDoNotHoldUpOthers)
{
    const Service service = start({catalogue(), "--threads", "1", "--lookups", "1"});
    std::vector<std::unique_ptr<Connection>> slow;
    for (int i = 0; i < 100; ++i) {
        slow.push_back(std::make_unique<Connection>(service.port()));
        slow.back()->send("POST /v1/match HTTP/1.1\r\nHost: localhost\r\n"
                          "Content-Type: audio/wav\r\nContent-Length: 1000000\r\n\r\nRIFF");
    }
    const Response response = service.post("/v1/match", "application/x-kzt", trail_file(clip(2)));
    EXPECT_EQ("match", response.json()["verdict"]) << response.body;
}

TEST_F(ServeLimits, AddressesHaveSoManyConnections)
{
    const Service service = start({catalogue(), "--per-address", "2"});
    Connection first(service.port());
    Connection second(service.port());
    const std::string request = request_text("GET", "/v1/health");
    for (Connection* const connection : {&first, &second}) {
        connection->send(request);
        EXPECT_EQ(200, connection->receive().status);
    }
    Connection third(service.port());
    third.send(request);
    const Response refused = third.receive();
    EXPECT_EQ(429, refused.status);
    EXPECT_TRUE(refused.headers.contains("retry-after"));
    EXPECT_TRUE(third.is_closed_soon());
    first.send(request);
    EXPECT_EQ(200, first.receive().status);
}

TEST_F(ServeLimits, ConnectionsTooManyEndWithoutARequest)
{
    const Service service = start({catalogue(), "--per-address", "2", "--timeout", "600"});
    Connection first(service.port());
    Connection second(service.port());
    // Several threads accept connections: these two are counted once they have been answered.
    for (Connection* const connection : {&first, &second}) {
        ASSERT_TRUE(connection->send(request_text("GET", "/v1/health", {})));
        ASSERT_EQ(200, connection->receive().status);
    }
    Connection third(service.port());
    EXPECT_EQ(429, third.receive().status);
    EXPECT_TRUE(third.is_closed_soon());
}

TEST_F(ServeLimits, RefusalsHaveTheHeadersOfAllAnswers)
{
    const Service service = start({catalogue(), "--allow-origin", "https://a.example"});
    const Response response =
        service.ask("POST", "/v1/match",
                    {.headers = {"Content-Type: application/json", "Origin: https://a.example"},
                     .body = std::string(5000, ' ')});
    EXPECT_EQ("body_too_large", response.error());
    for (const char* const name :
         {"x-content-type-options", "cache-control", "access-control-allow-origin"}) {
        EXPECT_TRUE(response.headers.contains(name)) << name;
    }
}

TEST_F(ServeLimits, FullQueuesRefuseAtOnceAndLoseNothing)
{
    const Service service = start({catalogue(), "--lookups", "1", "--queue", "2"});
    const std::string request =
        request_text("POST", "/v1/match?passages=1",
                     {.headers = {"Content-Type: audio/wav"}, .body = wav(piece(1, 120))});
    std::vector<std::unique_ptr<Connection>> connections;
    for (int i = 0; i < 12; ++i) {
        connections.push_back(std::make_unique<Connection>(service.port()));
        ASSERT_TRUE(connections.back()->send(request));
    }
    int matched = 0;
    int refused = 0;
    for (const auto& connection : connections) {
        const Response response = connection->receive();
        matched += response.status == 200 && response.json()["verdict"] == "match" ? 1 : 0;
        const bool is_full = response.status == 503 && response.error() == "queue_full" &&
                             response.headers.contains("retry-after");
        refused += is_full ? 1 : 0;
    }
    EXPECT_EQ(12, matched + refused);
    EXPECT_GE(matched, 3);
    EXPECT_GE(refused, 1);
    EXPECT_EQ(200, service.get("/v1/health").status);
}

TEST_F(ServeLimits, OneConnectionMoreWaitsForItsTurn)
{
    const Service service =
        start({catalogue(), "--max-connections", "1", "--threads", "1", "--timeout", "60"});
    auto first = std::make_unique<Connection>(service.port());
    const std::string request = request_text("GET", "/v1/health");
    first->send(request);
    EXPECT_EQ(200, first->receive().status);
    Connection second(service.port());
    second.send(request);
    first.reset();
    EXPECT_EQ(200, second.receive().status);
}

TEST_F(ServeLimits, ClientsThatLeaveHarmNobody)
{
    const Service service = start({catalogue(), "--lookups", "1"});
    const std::string request = request_text(
        "POST", "/v1/match", {.headers = {"Content-Type: audio/wav"}, .body = wav(piece(1, 60))});
    for (int i = 0; i < 20; ++i) {
        Connection connection(service.port());
        connection.send(i % 2 == 0 ? request : request.substr(0, request.size() / 2));
    }
    const std::string trail = trail_file(clip(2));
    Response response;
    do { // what they have sent is worked on first
        response = service.post("/v1/match", "application/x-kzt", trail);
    } while (response.status == 503);
    EXPECT_EQ("match", response.json()["verdict"]) << response.body;
}

TEST_F(ServeLimits, MalformedRequestsAreAnsweredOrClosed)
{
    const Service service = start({catalogue(), "--timeout", "1"});
    for (const std::string bad :
         {"\r\n\r\n\r\n", "GET\r\n\r\n", "GET / HTTP/9.9\r\n\r\n", "\0\0\0\0",
          "GET / HTTP/1.1\r\n\r\n",
          "POST /v1/match HTTP/1.1\r\nHost: localhost\r\nContent-Length: -1\r\n\r\n",
          "POST /v1/match HTTP/1.1\r\nHost: localhost\r\nContent-Length: 9\r\n"
          "Content-Length: 10\r\n\r\n",
          "POST /v1/match HTTP/1.1\r\nHost: localhost\r\nTransfer-Encoding: chunked\r\n\r\nzz\r\n",
          "GET /v1/tracks?source=%zz HTTP/1.1\r\nHost: localhost\r\n\r\n",
          "GET http://127.0.0.1/v1/health HTTP/1.1\r\nHost: localhost\r\n\r\n"}) {
        Connection connection(service.port());
        connection.send(bad + std::string(1, '\n'));
        const int status = connection.receive().status;
        EXPECT_TRUE(status == 0 || (status >= 400 && status < 600)) << bad << status;
    }
    Connection connection(service.port());
    connection.send("GET /" + std::string(100'000, 'a') + " HTTP/1.1\r\nHost: localhost\r\n\r\n");
    EXPECT_EQ(414, connection.receive().status);
    EXPECT_EQ(200, service.get("/v1/health").status);
}

} // namespace
