// How the cost grows with the length of a sound that is passed in whole.

#include <algorithm>
#include <cstring>

#include <sys/mman.h>

#include "growth/growth.hpp"

namespace kz::bench {

namespace {

/// Music for a fingerprint, then nothing for hours. Pages that are never read take no memory.
class LongSound {
public:
    explicit LongSound(size_t size)
        : size_(size), bytes_(mmap(nullptr, size, PROT_READ | PROT_WRITE,
                                   MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0))
    {
        require(bytes_ != MAP_FAILED, "no address space for hours of sound");
        const auto music = stereo_sound();
        std::memcpy(bytes_, music.data(), bytes_of(music));
    }
    ~LongSound() { munmap(bytes_, size_); }
    LongSound(const LongSound&) = delete;
    LongSound& operator=(const LongSound&) = delete;

    const uint8_t* bytes() const { return static_cast<const uint8_t*>(bytes_); }

private:
    size_t size_;
    void* bytes_;
};

size_t bytes_in(double seconds) { return static_cast<size_t>(seconds * kRate) * kFrameBytes; }

/// One call, or as few as a call's 32-bit count of bytes allows.
void feed(Fingerprint& fingerprint, const uint8_t* bytes, size_t size)
{
    constexpr size_t kMax = UINT32_MAX / kFrameBytes * kFrameBytes;
    while (size > 0) {
        const size_t piece = std::min(size, kMax);
        fingerprint.feed(bytes, piece);
        bytes += piece;
        size -= piece;
    }
}

} // namespace

GrowthTable grow_duration(bool thorough)
{
    const std::vector<double> durations = {1, 5, kOffered, 60, 600, 3600, 36000};
    const LongSound sound(bytes_in(durations.back()));
    std::vector<std::vector<double>> times(durations.size());
    for (int round = 0; round < (thorough ? 51 : 15); ++round) {
        for (size_t i = 0; i < durations.size(); ++i) {
            times[i].push_back(cpu_seconds([&] {
                Fingerprint fingerprint(kStereo);
                feed(fingerprint, sound.bytes(), bytes_in(durations[i]));
            }));
        }
    }
    GrowthTable table{"Linear until the fingerprint is complete, then flat: 10 h ≤ 1.05 × 14.22 s",
                      {"handed over whole", "time", "of 14.22 s"},
                      {},
                      true};
    const double complete = spread_of(times[2]).median;
    for (size_t i = 0; i < durations.size(); ++i) {
        const double time = spread_of(times[i]).median;
        table.rows.push_back({number(durations[i], i == 2 ? 2 : 0) + " s", in_time(time),
                              number(time / complete, 3)});
        table.holds = *table.holds && (i < 2 || time <= 1.05 * complete);
    }
    return table;
}

} // namespace kz::bench
