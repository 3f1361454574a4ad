// What happens to a frame: equaliser, decimation, transform, bands.

#include "cases/cases.hpp"
#include "cases/sound.hpp"
#include "peers/peers.hpp"
#include "support/digest.hpp"

namespace kz::bench {

namespace {

using kz::test::digest_of;

Prepared equaliser()
{
    const auto stages = std::make_shared<FrameStages>();
    return {[stages] {
                stages->equalise();
                keep(stages->equalised.data());
            },
            [stages] {
                stages->equalise();
                return digest_of(stages->equalised);
            },
            [] { return Peers{copying(2 * kFrame * sizeof(FxpType), 4)}; }};
}

Prepared decimator()
{
    const auto stages = std::make_shared<FrameStages>();
    stages->equalise();
    return {[stages] {
                stages->decimate();
                keep(stages->half.data());
            },
            [stages] {
                stages->decimate();
                return digest_of(stages->half);
            },
            [] { return Peers{swresample_float(22050, kFrame)}; }};
}

/// A frame manager whose bands are the usual ones, this many times over.
FixedFrames frames_with_bands(uint32_t times)
{
    const FixedConfig config = default_config();
    const std::vector<int32_t> usual(config->freq_table,
                                     config->freq_table + config->freq_table_count);
    std::vector<int32_t> table;
    for (uint32_t i = 0; i < times; ++i) {
        table.insert(table.end(), usual.begin(), usual.end());
    }
    kzqvfixed_config_set_freq_table(config.get(), table.data(),
                                    static_cast<uint32_t>(table.size()));
    return FixedFrames(kzqvfixed_frame_manager_create(config.get()));
}

/// Frames as the fingerprinter appends them, twelve to a fingerprint.
class Appending {
public:
    explicit Appending(uint32_t times = 1) : frames_(frames_with_bands(times)) {}

    void append()
    {
        if (kzqvfixed_frame_manager_reached_frame_limit(frames_.get()) != 0) {
            kzqvfixed_frame_manager_reset(frames_.get());
        }
        kzqvfixed_frame_manager_append_dual_PCM_data(frames_.get(), frame_.data(), kHop,
                                                     frame_.data() + kHop, kFrame - kHop);
    }

    /// Of the features of a frame.
    std::string digest()
    {
        kzqvfixed_frame_manager_reset(frames_.get());
        append();
        const auto* const record = frames_->records;
        std::vector<FxpType> features(record->energy, record->energy + frames_->band_count);
        features.insert(features.end(), record->amplitude, record->amplitude + frames_->band_count);
        return digest_of(features);
    }

private:
    Aligned<FxpType> frame_ = fixed_sound(kWorkingHertz, kFrame);
    FixedFrames frames_;
};

Prepared whole_frame()
{
    const auto appending = std::make_shared<Appending>();
    return {[appending] { appending->append(); }, [appending] { return appending->digest(); }};
}

// The bands are a small part of a frame. They are therefore measured as the difference between
// frames with this many times the bands and usual frames.
constexpr uint32_t kTimesTheBands = 65;

Prepared bands()
{
    const auto many = std::make_shared<Appending>(kTimesTheBands);
    const auto usual = std::make_shared<Appending>();
    return {[many] { many->append(); },
            [many] { return many->digest(); },
            [] { return Peers{reading(kFrame / 2 * sizeof(FxpType), kTimesTheBands - 1)}; },
            {[usual] { usual->append(); }}};
}

} // namespace

std::vector<Case> frame_cases()
{
    return {
        {"hist_eq", "a frame equalised", microseconds(), at_most(32), at_most(22), equaliser},
        {"decimate2", "a frame halved", microseconds(), share_of(kSwresample, 0.8),
         share_of(kSwresample, 0.4), decimator},
        {"bands",
         "fifteen bands and roots",
         {"µs", 1e-6 * (kTimesTheBands - 1)},
         at_most(8),
         at_most(3.5),
         bands},
        {"frame", "a whole frame", microseconds(), {}, at_most(62), whole_frame},
    };
}

} // namespace kz::bench
