#include "small_server.hpp"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <utility>

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <gtest/gtest.h>

namespace kz::test {

SmallServer::SmallServer(Answer answer) : answer_(std::move(answer))
{
    listener_ = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in address = {};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t size = sizeof address;
    auto* const any = reinterpret_cast<sockaddr*>(&address);
    EXPECT_EQ(0, ::bind(listener_, any, size));
    EXPECT_EQ(0, ::listen(listener_, 8));
    EXPECT_EQ(0, ::getsockname(listener_, any, &size));
    port_ = ntohs(address.sin_port);
    thread_ = std::thread([this] { serve(); });
}

SmallServer::~SmallServer()
{
    ::shutdown(listener_, SHUT_RDWR); // ends accept()
    thread_.join();
    ::close(listener_);
}

std::string SmallServer::url(const std::string& path) const
{
    return "http://127.0.0.1:" + std::to_string(port_) + "/" + path;
}

void SmallServer::serve() const
{
    for (;;) {
        const int socket = ::accept(listener_, nullptr, nullptr);
        if (socket < 0) {
            return;
        }
        std::string request;
        std::array<char, 4096> buffer;
        while (request.find("\r\n\r\n") == std::string::npos) {
            const ssize_t count = ::recv(socket, buffer.data(), buffer.size(), 0);
            if (count <= 0) {
                break;
            }
            request.append(buffer.data(), static_cast<size_t>(count));
        }
        answer_(socket, request);
        ::close(socket);
    }
}

void send_all(int socket, std::string_view bytes)
{
    while (!bytes.empty()) {
        const ssize_t count = ::send(socket, bytes.data(), bytes.size(), MSG_NOSIGNAL);
        if (count <= 0) {
            return;
        }
        bytes.remove_prefix(static_cast<size_t>(count));
    }
}

void send_file(int socket, const std::string& request, std::string_view bytes, size_t limit)
{
    const size_t range = request.find("Range: bytes=");
    const size_t start =
        range == std::string::npos ? 0 : std::strtoul(request.c_str() + range + 13, nullptr, 10);
    const std::string_view wanted = bytes.substr(std::min(start, bytes.size()));
    send_all(socket, "HTTP/1.1 " + std::string(start == 0 ? "200 OK" : "206 Partial Content") +
                         "\r\nContent-Type: audio/mpeg\r\nAccept-Ranges: bytes\r\nConnection: close"
                         "\r\nContent-Range: bytes " +
                         std::to_string(start) + "-" + std::to_string(bytes.size() - 1) + "/" +
                         std::to_string(bytes.size()) +
                         "\r\nContent-Length: " + std::to_string(wanted.size()) + "\r\n\r\n");
    send_all(socket, wanted.substr(0, limit));
}

} // namespace kz::test
