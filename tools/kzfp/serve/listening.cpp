// As sd_listen_fds() and sd_notify() do, without a library for them: a number of descriptors from 3
// on, and a datagram.

#include "kzfp/serve/listening.hpp"

#include <cerrno>
#include <charconv>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <system_error>

#include <arpa/inet.h>
#include <fcntl.h>
#include <netdb.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include "audio/source.hpp"

namespace kzfp::serve {

namespace {

constexpr int kFirstHandedOver = 3;
constexpr int kBacklog = 1024;

std::string system_text() { return std::system_category().message(errno); }

/// A variable of the environment; empty when there is none.
std::string variable(const char* name)
{
    const char* const text = std::getenv(name); // NOLINT(concurrency-mt-unsafe): before threads
    return text == nullptr ? "" : text;
}

int number_in(const std::string& text)
{
    int number = 0;
    std::from_chars(text.data(), text.data() + text.size(), number);
    return number;
}

bool is_loopback(const sockaddr_storage& address)
{
    if (address.ss_family == AF_INET) {
        const auto& in = reinterpret_cast<const sockaddr_in&>(address);
        return (ntohl(in.sin_addr.s_addr) >> 24U) == 127U;
    }
    if (address.ss_family == AF_INET6) {
        const auto& in = reinterpret_cast<const sockaddr_in6&>(address);
        return IN6_IS_ADDR_LOOPBACK(&in.sin6_addr);
    }
    return address.ss_family == AF_UNIX;
}

std::string name_of(const sockaddr_storage& address, socklen_t size)
{
    char host[NI_MAXHOST] = {};
    char port[NI_MAXSERV] = {};
    if (address.ss_family == AF_UNIX ||
        ::getnameinfo(reinterpret_cast<const sockaddr*>(&address), size, host, sizeof host, port,
                      sizeof port, NI_NUMERICHOST | NI_NUMERICSERV) != 0) {
        return "localhost";
    }
    const std::string name = address.ss_family == AF_INET6 ? "[" + std::string(host) + "]" : host;
    return name + ":" + port;
}

Listener described(audio::Descriptor socket, bool is_handed_over)
{
    sockaddr_storage address = {};
    socklen_t size = sizeof address;
    if (::getsockname(socket.number(), reinterpret_cast<sockaddr*>(&address), &size) != 0) {
        throw audio::FileError("descriptor 3 is no socket (" + system_text() +
                               "); LISTEN_FDS is for sockets that listen");
    }
    return {.socket = std::move(socket),
            .is_handed_over = is_handed_over,
            .is_local = is_loopback(address),
            .name = name_of(address, size)};
}

/// How many sockets were handed over to this process.
int handed_over()
{
    const std::string process = variable("LISTEN_PID");
    const int count = process == std::to_string(::getpid()) ? number_in(variable("LISTEN_FDS")) : 0;
    for (const char* const name : {"LISTEN_PID", "LISTEN_FDS", "LISTEN_FDNAMES"}) {
        ::unsetenv(name); // NOLINT(concurrency-mt-unsafe): before threads
    }
    return count;
}

Listener take_over(int count)
{
    if (count != 1) {
        throw audio::FileError(std::to_string(count) +
                               " sockets were handed over; one is served, so keep one ListenStream "
                               "in the socket's unit");
    }
    int listens = 0;
    socklen_t size = sizeof listens;
    ::getsockopt(kFirstHandedOver, SOL_SOCKET, SO_ACCEPTCONN, &listens, &size);
    if (listens == 0) {
        throw audio::FileError("descriptor 3 is no socket that listens; LISTEN_FDS is for those "
                               "(ListenStream)");
    }
    ::fcntl(kFirstHandedOver, F_SETFD, FD_CLOEXEC);
    ::fcntl(kFirstHandedOver, F_SETFL, ::fcntl(kFirstHandedOver, F_GETFL) | O_NONBLOCK);
    return described(audio::Descriptor(kFirstHandedOver, audio::Descriptor::owned), true);
}

struct FreeAddresses {
    void operator()(addrinfo* list) const { ::freeaddrinfo(list); }
};

/// Empty, with a reason in errno, when nothing can listen there.
audio::Descriptor bound(const addrinfo& at)
{
    audio::Descriptor socket(
        ::socket(at.ai_family, at.ai_socktype | SOCK_CLOEXEC | SOCK_NONBLOCK, at.ai_protocol),
        audio::Descriptor::owned);
    if (socket.number() < 0) {
        return {};
    }
    const int on = 1;
    ::setsockopt(socket.number(), SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
    if (::bind(socket.number(), at.ai_addr, at.ai_addrlen) != 0 ||
        ::listen(socket.number(), kBacklog) != 0) {
        return {};
    }
    return socket;
}

} // namespace

Place parse_place(const std::string& text)
{
    const size_t colon = text.rfind(':');
    const bool has_brackets =
        text.starts_with('[') && colon != 0 && colon != std::string::npos && text[colon - 1] == ']';
    const std::string host = colon == std::string::npos ? ""
                             : has_brackets             ? text.substr(1, colon - 2)
                                                        : text.substr(0, colon);
    const std::string port = colon == std::string::npos ? "" : text.substr(colon + 1);
    uint32_t number = 0;
    const auto [end, error] = std::from_chars(port.data(), port.data() + port.size(), number);
    const bool is_port = error == std::errc() && end == port.data() + port.size() && number < 65536;
    if (host.empty() || !is_port || (!has_brackets && host.find(':') != std::string::npos)) {
        throw audio::FileError("'" + text +
                               "' is no place to listen at; one is 127.0.0.1:8080, [::1]:8080 or "
                               "HOST:PORT");
    }
    return {.host = host, .port = port};
}

Listener listen_at(const std::string& place)
{
    if (const int count = handed_over(); count != 0) {
        return take_over(count);
    }
    const Place wanted = parse_place(place);
    addrinfo hints = {};
    hints.ai_socktype = SOCK_STREAM;
    hints.ai_flags = AI_PASSIVE;
    addrinfo* list = nullptr;
    const int failed = ::getaddrinfo(wanted.host.c_str(), wanted.port.c_str(), &hints, &list);
    if (failed != 0) {
        throw audio::FileError(place + ": there is no such address (" + ::gai_strerror(failed) +
                               "); name one of this machine with --listen");
    }
    const std::unique_ptr<addrinfo, FreeAddresses> addresses(list);
    for (const addrinfo* at = list; at != nullptr; at = at->ai_next) {
        audio::Descriptor socket = bound(*at);
        if (socket.number() >= 0) {
            return described(std::move(socket), false);
        }
    }
    throw audio::FileError(place + ": cannot be listened at (" + system_text() +
                           "); choose another with --listen, or port 0 for one that is free");
}

void notify_manager(const std::string& state)
{
    const std::string path = variable("NOTIFY_SOCKET");
    sockaddr_un address = {};
    address.sun_family = AF_UNIX;
    if (path.empty() || path.size() >= sizeof address.sun_path) {
        return;
    }
    std::memcpy(address.sun_path, path.data(), path.size());
    if (path.front() == '@') {
        address.sun_path[0] = '\0'; // a name that is no file's
    }
    const audio::Descriptor socket(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0),
                                   audio::Descriptor::owned);
    const auto size = static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + path.size());
    static_cast<void>(!::sendto(socket.number(), state.data(), state.size(), MSG_NOSIGNAL,
                                reinterpret_cast<const sockaddr*>(&address), size));
}

} // namespace kzfp::serve
