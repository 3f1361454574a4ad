/// @file
/// A server of the machine itself, for tests of what comes from the network.
#pragma once

#include <functional>
#include <string>
#include <string_view>
#include <thread>

namespace kz::test {

/// Answers one connection after another, on a port of its own, until it is destroyed.
class SmallServer {
public:
    /// `answer` is called with the socket of each connection, once its request was read, and with
    /// the request. The socket is closed afterwards.
    using Answer = std::function<void(int socket, const std::string& request)>;
    explicit SmallServer(Answer answer);
    ~SmallServer();
    SmallServer(const SmallServer&) = delete;
    SmallServer& operator=(const SmallServer&) = delete;

    std::string url(const std::string& path) const;

private:
    void serve() const;

    Answer answer_;
    int listener_ = -1;
    int port_ = 0;
    std::thread thread_;
};

/// Sends everything; gives up when nobody receives it.
void send_all(int socket, std::string_view bytes);

/// An answer of HTTP with the part of `bytes` that the request wants, but no more than `limit`
/// bytes of it, though it promises all.
void send_file(int socket, const std::string& request, std::string_view bytes, size_t limit);

} // namespace kz::test
