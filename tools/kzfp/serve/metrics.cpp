// Label values are words of this program's own, never what a client sent.

#include "kzfp/serve/metrics.hpp"

#include <fstream>

#include <unistd.h>

#include "kzfp/output/printed.hpp"

namespace kzfp::serve {

namespace {

std::string header(const char* name, const char* type, const char* help)
{
    return std::string("# HELP ") + name + " " + help + "\n# TYPE " + name + " " + type + "\n";
}

std::string gauge(const char* name, const char* help, uint64_t value)
{
    return header(name, "gauge", help) + name + " " + std::to_string(value) + "\n";
}

uint64_t resident_bytes()
{
    std::ifstream file("/proc/self/statm");
    uint64_t all = 0;
    uint64_t resident = 0;
    file >> all >> resident;
    return resident * static_cast<uint64_t>(::sysconf(_SC_PAGESIZE));
}

} // namespace

void Metrics::count_lookup(const std::string& kind, const std::string& verdict, double seconds)
{
    const std::lock_guard lock(mutex_);
    ++lookups_[{kind, verdict}];
    ++count_;
    seconds_ += seconds;
    for (size_t i = 0; i < kBounds.size(); ++i) {
        within_.at(i) += seconds <= kBounds.at(i) ? 1U : 0U;
    }
}

void Metrics::count_request(const std::string& route, unsigned status)
{
    const Labels labels(route, std::to_string(status));
    const std::lock_guard lock(mutex_);
    ++requests_[labels];
}

void Metrics::count_refusal(const std::string& reason)
{
    const std::lock_guard lock(mutex_);
    ++refusals_[reason];
}

std::string Metrics::text(const Gauges& gauges) const
{
    const std::lock_guard lock(mutex_);
    std::string text = header("kzfp_lookups_total", "counter", "Clips that were looked up.");
    for (const auto& [labels, count] : lookups_) {
        text += "kzfp_lookups_total{kind=\"" + labels.first + "\",verdict=\"" + labels.second +
                "\"} " + std::to_string(count) + "\n";
    }
    text += header("kzfp_lookup_seconds", "histogram", "How long looking up took.");
    for (size_t i = 0; i < kBounds.size(); ++i) {
        text += "kzfp_lookup_seconds_bucket{le=\"" + printed("%g", kBounds.at(i)) + "\"} " +
                std::to_string(within_.at(i)) + "\n";
    }
    text += "kzfp_lookup_seconds_bucket{le=\"+Inf\"} " + std::to_string(count_) + "\n";
    text += "kzfp_lookup_seconds_sum " + printed("%.6f", seconds_) + "\n";
    text += "kzfp_lookup_seconds_count " + std::to_string(count_) + "\n";
    text += header("kzfp_requests_total", "counter", "Requests that were answered.");
    for (const auto& [labels, count] : requests_) {
        text += "kzfp_requests_total{route=\"" + labels.first + "\",status=\"" + labels.second +
                "\"} " + std::to_string(count) + "\n";
    }
    text += header("kzfp_refused_total", "counter", "Requests that were refused, by their errors.");
    for (const auto& [reason, count] : refusals_) {
        text += "kzfp_refused_total{reason=\"" + reason + "\"} " + std::to_string(count) + "\n";
    }
    return text +
           gauge("kzfp_queue_length", "Requests that wait for a thread.", gauges.queue_length) +
           gauge("kzfp_queue_capacity", "Requests that may wait.", gauges.queue_capacity) +
           gauge("kzfp_connections", "Connections that are open.", gauges.connections) +
           gauge("kzfp_catalogue_tracks", "Tracks of the catalogue.", gauges.tracks) +
           gauge("kzfp_catalogue_codes", "Codes of its tracks.", gauges.codes) +
           gauge("process_resident_memory_bytes", "Memory in use.", resident_bytes());
}

} // namespace kzfp::serve
