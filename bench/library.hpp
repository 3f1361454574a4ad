/// @file
/// Owners for what the benchmarks create with the library, and the sizes of its stages.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "case.hpp"
#include "kzsdk/kzsdk.h"
#include "support/fingerprints.hpp"

namespace kz::bench {

using test::Algorithm;
using test::Channels;
using test::Format;
using enum test::Algorithm;
using enum test::Channels;
using enum test::Format;

inline constexpr uint32_t kWorkingHertz = 11025;
inline constexpr uint32_t kFrame = 32768;
inline constexpr uint32_t kHop = 11264;
inline constexpr uint32_t kChunk = KZQVFIXED_CONVERSION_SAMPLES;

/// Seconds of sound that a default fingerprint listens to: eleven hops and one frame.
inline constexpr double kListened = (11.0 * kHop + kFrame) / kWorkingHertz;

/// Seconds of sound to offer for one: what completes it at every rate.
inline constexpr double kOffered = KZ_FPX_MILLISECONDS_NEEDED / 1000.0;

/// Calls a family's own function to free a thing.
template <auto Free>
struct FreeWith {
    template <class T>
    void operator()(T* thing) const
    {
        static_cast<void>(Free(thing));
    }
};

template <class T, auto Free>
using Owned = std::unique_ptr<T, FreeWith<Free>>;

using FixedResampler = Owned<KZDSP_resampler_fixed, KZDSP_resampler_fixed_destroy>;
using FloatResampler = Owned<KZDSP_resampler, KZDSP_DestroyResampler>;
using FixedTransform = Owned<KZDSP_DCT_fixed, KZDSP_DCT_fixed_destroy>;
using FloatTransform = Owned<KZDSP_DCT, KZDSP_DestroyDCT>;
using FixedConfig = Owned<kzqvfixed_config, kzqvfixed_config_destroy>;
using FixedFrames = Owned<kzqvfixed_frame_manager, kzqvfixed_frame_manager_destroy>;
using FixedDetector = Owned<kzqvfixed_signal_detector, kzqvfixed_signal_detector_destroy>;
using FloatDetector = Owned<QVSD, QVSD_Destroy>;

/// What to listen to and how.
struct Job {
    Algorithm algorithm;
    Format format;
    uint32_t rate;
    Channels channels;
};

/// A fingerprint context.
class Fingerprint {
public:
    explicit Fingerprint(const Job& job)
    {
        require(test::create(job.algorithm, job.format, job.rate, job.channels, &handle_) == KZ_OK,
                "no fingerprint can be made");
    }
    ~Fingerprint() { kz_fpx_fingerprint_free(&handle_); }
    Fingerprint(Fingerprint&& other) noexcept : handle_(std::exchange(other.handle_, nullptr)) {}
    Fingerprint& operator=(Fingerprint&&) = delete;

    /// @return Whether the fingerprint is complete.
    bool feed(const void* audio, size_t bytes)
    {
        uint8_t complete = 0;
        const auto status =
            kz_fpx_fingerprint_add_audio(handle_, audio, static_cast<uint32_t>(bytes), &complete);
        require(status == KZ_OK, "audio is refused");
        return complete != 0;
    }

    /// Renders the document and calls `use` with its text.
    template <class Use>
    void render(Use use) const
    {
        char* text = nullptr;
        require(kz_fpx_fingerprint_serialize(handle_, &text) == KZ_OK, "no document");
        use(text);
        kz_fpx_fingerprint_serialize_free(&text);
    }

    std::string document() const
    {
        std::string document;
        render([&](const char* text) { document = text; });
        return document;
    }

    std::vector<int16_t> values() const
    {
        uint32_t count = 0;
        kz_fpx_fingerprint_get_values(handle_, nullptr, 0, &count);
        std::vector<int16_t> values(count);
        require(kz_fpx_fingerprint_get_values(handle_, values.data(), count, &count) == KZ_OK,
                "no values");
        return values;
    }

private:
    kz_fpx_handle* handle_ = nullptr;
};

inline FixedConfig default_config()
{
    kzqvfixed_config* made = nullptr;
    require(kzqvfixed_config_create(&made) == KZ_OK, "no configuration");
    return FixedConfig(made);
}

} // namespace kz::bench
