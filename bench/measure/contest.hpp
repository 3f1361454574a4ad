/// @file
/// Our work and its peers, timed in alternating slices.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "case.hpp"
#include "measure/slice.hpp"
#include "measure/spread.hpp"

namespace kz::bench {

/// What was measured of a peer: seconds of one run, and our time as a share of it, a value from
/// each pair of slices.
struct PeerResult {
    std::string name;
    Spread seconds;
    Spread ratio;
    double ratio_of_bests = 0;
};

struct Result {
    Spread seconds;
    std::vector<PeerResult> peers;
};

/// A case under way.
class Contest {
public:
    /// Verifies the peers, and warms everything up.
    ///
    /// @param slice_seconds  Length of a slice, or of a single run where that takes longer.
    Contest(const Prepared& prepared, double slice_seconds);

    /// Measures one pair of slices for each peer.
    void round(bool peers_first);

    Result result() const;

private:
    struct Rival {
        std::string name;
        std::optional<Slice> work; ///< none when its time is recorded
        double recorded_seconds;
        std::vector<double> times;
        std::vector<double> ratios;
    };

    double measure_ours();
    static double measure(const Rival& rival);

    Slice ours_;
    std::vector<Slice> beside_;
    std::vector<double> times_;
    std::vector<Rival> rivals_;
};

} // namespace kz::bench
