// The stages of the road one by one, each on what the stage before it hands over. `times_real_time`
// tells how many seconds of audio the stage alone handles in one.

#include <algorithm>
#include <cstdint>
#include <vector>

#include <benchmark/benchmark.h>

#include "started.hpp"
#include "support/signals.hpp"

namespace {

using namespace kz::bench;

/// Reports that every iteration handled this many seconds of audio.
void count_audio(benchmark::State& state, double seconds)
{
    state.counters["times_real_time"] =
        benchmark::Counter(seconds, benchmark::Counter::kIsIterationInvariantRate);
}

/// The fingerprinter converts this many samples at a time.
constexpr uint32_t chunk = KZQVFIXED_CONVERSION_SAMPLES;

using Converter = void (*)(const void*, FxpType*, int32_t);

// Interleaved samples to mono words, one chunk at 44100 Hz.
void BM_Convert(benchmark::State& state, Converter convert, uint32_t channels)
{
    const auto music = kz::test::tune(44100, channels, 1.0);
    std::vector<FxpType> mono(chunk);
    for (auto _ : state) {
        convert(music.data(), mono.data(), int32_t{chunk});
        benchmark::DoNotOptimize(mono.data());
        benchmark::ClobberMemory();
    }
    count_audio(state, chunk / 44100.0);
}
BENCHMARK_CAPTURE(BM_Convert, pcm16_stereo, KZDSP_StereoPCM16ToMonoQ30, 2);
BENCHMARK_CAPTURE(BM_Convert, pcm16_mono, KZDSP_PCM16ToQ29, 1);
BENCHMARK_CAPTURE(BM_Convert, pcm8_stereo, KZDSP_StereoPCM8ToMonoQ30, 2);
BENCHMARK_CAPTURE(BM_Convert, alaw_mono, KZDSP_ALawToQ29, 1);
BENCHMARK_CAPTURE(BM_Convert, ulaw_mono, KZDSP_uLawToQ29, 1);

std::vector<FxpType> mono_music(uint32_t rate, double seconds)
{
    const auto music = kz::test::tune(rate, 1, seconds);
    std::vector<FxpType> mono(music.size());
    KZDSP_PCM16ToQ29(music.data(), mono.data(), static_cast<int32_t>(music.size()));
    return mono;
}

// A second of mono words to the working rate, chunk by chunk. 44100 and 22050 Hz take every fourth
// or second window of a short filter; the others step through the phases of a long one.
void BM_Resample(benchmark::State& state)
{
    start_library();
    const auto rate = static_cast<uint32_t>(state.range(0));
    const auto input = mono_music(rate, 1.0);
    std::vector<FxpType> output(working_rate + chunk);
    const Resampler resampler(KZDSP_resampler_fixed_create(rate << 15, working_rate << 15));
    for (auto _ : state) {
        for (size_t done = 0; done < input.size();) {
            const auto offered =
                static_cast<uint32_t>(std::min<size_t>(chunk, input.size() - done));
            uint32_t consumed = 0;
            uint32_t produced = 0;
            KZDSP_resampler_fixed_resample(resampler.get(), input.data() + done, offered,
                                           output.data(), working_rate + chunk, &consumed,
                                           &produced);
            done += consumed;
        }
        benchmark::DoNotOptimize(output.data());
        benchmark::ClobberMemory();
    }
    count_audio(state, 1.0);
}
BENCHMARK(BM_Resample)
    ->ArgName("hz")
    ->Arg(44100)
    ->Arg(22050)
    ->Arg(48000)
    ->Arg(32000)
    ->Arg(24000)
    ->Arg(16000)
    ->Arg(8000)
    ->Arg(11025)
    ->Unit(benchmark::kMicrosecond);

// The search for the start of the signal in a second of working-rate samples.
void BM_DetectSignal(benchmark::State& state)
{
    start_library();
    const auto samples = mono_music(working_rate, 1.0);
    const Detector detector(kzqvfixed_signal_detector_create(128, 100, 1000));
    for (auto _ : state) {
        benchmark::DoNotOptimize(kzqvfixed_signal_detector_get_signal_offset(
            detector.get(), samples.data(), static_cast<uint32_t>(samples.size()), 13));
    }
    count_audio(state, 1.0);
}
BENCHMARK(BM_DetectSignal)->Unit(benchmark::kMicrosecond);

// The stages from here on work on frames. A frame arrives with every hop.
constexpr double hop_seconds = double{frame_hop} / working_rate;

std::vector<FxpType> frame_of_music()
{
    auto frame = mono_music(working_rate, 3.0);
    frame.resize(frame_samples);
    return frame;
}

std::vector<FxpType> equalised_frame()
{
    const auto frame = frame_of_music();
    std::vector<FxpType> output(frame_samples);
    std::vector<uint32_t> histogram(257);
    kzqvfixed_hist_eq_dual(frame.data(), frame_samples, nullptr, 0, output.data(), frame_samples,
                           histogram.data(), 256);
    return output;
}

// Rank equalisation of a frame that lies in two pieces, as in the ring.
void BM_Equalise(benchmark::State& state)
{
    start_library();
    const auto frame = frame_of_music();
    std::vector<FxpType> output(frame_samples);
    std::vector<uint32_t> histogram(257);
    for (auto _ : state) {
        kzqvfixed_hist_eq_dual(frame.data(), frame_hop, frame.data() + frame_hop,
                               frame_samples - frame_hop, output.data(), frame_samples,
                               histogram.data(), 256);
        benchmark::DoNotOptimize(output.data());
        benchmark::ClobberMemory();
    }
    count_audio(state, hop_seconds);
}
BENCHMARK(BM_Equalise)->Unit(benchmark::kMicrosecond);

// Halving the rate of a frame.
void BM_Decimate(benchmark::State& state)
{
    start_library();
    const auto frame = equalised_frame();
    std::vector<FxpType> half(frame_samples / 2);
    const Resampler decimator(KZDSP_resampler_fixed_create(2U << 15, 1U << 15));
    for (auto _ : state) {
        uint32_t consumed = 0;
        uint32_t produced = 0;
        KZDSP_resampler_fixed_resample(decimator.get(), frame.data(), frame_samples, half.data(),
                                       frame_samples / 2, &consumed, &produced);
        KZDSP_resampler_fixed_reset(decimator.get());
        benchmark::DoNotOptimize(half.data());
        benchmark::ClobberMemory();
    }
    count_audio(state, hop_seconds);
}
BENCHMARK(BM_Decimate)->Unit(benchmark::kMicrosecond);

// The transform of a decimated frame. Works in place, so each round copies the frame first.
void BM_Transform(benchmark::State& state)
{
    start_library();
    const auto frame = equalised_frame();
    const std::vector<FxpType> half(frame.begin(), frame.begin() + frame_samples / 2);
    std::vector<FxpType> spectrum(half.size());
    const Transform transform(KZDSP_DCT_fixed_create(14));
    for (auto _ : state) {
        std::ranges::copy(half, spectrum.begin());
        KZDSP_DCT_fixed_compute(transform.get(), spectrum.data(), 0);
        benchmark::DoNotOptimize(spectrum.data());
        benchmark::ClobberMemory();
    }
    count_audio(state, hop_seconds);
}
BENCHMARK(BM_Transform)->Unit(benchmark::kMicrosecond);

FrameManager unlimited_manager()
{
    kzqvfixed_config* made = nullptr;
    kzqvfixed_config_create(&made);
    const Config config(made);
    config->frame_limit = 0;
    return FrameManager(kzqvfixed_frame_manager_create(config.get()));
}

// One frame from ring to band features: equaliser, decimator, transform, tilt and 15 bands. What is
// left after the three benchmarks above is the bands' share.
void BM_AppendFrame(benchmark::State& state)
{
    start_library();
    const auto frame = frame_of_music();
    const auto manager = unlimited_manager();
    for (auto _ : state) {
        kzqvfixed_frame_manager_append_dual_PCM_data(manager.get(), frame.data(), frame_hop,
                                                     frame.data() + frame_hop,
                                                     frame_samples - frame_hop);
    }
    count_audio(state, hop_seconds);
}
BENCHMARK(BM_AppendFrame)->Unit(benchmark::kMicrosecond);

// Twelve frames' features condensed into the 30 values. Each append makes the last result stale; it
// is not timed.
void BM_CondenseFrames(benchmark::State& state)
{
    start_library();
    const auto frame = frame_of_music();
    std::vector<int16_t> values(30);
    const auto manager = unlimited_manager();
    for (auto _ : state) {
        state.PauseTiming();
        kzqvfixed_frame_manager_reset(manager.get());
        for (int i = 0; i < 12; ++i) {
            kzqvfixed_frame_manager_append_dual_PCM_data(manager.get(), frame.data(), frame_samples,
                                                         nullptr, 0);
        }
        state.ResumeTiming();
        kzqvfixed_frame_manager_get_fingerprint(manager.get(), values.data(), 60);
        benchmark::DoNotOptimize(values.data());
    }
}
BENCHMARK(BM_CondenseFrames)->Unit(benchmark::kMicrosecond)->Iterations(50);

} // namespace
