#include "client.hpp"

#include <algorithm>
#include <array>
#include <cstdlib>

#include <arpa/inet.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <gtest/gtest.h>

namespace kz::test {

namespace {

constexpr int kPatience = 60'000; ///< milliseconds

std::string lower(std::string text)
{
    std::ranges::transform(text, text.begin(), [](char c) {
        return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
    });
    return text;
}

Response parse_head(const std::string& head)
{
    Response response;
    response.status = std::atoi(head.c_str() + std::min<size_t>(head.size(), 9));
    for (size_t at = head.find("\r\n"); at != std::string::npos && at + 2 < head.size();) {
        const size_t end = std::min(head.find("\r\n", at + 2), head.size());
        const std::string line = head.substr(at + 2, end - at - 2);
        const size_t colon = line.find(": ");
        if (colon != std::string::npos) {
            std::string& value = response.headers[lower(line.substr(0, colon))];
            value += (value.empty() ? "" : ", ") + line.substr(colon + 2);
        }
        at = end == head.size() ? std::string::npos : end;
    }
    return response;
}

} // namespace

std::string Response::error() const
{
    const nlohmann::json object = json();
    return object.is_object() && object.contains("error")
               ? object["error"].value("code", std::string())
               : std::string();
}

Connection::Connection(int port) : socket_(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0))
{
    sockaddr_in address = {};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<uint16_t>(port));
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    if (::connect(socket_, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0) {
        ::close(socket_);
        socket_ = -1;
    }
}

Connection::~Connection()
{
    if (socket_ >= 0) {
        ::close(socket_);
    }
}

bool Connection::send(std::string_view bytes) const
{
    while (!bytes.empty()) {
        const ssize_t count = ::send(socket_, bytes.data(), bytes.size(), MSG_NOSIGNAL);
        if (count <= 0) {
            return false;
        }
        bytes.remove_prefix(static_cast<size_t>(count));
    }
    return true;
}

bool Connection::receive_more()
{
    pollfd ready = {.fd = socket_, .events = POLLIN, .revents = 0};
    if (socket_ < 0 || ::poll(&ready, 1, kPatience) != 1) {
        return false;
    }
    std::array<char, 65536> buffer{};
    const ssize_t count = ::recv(socket_, buffer.data(), buffer.size(), 0);
    if (count > 0) {
        received_.append(buffer.data(), static_cast<size_t>(count));
    }
    return count > 0;
}

Response Connection::receive(bool has_body)
{
    size_t end = std::string::npos;
    while ((end = received_.find("\r\n\r\n")) == std::string::npos) {
        if (!receive_more()) {
            return {};
        }
    }
    Response response = parse_head(received_.substr(0, end + 2));
    received_.erase(0, end + 4);
    const auto length = response.headers.find("content-length");
    const size_t size = length == response.headers.end() || !has_body
                            ? 0
                            : std::strtoul(length->second.c_str(), nullptr, 10);
    while (received_.size() < size) {
        if (!receive_more()) {
            return {};
        }
    }
    response.body = received_.substr(0, size);
    received_.erase(0, size);
    return response;
}

bool Connection::is_closed_soon()
{
    return received_.empty() && !receive_more() && received_.empty();
}

std::string request_text(const std::string& method, const std::string& target, const Sent& sent)
{
    std::string text = method + " " + target + " HTTP/1.1\r\n";
    bool has_host = false;
    for (const std::string& header : sent.headers) {
        has_host = has_host || header.starts_with("Host:");
        text += header + "\r\n";
    }
    text += has_host ? "" : "Host: 127.0.0.1\r\n";
    if (sent.body) {
        text += "Content-Length: " + std::to_string(sent.body->size()) + "\r\n";
    }
    return text + "\r\n" + sent.body.value_or("");
}

Response ask(int port, const std::string& method, const std::string& target, const Sent& sent)
{
    Connection connection(port);
    connection.send(request_text(method, target, sent));
    return connection.receive(method != "HEAD");
}

} // namespace kz::test
