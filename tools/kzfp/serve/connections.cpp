// A socket is shut down, never closed here: the server's own threads then notice, and close it.

#include "kzfp/serve/connections.hpp"

#include <utility>

#include <arpa/inet.h>
#include <netinet/in.h>

#include "kzfp/serve/message.hpp"

namespace kzfp::serve {

namespace {

/// What a slow client is told, which the HTTP library has no way to say.
std::string too_slow()
{
    const Reply reply = error_reply(408, "too_slow",
                                    "the request did not arrive in time; send it at once, or over "
                                    "a faster connection");
    return "HTTP/1.1 408 Request Timeout\r\nConnection: close\r\nContent-Type: " + reply.type +
           "\r\nContent-Length: " + std::to_string(reply.body.size()) + "\r\n\r\n" + reply.body;
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

Connections::Connection* Connections::open(int socket, const sockaddr* address)
{
    const std::string numbers = numbers_of(address);
    const std::lock_guard lock(mutex_);
    size_t count = 0;
    if (!numbers.empty()) {
        count = ++by_address_[numbers];
    }
    auto made = std::make_unique<Connection>(
        Connection{.socket = socket,
                   .address = numbers,
                   .too_many = per_address_ != 0 && count > per_address_});
    Connection* const connection = made.get();
    open_.emplace(connection, std::move(made));
    return connection;
}

void Connections::close(Connection* connection)
{
    const std::lock_guard lock(mutex_);
    const auto counted = by_address_.find(connection->address);
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

void Connections::end_those_before(Clock::time_point time)
{
    const std::lock_guard lock(mutex_);
    for (const auto& [key, owned] : open_) {
        const Connection& connection = *owned;
        if (connection.stage == Stage::working || connection.since >= time) {
            continue;
        }
        if (connection.stage == Stage::receiving && is_plain_) {
            const std::string text = too_slow();
            static_cast<void>(
                !::send(connection.socket, text.data(), text.size(), MSG_DONTWAIT | MSG_NOSIGNAL));
        }
        ::shutdown(connection.socket, SHUT_RDWR);
    }
}

size_t Connections::count() const
{
    const std::lock_guard lock(mutex_);
    return open_.size();
}

} // namespace kzfp::serve
