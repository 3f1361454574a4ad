// How the cost grows with the frames that a frame manager without a limit keeps.

#include "cases/sound.hpp"
#include "growth/growth.hpp"
#include "measure/heap_meter.hpp"

namespace kz::bench {

GrowthTable grow_frames(bool thorough)
{
    constexpr uint32_t kTimed = 10; // frames at a time
    const auto config = default_config();
    config->frame_limit = 0;
    const FixedFrames frames(kzqvfixed_frame_manager_create(config.get()));
    const auto sound = fixed_sound(kWorkingHertz, kFrame);
    const auto append = [&] {
        for (uint32_t i = 0; i < kTimed; ++i) {
            kzqvfixed_frame_manager_append_dual_PCM_data(frames.get(), sound.data(), kFrame,
                                                         nullptr, 0);
        }
    };
    GrowthTable table{"A frame takes as long with many before it, within 5 %; a record takes at "
                      "most 250 bytes",
                      {"frames", "time for a frame", "of the first", "bytes a record"},
                      {},
                      true};
    const int64_t before = heap_use().bytes;
    double first = 0;
    uint32_t count = 0;
    for (const uint32_t end : {100U, 1000U, thorough ? 100000U : 10000U}) {
        std::vector<double> times;
        for (; count < end; count += kTimed) {
            times.push_back(cpu_seconds(append) / kTimed);
        }
        const double time = spread_of(times).lower; // the quarter that nothing disturbed
        const double bytes = static_cast<double>(heap_use().bytes - before) / count;
        first = first == 0 ? time : first;
        table.rows.push_back(
            {number(count), in_time(time), number(time / first, 3), number(bytes, 1)});
        table.holds = *table.holds && time <= 1.05 * first && bytes <= 250;
    }
    return table;
}

} // namespace kz::bench
