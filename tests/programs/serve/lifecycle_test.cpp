// How a service starts and ends: sockets that are handed over, what it tells the manager, and that
// no accepted request is lost.

#include "service.hpp"

#include <atomic>
#include <csignal>
#include <thread>

#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

namespace {

using namespace kz::test;
using nlohmann::json;

class ServeLifecycle : public ServiceTest {
protected:
    /// One that takes about a second.
    static const std::string& long_request()
    {
        static const std::string text =
            request_text("POST", "/v1/match?passages=1",
                         {.headers = {"Content-Type: audio/wav"}, .body = wav(piece(1, 120))});
        return text;
    }
};

TEST_F(ServeLifecycle, EndsOnTermAndOnInterrupt)
{
    for (const int number : {SIGTERM, SIGINT}) {
        Service service = start({catalogue()});
        service.send(number);
        EXPECT_EQ(0, service.wait()) << number;
    }
}

TEST_F(ServeLifecycle, AnswersWhatItAcceptedBeforeItEnds)
{
    Service service = start({catalogue(), "--lookups", "1"});
    std::vector<std::unique_ptr<Connection>> connections;
    for (int i = 0; i < 6; ++i) {
        connections.push_back(std::make_unique<Connection>(service.port()));
        ASSERT_TRUE(connections.back()->send(long_request()));
    }
    service.send(SIGTERM);
    for (const auto& connection : connections) {
        EXPECT_EQ("match", connection->receive().json()["verdict"]);
    }
    EXPECT_EQ(0, service.wait());
}

TEST_F(ServeLifecycle, RequestsThatAreHalfSentMayBeFinished)
{
    Service service = start({catalogue()});
    const std::string request =
        request_text("POST", "/v1/match",
                     {.headers = {"Content-Type: application/x-kzt"}, .body = trail_file(clip(2))});
    Connection connection(service.port());
    connection.send(request.substr(0, request.size() - 10));
    // The answer to another one shows that the service has what was sent before.
    EXPECT_EQ(200, service.get("/v1/health").status);
    service.send(SIGTERM);
    while (Connection(service.port()).send("x")) { // until it takes no more
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    connection.send(request.substr(request.size() - 10));
    const Response response = connection.receive();
    EXPECT_EQ("match", response.json()["verdict"]);
    EXPECT_EQ("close", response.headers.at("connection"));
    EXPECT_EQ(0, service.wait());
}

TEST_F(ServeLifecycle, SaysThatItDrains)
{
    Service service = start({catalogue(), "--lookups", "1"});
    Connection busy(service.port());
    Connection kept(service.port());
    const std::string health = request_text("GET", "/v1/health");
    kept.send(health);
    EXPECT_EQ(200, kept.receive().status);
    busy.send(long_request());
    busy.send(long_request());
    service.send(SIGTERM);
    while (Connection(service.port()).send("x")) {
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    kept.send(health);
    const Response response = kept.receive();
    EXPECT_EQ(503, response.status);
    EXPECT_EQ("draining", response.json()["status"]);
    EXPECT_EQ("close", response.headers.at("connection"));
    EXPECT_EQ(200, busy.receive().status);
    EXPECT_EQ(0, service.wait());
}

TEST_F(ServeLifecycle, DoesNotWaitForSlowClientsForever)
{
    Service service = start({catalogue(), "--drain", "1"});
    Connection connection(service.port());
    connection.send(long_request().substr(0, 1000));
    EXPECT_EQ(200, service.get("/v1/health").status);
    EXPECT_EQ(0, service.stop());
}

TEST_F(ServeLifecycle, WhatStillWaitsAtItsEndIsToldSo)
{
    Service service = start({catalogue(), "--lookups", "1", "--drain", "0"});
    std::vector<std::unique_ptr<Connection>> connections;
    for (int i = 0; i < 8; ++i) {
        connections.push_back(std::make_unique<Connection>(service.port()));
        ASSERT_TRUE(connections.back()->send(long_request()));
    }
    while (!contains(service.get("/metrics").body, "\nkzfp_queue_length 4\n")) {
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    service.send(SIGTERM);
    int told = 0;
    for (const auto& connection : connections) {
        const Response response = connection->receive();
        told += response.status == 503 && response.error() == "stopping" ? 1 : 0;
    }
    EXPECT_GE(told, 1);
    EXPECT_EQ(0, service.wait());
}

TEST_F(ServeLifecycle, CutsOffWhatTakesTooLongAndSaysSo)
{
    Service service = start({catalogue(), "--lookups", "1", "--drain", "0", "--max-body",
                             "1000000000", "--longest-clip", "86400"});
    const std::vector<int16_t> once = piece(77, 120); // a stranger, which takes longest
    std::vector<int16_t> samples;
    for (int i = 0; i < 100; ++i) {
        samples.insert(samples.end(), once.begin(), once.end());
    }
    const std::string request =
        request_text("POST", "/v1/match?passages=1",
                     {.headers = {"Content-Type: audio/wav"}, .body = wav(samples)});
    Connection longest(service.port());
    ASSERT_TRUE(longest.send(request));
    std::this_thread::sleep_for(std::chrono::seconds(1)); // mostly enough for it to be first
    Connection waiting(service.port());
    ASSERT_TRUE(waiting.send(long_request()));
    // The short one would not wait so long for anything but the long one.
    for (int looks = 0; looks < 100; ++looks) {
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
        looks = contains(service.get("/metrics").body, "\nkzfp_queue_length 1\n") ? looks : 0;
    }
    service.send(SIGTERM);
    EXPECT_EQ("stopping", waiting.receive().error());
    EXPECT_EQ(1, service.wait());
    EXPECT_TRUE(contains(service.messages(), "1 request was cut off")) << service.messages();
}

TEST_F(ServeLifecycle, ASecondSignalEndsItAtOnce)
{
    Service service = start({catalogue(), "--drain", "600"});
    Connection connection(service.port());
    connection.send(long_request().substr(0, 1000));
    EXPECT_EQ(200, service.get("/v1/health").status);
    service.send(SIGTERM);
    while (Connection(service.port()).send("x")) {
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    service.send(SIGTERM);
    EXPECT_EQ(128 + SIGTERM, service.wait());
}

/// A socket that listens on a port of its own.
int listening_socket()
{
    const int socket = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in address = {};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    EXPECT_EQ(0, ::bind(socket, reinterpret_cast<sockaddr*>(&address), sizeof address));
    EXPECT_EQ(0, ::listen(socket, 64));
    return socket;
}

TEST_F(ServeLifecycle, TakesASocketThatIsHandedOver)
{
    const int socket = listening_socket();
    Service first(*scratch_, {catalogue()}, {.handed_over = socket});
    const std::string trail = trail_file(clip(2));
    EXPECT_EQ("match", first.post("/v1/match", "application/x-kzt", trail).json()["verdict"]);
    EXPECT_EQ(0, first.stop());
    // What is sent between two services waits for the second one.
    Connection between(first.port());
    between.send(request_text("GET", "/v1/health"));
    Service second(*scratch_, {catalogue()}, {.handed_over = socket});
    EXPECT_EQ(first.port(), second.port());
    EXPECT_EQ(200, between.receive().status);
    ::close(socket);
}

TEST_F(ServeLifecycle, SocketsForOtherProcessesAreLeftAlone)
{
    const Service service(*scratch_, {catalogue(), "--listen", "127.0.0.1:0"},
                          {.environment = {"LISTEN_FDS=1", "LISTEN_PID=1"}});
    EXPECT_EQ(200, service.get("/v1/health").status);
}

TEST_F(ServeLifecycle, TellsItsManagerWhenItIsReady)
{
    const std::string path = scratch_->path("notify");
    const int socket = ::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    sockaddr_un address = {};
    address.sun_family = AF_UNIX;
    path.copy(address.sun_path, sizeof address.sun_path - 1);
    ASSERT_EQ(0, ::bind(socket, reinterpret_cast<sockaddr*>(&address), sizeof address));
    Service service(*scratch_, {catalogue(), "--listen", "127.0.0.1:0"},
                    {.environment = {"NOTIFY_SOCKET=" + path}});
    char text[64] = {};
    const auto told = [&] {
        const ssize_t size = ::recv(socket, text, sizeof text, 0);
        return std::string(text, static_cast<size_t>(size < 0 ? 0 : size));
    };
    EXPECT_EQ("READY=1", told());
    EXPECT_EQ(0, service.stop());
    EXPECT_EQ("STOPPING=1", told());
    ::close(socket);
}

/// Clients that keep asking, each on one connection after another.
struct Load {
    std::atomic<int> answered = 0;
    std::atomic<int> lost = 0;
    std::atomic<bool> ended = false;

    void ask(int port, const std::string& request)
    {
        while (!ended) {
            Connection connection(port);
            bool goes_on = true;
            while (!ended && goes_on && connection.send(request)) {
                const Response response = connection.receive();
                ++(response.status == 200 ? answered : lost);
                goes_on = response.status != 0 && !response.headers.contains("connection");
            }
        }
    }
};

TEST_F(ServeLifecycle, StopAndStartUnderLoadLosesNothing)
{
    const int socket = listening_socket();
    const std::string request =
        request_text("POST", "/v1/match",
                     {.headers = {"Content-Type: application/x-kzt"}, .body = trail_file(clip(2))});
    auto service =
        std::make_unique<Service>(*scratch_, std::vector<std::string>{catalogue(), "--log", "none"},
                                  RunningSetup{.handed_over = socket});
    Load load;
    const int port = service->port();
    std::vector<std::thread> clients;
    for (int i = 0; i < 4; ++i) {
        clients.emplace_back([&] { load.ask(port, request); });
    }
    for (int round = 0; round < 3; ++round) {
        const int before = load.answered;
        while (load.answered < before + 200) {
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
        EXPECT_EQ(0, service->stop());
        service = std::make_unique<Service>(*scratch_,
                                            std::vector<std::string>{catalogue(), "--log", "none"},
                                            RunningSetup{.handed_over = socket});
    }
    load.ended = true;
    for (std::thread& client : clients) {
        client.join();
    }
    EXPECT_EQ(0, load.lost);
    EXPECT_GE(load.answered, 600);
    ::close(socket);
}

} // namespace
