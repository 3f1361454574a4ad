// How the cost grows with the silence before the sound.

#include "cases/sound.hpp"
#include "growth/growth.hpp"
#include "measure/heap_meter.hpp"

namespace kz::bench {

GrowthTable grow_silence(bool thorough)
{
    constexpr uint32_t kPiece = 10; // seconds
    constexpr double kMaxNanoseconds = 1.6;
    const auto silence = quiet_noise(size_t{kRate} * 2 * kPiece);
    std::vector<uint32_t> durations = {10, 60, 600};
    if (thorough) {
        durations.insert(durations.end(), {3600, 36000});
    }
    GrowthTable table{"Linear, at most 1.6 ns for a frame of input, with memory constant",
                      {"silence", "time", "ns per frame of input", "heap"},
                      {},
                      true};
    int64_t first_heap = 0;
    for (const uint32_t seconds : durations) {
        std::vector<double> times;
        int64_t heap = 0;
        for (uint32_t fed = 0; fed < 300; fed += seconds) {
            const int64_t before = heap_use().bytes;
            Fingerprint fingerprint(kStereo);
            times.push_back(cpu_seconds([&] {
                for (uint32_t at = 0; at < seconds; at += kPiece) {
                    fingerprint.feed(silence.data(), bytes_of(silence));
                }
            }));
            heap = heap_use().bytes - before;
        }
        first_heap = first_heap == 0 ? heap : first_heap;
        const double time = spread_of(times).median;
        const double nanoseconds = time * 1e9 / (static_cast<double>(seconds) * kRate);
        table.rows.push_back({number(seconds) + " s", in_time(time), number(nanoseconds, 2),
                              number(static_cast<double>(heap)) + " bytes"});
        table.holds = *table.holds && nanoseconds <= kMaxNanoseconds && heap == first_heap;
    }
    return table;
}

} // namespace kz::bench
