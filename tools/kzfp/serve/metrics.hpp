/// @file
/// What the service has done, as Prometheus reads it.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <map>
#include <mutex>
#include <string>
#include <utility>

namespace kzfp::serve {

/// What is measured at the moment of asking.
struct Gauges {
    size_t queue_length = 0;
    size_t queue_capacity = 0;
    size_t connections = 0;
    uint64_t tracks = 0;
    uint64_t codes = 0;
};

/// May be used by several threads at once.
class Metrics {
public:
    void count_lookup(const std::string& kind, const std::string& verdict, double seconds);
    void count_request(const std::string& route, unsigned status);
    void count_refusal(const std::string& reason);

    /// In the text format, version 0.0.4.
    std::string text(const Gauges& gauges) const;

private:
    using Labels = std::pair<std::string, std::string>;

    static constexpr std::array<double, 13> kBounds = {0.001, 0.0025, 0.005, 0.01, 0.025, 0.05, 0.1,
                                                       0.25,  0.5,    1,     2.5,  5,     10};

    mutable std::mutex mutex_;
    std::map<Labels, uint64_t> lookups_;
    std::map<Labels, uint64_t> requests_;
    std::map<std::string, uint64_t> refusals_;
    std::array<uint64_t, kBounds.size()> within_{}; ///< look-ups that took no longer
    uint64_t count_ = 0;
    double seconds_ = 0;
};

} // namespace kzfp::serve
