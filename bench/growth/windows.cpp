// How many fingerprints are taken, one after the other.

#include <cmath>

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
        std::vector<double> single;
        double together = 0;
        // The single ones lie between the parts of the many, so both see the same machine.
        for (int part = 0; part < 16; ++part) {
            single.push_back(cpu_seconds([&] { fingerprints(1); }));
            const auto from = count * static_cast<uint32_t>(part) / 16;
            const auto to = count * static_cast<uint32_t>(part + 1) / 16;
            together += cpu_seconds([&] { fingerprints(to - from); });
        }
        const double share = together / (count * spread_of(single).median);
        table.rows.push_back({number(count), in_time(together), number(share, 3)});
        table.holds = *table.holds && std::abs(share - 1) <= 0.05;
    }
    return table;
}

} // namespace kz::bench
