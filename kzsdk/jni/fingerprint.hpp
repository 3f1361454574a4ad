/// @file
/// One fingerprint job of the Android front: a description of audio in, a text of 600 bytes out.
#pragma once

#include <cstdint>

#include "kzsdk/abs/status.h"
#include "kzsdk/fpx/fpx.h"
#include "kzsdk/jni/codes.hpp"

namespace android {

/// The encodings between which a job distinguishes. It can fingerprint the first four that have a
/// name.
enum class KZWaveFileEncoding : int32_t {
    Unknown = 0,
    Pcm8 = 1,
    Pcm16 = 2,
    ULaw = 3,
    ALaw = 4,
    MicrosoftAdpcm = 5,
    ImaAdpcm = 6,
    G723Adpcm = 7,
    Gsm610 = 8,
    G721Adpcm = 9,
    Mpeg = 10,
    IeeeFloat = 11,
};

/// A job. It may run any number of times, each time with the configuration set last.
///
/// Threads: one job belongs to one thread at a time. Jobs of different threads are independent; the
/// first of them starts the library's core, which stays up for the life of the process.
class Fingerprint {
public:
    Fingerprint() noexcept = default;
    ~Fingerprint() { release(); }
    Fingerprint(const Fingerprint&) = delete;
    Fingerprint& operator=(const Fingerprint&) = delete;

    int32_t init() noexcept { return kOk; }
    void release() noexcept {}

    /// Describes the audio of the next run.
    ///
    /// @param wave_format_code  WAVE format tag: 1 is PCM, 6 A-law, 7 mu-law. Only the low 16 bits
    ///                          of it and of @p bits_per_sample are read.
    /// @param bits_per_sample   Of PCM: below 9 means 8-bit, all else 16-bit, so that audio of 24
    /// or
    ///                          32 bits is read as if it had 16.
    /// @param audio             Interleaved samples, the caller's; read by generate().
    void setGenerateConfig(uint32_t sample_rate, int32_t channels, int32_t wave_format_code,
                           int32_t bits_per_sample, const uint8_t* audio,
                           uint32_t audio_length) noexcept;

    static KZWaveFileEncoding translateWaveFormatCode(uint16_t format_code,
                                                      uint16_t bits_per_sample) noexcept;

    /// "UNKNOWN" for a value that is not listed.
    static const char* getEncodingString(KZWaveFileEncoding encoding) noexcept;

    /// Runs the job.
    ///
    /// @param result  *result has kTextSize bytes, cleared. A text of kTextSize characters or more
    ///                fills them and is not terminated.
    /// @return kOk, or kNotProduced whatever the reason.
    int32_t generate(char** result) noexcept;

    /// Starts the library's core unless this front has started it already: kOk or kNotProduced.
    int32_t do_init_vesk() noexcept;

    /// Shuts the core down if this front has started it.
    void do_kill_vesk() noexcept;

    int32_t do_fpx_fingerprint(char** result) noexcept;

    /// Makes the text, which the caller frees with kz_fpx_fingerprint_serialize_free(). Success
    /// without audio leaves *serialized null.
    kz_status fpx_generate_fingerprint(unsigned char** serialized) noexcept;

private:
    kz_status feed_and_serialize(kz_fpx_handle* handle, char** text) noexcept;

    uint32_t sample_rate_ = 0;
    int32_t channels_ = 0;
    int32_t wave_format_code_ = 0;
    int32_t bits_per_sample_ = 0;
    const uint8_t* audio_ = nullptr;
    uint32_t audio_length_ = 0;
};

} // namespace android
