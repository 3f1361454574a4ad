/// @file
/// A request and its answer, from the first byte of the one to the last of the other.
#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>

#include "kzfp/serve/message.hpp"
#include "kzfp/serve/plan.hpp"

namespace kzfp::serve {

struct Exchange {
    RequestHead head;
    std::string address; ///< of the other side, as numbers; empty when it has none
    std::string body;
    uint64_t largest_body = 0; ///< bytes; more are refused
    Plan plan;                 ///< what is wanted, once the head is understood
    std::optional<Reply> reply;
    std::string reason; ///< the code of the error, when the answer is one
    std::chrono::steady_clock::time_point began = std::chrono::steady_clock::now();
    void* of_server = nullptr; ///< the HTTP server's own
};

/// What an HTTP server hands its requests to. Called by its threads; nothing is thrown through it.
class Receiver {
public:
    virtual ~Receiver() = default;

    /// The head has arrived: sets `largest_body`, or a reply that refuses the request.
    virtual void begin(Exchange& exchange) noexcept = 0;

    /// The HTTP server itself has set a reply that refuses the request: adds what every answer has.
    virtual void complete(Exchange& exchange) noexcept = 0;

    /// All of the request has arrived. Sets the reply; or returns true when it takes longer, and
    /// then a place is kept for what submit() hands over.
    virtual bool takes_longer(Exchange& exchange) noexcept = 0;

    /// Hands the request over. When the reply is set, HttpServer::resume() is to be called.
    virtual void submit(Exchange& exchange) noexcept = 0;

    /// The exchange is over, and goes. `sent`: the answer was sent to its end.
    virtual void end(const Exchange& exchange, bool sent) noexcept = 0;
};

} // namespace kzfp::serve
