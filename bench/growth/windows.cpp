// How the cost grows with the number of fingerprints taken one after the other.

#include <cmath>
#include <numeric>

#include "growth/growth.hpp"

namespace kz::bench {

GrowthTable grow_windows(bool thorough)
{
    const auto sound = stereo_sound();
    const auto fingerprints = [&](uint32_t count) {
        for (uint32_t i = 0; i < count; ++i) {
            Fingerprint fingerprint(kStereo);
            require(fingerprint.feed(sound.data(), bytes_of(sound)), "not complete");
            fingerprint.render([](const char* text) { keep(text); });
        }
    };
    std::vector<uint32_t> counts = {16, 64, 253}; // the last fill an hour
    if (thorough) {
        counts.push_back(2533); // ten hours
    }
    GrowthTable table{"n fingerprints take n times as long as one, within 5 %",
                      {"fingerprints", "time", "n × one"},
                      {},
                      true};
    for (const uint32_t count : counts) {
        std::vector<double> shares;
        std::vector<double> totals;
        for (int round = 0; round < 7; ++round) {
            // As many single ones, before and after, so that both run under the same conditions.
            std::vector<double> singles;
            const auto time_singles = [&] {
                for (uint32_t i = 0; i < count / 2; ++i) {
                    singles.push_back(cpu_seconds([&] { fingerprints(1); }));
                }
            };
            time_singles();
            totals.push_back(cpu_seconds([&] { fingerprints(count); }));
            time_singles();
            const double mean = std::accumulate(singles.begin(), singles.end(), 0.0) /
                                static_cast<double>(singles.size());
            shares.push_back(totals.back() / (count * mean));
        }
        const double share = spread_of(shares).median;
        table.rows.push_back({number(count), in_time(spread_of(totals).median), number(share, 3)});
        table.holds = *table.holds && std::abs(share - 1) <= 0.05;
    }
    return table;
}

} // namespace kz::bench
