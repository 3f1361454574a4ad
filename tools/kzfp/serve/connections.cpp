// A socket is shut down, never closed here: the server's own threads then notice, and close it.

#include "kzfp/serve/connections.hpp"

#include <algorithm>
#include <utility>

#include <arpa/inet.h>
#include <netinet/in.h>

#include "kzfp/serve/message.hpp"

namespace kzfp::serve {

namespace {

/// An answer that the HTTP library has no way to give.
std::string text_of(const Reply& reply, const std::string& first)
{
    return "HTTP/1.1 " + first + "Connection: close\r\nContent-Type: " + reply.type +
           "\r\nX-Content-Type-Options: nosniff\r\nCache-Control: no-store\r\nContent-Length: " +
           std::to_string(reply.body.size()) + "\r\n\r\n" + reply.body;
}

std::string too_slow()
{
    return text_of(error_reply(408, "too_slow",
                               "the request did not arrive in time; send it at once, or over a "
                               "faster connection"),
                   "408 Request Timeout\r\n");
}

std::string too_many()
{
    return text_of(error_reply(429, "too_many_connections",
                               "there are too many connections from this address; close some, or "
                               "use one for several requests"),
                   "429 Too Many Requests\r\nRetry-After: 1\r\n");
}

} // namespace

std::string numbers_of(const sockaddr* address)
{
    char text[INET6_ADDRSTRLEN] = {};
    if (address != nullptr && address->sa_family == AF_INET) {
        const auto* const in = reinterpret_cast<const sockaddr_in*>(address);
        inet_ntop(AF_INET, &in->sin_addr, text, sizeof text);
    } else if (address != nullptr && address->sa_family == AF_INET6) {
        const auto* const in = reinterpret_cast<const sockaddr_in6*>(address);
        inet_ntop(AF_INET6, &in->sin6_addr, text, sizeof text);
    }
    return text;
}

std::string group_of(const sockaddr* address)
{
    if (address == nullptr || address->sa_family != AF_INET6) {
        return numbers_of(address);
    }
    sockaddr_in6 network = *reinterpret_cast<const sockaddr_in6*>(address);
    if (!IN6_IS_ADDR_V4MAPPED(&network.sin6_addr)) {
        std::fill_n(network.sin6_addr.s6_addr + 8, 8, uint8_t{0});
    }
    return numbers_of(reinterpret_cast<const sockaddr*>(&network));
}

Connections::Connection* Connections::open(int socket, const sockaddr* address)
{
    const std::string group = group_of(address);
    const std::lock_guard lock(mutex_);
    size_t count = 0;
    if (!group.empty()) {
        count = ++by_address_[group];
    }
    auto made = std::make_unique<Connection>(
        Connection{.socket = socket,
                   .address = numbers_of(address),
                   .group = group,
                   .too_many = per_address_ != 0 && count > per_address_});
    Connection* const connection = made.get();
    open_.emplace(connection, std::move(made));
    if (connection->too_many) {
        end(*connection, too_many());
    }
    return connection;
}

void Connections::close(Connection* connection)
{
    const std::lock_guard lock(mutex_);
    const auto counted = by_address_.find(connection->group);
    if (counted != by_address_.end() && --counted->second == 0) {
        by_address_.erase(counted);
    }
    open_.erase(connection);
}

void Connections::enter(Connection& connection, Stage stage)
{
    const std::lock_guard lock(mutex_);
    connection.stage = stage;
    connection.since = Clock::now();
}

void Connections::end_those_before(Clock::time_point moving, Clock::time_point idle)
{
    const std::lock_guard lock(mutex_);
    for (const auto& [key, owned] : open_) {
        const Connection& connection = *owned;
        const auto latest = connection.stage == Stage::idle ? idle : moving;
        if (connection.stage != Stage::working && connection.since < latest) {
            end(connection, connection.stage == Stage::receiving ? too_slow() : "");
        }
    }
}

void Connections::end(const Connection& connection, const std::string& last_words) const
{
    if (is_plain_ && !last_words.empty()) {
        static_cast<void>(!::send(connection.socket, last_words.data(), last_words.size(),
                                  MSG_DONTWAIT | MSG_NOSIGNAL));
    }
    ::shutdown(connection.socket, SHUT_RDWR);
}

size_t Connections::count() const
{
    const std::lock_guard lock(mutex_);
    return open_.size();
}

} // namespace kzfp::serve
