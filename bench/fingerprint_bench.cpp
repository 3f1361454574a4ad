// The whole road: what an application pays for a fingerprint, and for the document.

#include <cstdint>
#include <span>
#include <vector>

#include <benchmark/benchmark.h>

#include "started.hpp"
#include "support/signals.hpp"

namespace {

using namespace kz::bench;

/// Owns a handle for one fingerprint.
class Fingerprint {
public:
    Fingerprint(uint32_t rate, uint32_t channels)
    {
        kz_fpx_fingerprint_create(KZ_FPX_ALGORITHM_FIXED, KZ_FPX_FORMAT_PCM16, rate, channels,
                                  &handle_);
    }
    ~Fingerprint() { kz_fpx_fingerprint_free(&handle_); }
    Fingerprint(const Fingerprint&) = delete;
    Fingerprint& operator=(const Fingerprint&) = delete;

    bool complete_after(std::span<const int16_t> samples)
    {
        uint8_t complete = 0;
        kz_fpx_fingerprint_add_audio(handle_, samples.data(),
                                     static_cast<uint32_t>(samples.size_bytes()), &complete);
        return complete != 0;
    }

    bool serialize()
    {
        char* text = nullptr;
        const bool written = kz_fpx_fingerprint_serialize(handle_, &text) == KZ_OK;
        kz_fpx_fingerprint_serialize_free(&text);
        return written;
    }

private:
    kz_fpx_handle* handle_ = nullptr;
};

/// Seconds of sound that a default fingerprint listens to: eleven hops and one frame.
constexpr double listened = (11.0 * frame_hop + frame_samples) / working_rate;

// A default fingerprint of 16-bit music, from creation to document. Arguments: rate, channels.
void BM_WholeFingerprint(benchmark::State& state)
{
    start_library();
    const auto rate = static_cast<uint32_t>(state.range(0));
    const auto channels = static_cast<uint32_t>(state.range(1));
    const auto music = kz::test::tune(rate, channels, 15.0);
    for (auto _ : state) {
        Fingerprint fingerprint(rate, channels);
        if (!fingerprint.complete_after(music) || !fingerprint.serialize()) {
            state.SkipWithError("no fingerprint");
            break;
        }
    }
    using benchmark::Counter;
    state.counters["per_second_of_audio"] =
        Counter(listened, Counter::kIsIterationInvariantRate | Counter::kInvert);
    state.counters["times_real_time"] = Counter(listened, Counter::kIsIterationInvariantRate);
}
BENCHMARK(BM_WholeFingerprint)
    ->ArgNames({"hz", "channels"})
    ->Args({44100, 2})
    ->Args({48000, 2})
    ->Args({22050, 1})
    ->Args({11025, 1})
    ->Args({8000, 1})
    ->Unit(benchmark::kMillisecond);

// The document of a fingerprint that is complete: tag tree, text, and freeing both.
void BM_Serialize(benchmark::State& state)
{
    start_library();
    Fingerprint fingerprint(working_rate, 1);
    if (!fingerprint.complete_after(kz::test::tune(working_rate, 1, 15.0))) {
        state.SkipWithError("no fingerprint");
    }
    for (auto _ : state) {
        benchmark::DoNotOptimize(fingerprint.serialize());
    }
}
BENCHMARK(BM_Serialize)->Unit(benchmark::kMicrosecond);

} // namespace
