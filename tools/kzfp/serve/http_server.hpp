/// @file
/// HTTP over a listening socket: reads requests within limits and sends their answers.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>

#include "kzfp/serve/exchange.hpp"

namespace kzfp::serve {

struct HttpSettings {
    int listener = -1;      ///< a socket that listens; stays the caller's
    bool is_shared = false; ///< others listen to it too, so it is not to be shut down
    uint32_t threads = 1;
    uint32_t connections = 1024;    ///< at once; further ones wait until one of them ends
    uint32_t per_address = 0;       ///< of these from one address; 0 for no limit
    uint32_t idle_seconds = 15;     ///< a connection on which nothing moves for so long is closed
    uint32_t receive_seconds = 120; ///< a request has to have arrived within these
    uint64_t body_bytes = uint64_t{256} << 20U; ///< of all requests that are received or wait
    std::string certificate;                    ///< PEM; empty for no TLS
    std::string key;                            ///< PEM
};

/// Throws audio::FileError when there is no HTTP server in this build, or on this machine, and says
/// what to install.
void check_http();

class HttpServer {
public:
    /// Begins to serve. `receiver` outlives the object. Throws audio::FileError.
    HttpServer(const HttpSettings& settings, Receiver& receiver);

    ~HttpServer();
    HttpServer(const HttpServer&) = delete;
    HttpServer& operator=(const HttpServer&) = delete;

    /// Sends the reply of an exchange that was submitted.
    void resume(Exchange& exchange);

    /// From now on connections end with their answers, and none are accepted but those that were
    /// made before.
    void stop_accepting();

    /// Ends all connections and threads. No exchange may be in the receiver's hands. The
    /// destructor does the same.
    void stop();

    /// Connections that are open.
    size_t connections() const;

    /// Exchanges that have begun and are not over.
    size_t exchanges() const;

    /// Closes connections that have had their time; to be called about once a second.
    void close_slow_ones();

private:
    class Inside;
    std::unique_ptr<Inside> inside_;
};

} // namespace kzfp::serve
