// The route is a pattern of this program's own, so that nothing that was sent is in the line.

#include "kzfp/serve/request_log.hpp"

#include <array>
#include <chrono>
#include <ctime>

#include "kzfp/output/json_object.hpp"
#include "kzfp/output/printed.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp::serve {

namespace {

/// "2030-01-31T12:00:00Z".
std::string time_now()
{
    const std::time_t now = std::time(nullptr);
    std::tm parts = {};
    gmtime_r(&now, &parts);
    std::array<char, 32> text{};
    return {text.data(), std::strftime(text.data(), text.size(), "%Y-%m-%dT%H:%M:%SZ", &parts)};
}

/// A method as it is logged: one that is no method of HTTP could hold anything.
std::string method_of(const Exchange& exchange)
{
    for (const char* const method : {"GET", "HEAD", "POST", "DELETE", "OPTIONS", "PUT", "PATCH"}) {
        if (exchange.head.method == method) {
            return method;
        }
    }
    return "OTHER";
}

} // namespace

void RequestLog::write(const Exchange& exchange, bool sent)
{
    if (format_ == LogFormat::none) {
        return;
    }
    const std::chrono::duration<double> taken = std::chrono::steady_clock::now() - exchange.began;
    const unsigned status = exchange.reply ? exchange.reply->status : 0;
    const std::string result = sent ? std::to_string(status) : "broken off";
    std::string line;
    if (format_ == LogFormat::json) {
        JsonObject object = JsonObject::object_t();
        object["time"] = time_now();
        object["method"] = method_of(exchange);
        object["route"] = exchange.plan.route;
        object["status"] = sent ? JsonObject(status) : JsonObject();
        object["seconds"] = taken.count();
        if (!exchange.reason.empty()) {
            object["error"] = exchange.reason;
        }
        if (addresses_) {
            object["address"] = exchange.address;
        }
        line = to_line(object);
    } else {
        line = time_now() + " " + method_of(exchange) + " " + std::string(exchange.plan.route) +
               " " + result + (exchange.reason.empty() ? "" : " " + exchange.reason) + " " +
               printed("%.4f s", taken.count()) + (addresses_ ? " " + exchange.address : "") + "\n";
    }
    const std::lock_guard lock(mutex_);
    write_to_standard_error(line);
}

} // namespace kzfp::serve
