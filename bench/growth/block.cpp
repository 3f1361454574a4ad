// How the cost grows as a sound is cut into smaller pieces.

#include "growth/growth.hpp"

namespace kz::bench {

namespace {

struct Fed {
    double seconds; ///< of processor time
    uint32_t calls;
};

Fed feed_in_blocks(const std::vector<int16_t>& sound, uint32_t frames)
{
    Fingerprint fingerprint(kStereo);
    uint32_t calls = 0;
    const double seconds = cpu_seconds([&] {
        const int16_t* at = sound.data();
        while (!fingerprint.feed(at, size_t{frames} * kFrameBytes)) {
            at += size_t{frames} * 2;
            ++calls;
        }
    });
    return {seconds, calls + 1};
}

/// Seconds for a call that comes when there is nothing left to do.
double call_after_the_end(const std::vector<int16_t>& sound)
{
    constexpr int kCalls = 1000000;
    Fingerprint fingerprint(kStereo);
    fingerprint.feed(sound.data(), bytes_of(sound));
    return cpu_seconds([&] {
               for (int i = 0; i < kCalls; ++i) {
                   fingerprint.feed(sound.data(), 441 * kFrameBytes);
               }
           }) /
           kCalls;
}

} // namespace

GrowthTable grow_block(bool thorough)
{
    const auto sound = stereo_sound();
    const auto whole = static_cast<uint32_t>(sound.size() / 2);
    const std::vector<uint32_t> sizes = {1, 16, 441, 4096, whole};
    std::vector<std::vector<double>> times(sizes.size());
    std::vector<uint32_t> calls(sizes.size());
    for (int round = 0; round < (thorough ? 31 : 9); ++round) {
        for (size_t i = 0; i < sizes.size(); ++i) {
            const Fed fed = feed_in_blocks(sound, sizes[i]);
            times[i].push_back(fed.seconds);
            calls[i] = fed.calls;
        }
    }
    GrowthTable table{
        "Blocks of 441 frames take at most 1.4 times as long as the whole, a block of "
        "one frame at most 60 ns, a call after completion at most 20 ns",
        {"frames in a block", "time", "of the whole", "for a call"},
        {},
        true};
    const double at_once = spread_of(times.back()).median;
    for (size_t i = 0; i < sizes.size(); ++i) {
        const double time = spread_of(times[i]).median;
        const double for_a_call = time / calls[i];
        table.rows.push_back({sizes[i] == whole ? "all" : number(sizes[i]), in_time(time),
                              number(time / at_once, 2), in_time(for_a_call)});
        table.holds = *table.holds && (sizes[i] != 1 || for_a_call <= 60e-9) &&
                      (sizes[i] != 441 || time <= 1.4 * at_once);
    }
    const double idle = call_after_the_end(sound);
    table.rows.push_back({"after completion", "", "", in_time(idle)});
    table.holds = *table.holds && idle <= 20e-9;
    return table;
}

} // namespace kz::bench
