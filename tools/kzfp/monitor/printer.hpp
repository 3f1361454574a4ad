/// @file
/// Prints what is noticed about a stream, as soon as it is.
#pragma once

#include <cstdint>
#include <string>

#include "kzfp/monitor/entry.hpp"
#include "kzfp/monitor/page.hpp"
#include "kzfp/monitor/settings.hpp"
#include "kzfp/monitor/summary.hpp"

namespace kzfp {

class Printer {
public:
    /// Both outlive the printer.
    Printer(const MonitorSettings& settings, const WallClock& clock);

    /// What stands before the first event.
    void begin();

    /// Takes all events of a monitor.
    void print_all(kzcat_monitor& monitor);

    /// What happened to the stream at a second of it: something for which CSV has no columns, so
    /// that it becomes a message there.
    void print_interruption(double at, double seconds);
    void print_damage(double at, uint64_t pieces);
    void print_format(double at, const audio::StreamFormat& format);

    void print_summary(const StreamFacts& facts);

    /// The page of the report, as HTML.
    std::string page(const StreamFacts& facts) const;

private:
    void print(const Entry& entry);
    void print_notice(const Notice& notice);

    const MonitorSettings& settings_;
    Format format_;
    Clock clock_;
    Summary summary_;
    MonitorReport report_;
};

} // namespace kzfp
