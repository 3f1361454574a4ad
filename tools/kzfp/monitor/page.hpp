/// @file
/// The page of a monitor's run: --report.
#pragma once

#include <string>
#include <vector>

#include "kzfp/monitor/entry.hpp"
#include "kzfp/monitor/summary.hpp"
#include "report/report.hpp"

namespace kzfp {

/// Collects the entries of a run. Memory grows with their number.
class MonitorReport {
public:
    /// Takes an entry that has ended; passes over other events.
    void add(const Entry& entry);

    /// The page as HTML.
    std::string page(const std::string& stream, const Summary& summary,
                     const StreamFacts& facts) const;

private:
    std::vector<report::Run> runs_;
};

} // namespace kzfp
