/// @file
/// The connections that are open: how many there are from each address, and since when each waits.
#pragma once

#include <chrono>
#include <cstddef>
#include <map>
#include <memory>
#include <mutex>
#include <string>

#include <sys/socket.h>

namespace kzfp::serve {

using Clock = std::chrono::steady_clock;

/// What happens on a connection.
enum class Stage {
    idle,      ///< a request is expected
    receiving, ///< one arrives
    working,   ///< its answer is made
    sending
};

/// May be used by several threads at once.
class Connections {
public:
    /// A connection, as long as it is open.
    struct Connection {
        int socket;
        std::string address; ///< as numbers; empty when there is none
        std::string group;   ///< what it is counted with
        bool too_many;       ///< more from its address than may be
        Stage stage = Stage::idle;
        Clock::time_point since = Clock::now();
    };

    /// `per_address`: as many connections from one address are not too many; 0 for any number.
    /// `is_plain`: what is written to a socket reaches the other side as it is.
    Connections(size_t per_address, bool is_plain) : per_address_(per_address), is_plain_(is_plain)
    {
    }

    /// One too many is told so, and ended. The result stays valid until close().
    Connection* open(int socket, const sockaddr* address);
    void close(Connection* connection);

    void enter(Connection& connection, Stage stage);

    /// Ends those that have been receiving or sending since before `moving`, or idle since before
    /// `idle`. Those that have sent a part of a request are told so first.
    void end_those_before(Clock::time_point moving, Clock::time_point idle);

    size_t count() const;

private:
    void end(const Connection& connection, const std::string& last_words) const;

    const size_t per_address_;
    const bool is_plain_;
    mutable std::mutex mutex_;
    std::map<const Connection*, std::unique_ptr<Connection>> open_;
    std::map<std::string, size_t> by_address_;
};

/// The addresses among which a client can choose, as a text: of IPv6 the network of 64 bits.
std::string group_of(const sockaddr* address);

/// An address as numbers, without its port; empty for one that is none of the network's.
std::string numbers_of(const sockaddr* address);

} // namespace kzfp::serve
