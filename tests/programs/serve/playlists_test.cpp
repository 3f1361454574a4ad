// Files that name other places instead of holding sound: nothing of what they name is opened.

#include "service.hpp"

#include <atomic>
#include <fstream>
#include <thread>

namespace {

using namespace kz::test;

constexpr int kPort = 47614; ///< that a session description names; nobody else uses it here

std::string session_description()
{
    return "v=0\r\no=- 0 0 IN IP4 127.0.0.1\r\ns=x\r\nc=IN IP4 127.0.0.1\r\nt=0 0\r\nm=audio " +
           std::to_string(kPort) + " RTP/AVP 0\r\na=rtpmap:0 PCMU/8000\r\n";
}

/// Whether a process of this machine has a UDP socket of the port.
bool has_udp_socket(int port)
{
    char wanted[16];
    std::snprintf(wanted, sizeof wanted, ":%04X ", static_cast<unsigned>(port));
    for (const char* const table : {"/proc/net/udp", "/proc/net/udp6"}) {
        std::ifstream file(table);
        for (std::string line; std::getline(file, line);) {
            if (contains(line, wanted)) {
                return true;
            }
        }
    }
    return false;
}

class ServePlaylists : public ServiceTest {};

TEST_F(ServePlaylists, OfSessionsOpenNoSockets)
{
    const Service service = start({catalogue()});
    Connection connection(service.port());
    std::atomic<bool> answered = false;
    std::atomic<bool> was_open = false;
    std::thread watch([&] {
        while (!answered) {
            was_open = was_open || has_udp_socket(kPort);
        }
    });
    connection.send(
        request_text("POST", "/v1/match",
                     {.headers = {"Content-Type: audio/wav"}, .body = session_description()}));
    const Response response = connection.receive();
    answered = true;
    watch.join();
    EXPECT_FALSE(was_open);
    EXPECT_EQ(422, response.status) << response.body;
    EXPECT_EQ("unreadable_audio", response.error());
}

TEST_F(ServePlaylists, OfOtherSoundsAreRefused)
{
    const Service service = start({catalogue()});
    const std::string sound = scratch_->write("other.wav", wav(clip(1)));
    for (const std::string& list : std::vector<std::string>{
             "#EXTM3U\n#EXT-X-TARGETDURATION:10\n#EXTINF:10,\nfile://" + sound +
                 "\n#EXT-X-ENDLIST\n",
             "#EXTM3U\n#EXT-X-TARGETDURATION:10\n#EXTINF:10,\nhttp://127.0.0.1:9/a.ts\n",
             "ffconcat version 1.0\nfile " + sound + "\n", session_description()}) {
        const Response response = service.post("/v1/match", "audio/mpeg", list);
        EXPECT_EQ(422, response.status) << list << response.body;
        EXPECT_EQ("unreadable_audio", response.error());
        EXPECT_TRUE(contains(response.body, "nothing that a file refers to is opened"))
            << response.body;
    }
}

TEST_F(ServePlaylists, OnTheCommandLineAreRefusedToo)
{
    const ProcessResult result =
        kzfp({"match", catalogue(), scratch_->write("radio.wav", session_description())});
    EXPECT_EQ(1, result.status);
    EXPECT_TRUE(contains(result.err, "nothing that a file refers to is opened")) << result.err;
}

} // namespace
