/// @file
/// The recognition service: what is behind its addresses.
#pragma once

#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <latch>
#include <memory>
#include <string>
#include <vector>

#include "kzfp/serve/catalogues.hpp"
#include "kzfp/serve/http_server.hpp"
#include "kzfp/serve/metrics.hpp"
#include "kzfp/serve/page_files.hpp"
#include "kzfp/serve/plan.hpp"
#include "kzfp/serve/request_log.hpp"
#include "kzfp/serve/work_queue.hpp"

namespace kzfp::serve {

struct ServiceSettings {
    Rules rules = {};
    HttpSettings http = {};
    std::string page = {}; ///< a folder; empty for none
    bool hide_sources = false;
    uint32_t longest_clip = 600; ///< seconds of what is looked up
    size_t lookups = 1;          ///< threads that answer
    size_t places = 64;          ///< requests that may wait for them
    LogFormat log = LogFormat::text;
    bool log_addresses = false;
};

class Service final : public Receiver {
public:
    /// Begins to serve. `catalogue` outlives the object. Throws audio::FileError.
    Service(const ServiceSettings& settings, Catalogues& catalogue);
    ~Service() override;
    Service(const Service&) = delete;
    Service& operator=(const Service&) = delete;

    /// Takes no more connections, and answers what was accepted, for up to these seconds. What
    /// then still waits is told to come again, and what is worked on has some seconds more. Returns
    /// how many requests are worked on even then: unless there are none, the process has to be
    /// ended without destroying the object, which would wait for them.
    size_t drain(uint32_t seconds);

    /// What is to be done about once a second.
    void tick();

    void begin(Exchange& exchange) noexcept override;
    void complete(Exchange& exchange) noexcept override;
    bool takes_longer(Exchange& exchange) noexcept override;
    void submit(Exchange& exchange) noexcept override;
    void end(const Exchange& exchange, bool sent) noexcept override;

private:
    WorkQueue& queue_of(const Exchange& exchange);
    Reply answer_at_once(const Exchange& exchange) const;
    Reply answer(Exchange& exchange);
    Reply health(const Exchange& exchange) const;
    Reply options() const;
    void work(Exchange& exchange) noexcept;
    void finish(Exchange& exchange);
    void wait_for_quiet(std::chrono::steady_clock::time_point end) const;

    const ServiceSettings settings_;
    Catalogues& catalogue_;
    const PageFiles page_;
    const std::string description_; ///< of the interface; empty when it is not installed
    mutable Metrics metrics_;
    RequestLog log_;
    std::atomic<bool> drains_ = false;
    unsigned ticks_ = 0;
    WorkQueue lookups_;
    WorkQueue changes_; ///< one after the other: a catalogue has one writer at a time
    std::latch served_{1};
    std::unique_ptr<HttpServer> server_;
};

} // namespace kzfp::serve
