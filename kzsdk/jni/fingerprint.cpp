/// @file
/// One job: from a buffer of audio to the text of its query document, by the extraction interface.
///
/// The core is started once per process and stays up. Every failure is logged where it happens; the
/// result is only 0 or one code.
#include "kzsdk/jni/fingerprint.hpp"

#include <algorithm>
#include <atomic>
#include <cstring>

#include "kzsdk/abs/startup.h"
#include "kzsdk/jni/platform/platform.hpp"

namespace android {

namespace {

/// Set while the core is up by our doing. Two first jobs may both start it; the second start finds
/// it up and succeeds.
constinit std::atomic<uint8_t> core_is_up{0};

void log_error(const char* format, uint32_t value = 0) noexcept
{
    kz::platform::log(kz::platform::kLogError, "Fingerprint - Native", format, value);
}

/// 0 for an encoding that cannot be fingerprinted.
uint32_t input_format(KZWaveFileEncoding encoding) noexcept
{
    switch (encoding) {
    case KZWaveFileEncoding::Pcm8:
        return KZ_FPX_FORMAT_PCM8;
    case KZWaveFileEncoding::Pcm16:
        return KZ_FPX_FORMAT_PCM16;
    case KZWaveFileEncoding::ALaw:
        return KZ_FPX_FORMAT_ALAW;
    case KZWaveFileEncoding::ULaw:
        return KZ_FPX_FORMAT_ULAW;
    default:
        return 0;
    }
}

} // namespace

void Fingerprint::setGenerateConfig(uint32_t sample_rate, int32_t channels,
                                    int32_t wave_format_code, int32_t bits_per_sample,
                                    const uint8_t* audio, uint32_t audio_length) noexcept
{
    sample_rate_ = sample_rate;
    channels_ = channels;
    wave_format_code_ = wave_format_code;
    bits_per_sample_ = bits_per_sample;
    audio_ = audio;
    audio_length_ = audio_length;
}

KZWaveFileEncoding Fingerprint::translateWaveFormatCode(uint16_t format_code,
                                                        uint16_t bits_per_sample) noexcept
{
    switch (format_code) {
    case 1:
        return bits_per_sample < 9 ? KZWaveFileEncoding::Pcm8 : KZWaveFileEncoding::Pcm16;
    case 2:
        return KZWaveFileEncoding::MicrosoftAdpcm;
    case 3:
        return KZWaveFileEncoding::IeeeFloat;
    case 6:
        return KZWaveFileEncoding::ALaw;
    case 7:
        return KZWaveFileEncoding::ULaw;
    case 17:
        return KZWaveFileEncoding::ImaAdpcm;
    case 20:
        return KZWaveFileEncoding::G723Adpcm;
    case 49:
        return KZWaveFileEncoding::Gsm610;
    case 64:
        return KZWaveFileEncoding::G721Adpcm;
    case 80:
        return KZWaveFileEncoding::Mpeg;
    default:
        return KZWaveFileEncoding::Unknown;
    }
}

const char* Fingerprint::getEncodingString(KZWaveFileEncoding encoding) noexcept
{
    switch (encoding) {
    case KZWaveFileEncoding::Pcm8:
        return "8-bit PCM";
    case KZWaveFileEncoding::Pcm16:
        return "16-bit PCM";
    case KZWaveFileEncoding::ULaw:
        return "uLAW";
    case KZWaveFileEncoding::ALaw:
        return "ALAW";
    case KZWaveFileEncoding::MicrosoftAdpcm:
        return "Microsoft ADPCM";
    case KZWaveFileEncoding::ImaAdpcm:
        return "IMA ADPCM";
    case KZWaveFileEncoding::G723Adpcm:
        return "ITU G.723 ADPCM (Yamaha)";
    case KZWaveFileEncoding::Gsm610:
        return "GSM 6.10";
    case KZWaveFileEncoding::G721Adpcm:
        return "ITU G.721 ADPCM";
    case KZWaveFileEncoding::Mpeg:
        return "MPEG";
    case KZWaveFileEncoding::IeeeFloat:
        return "IEEE float";
    default:
        return "UNKNOWN";
    }
}

int32_t Fingerprint::generate(char** result) noexcept
{
    if (do_init_vesk() != kOk) {
        // Deliberate: the flag is set so that the shut-down is not skipped. It would take the core
        // from under other jobs, if a start could fail.
        core_is_up = 1;
        do_kill_vesk();
        const int32_t code = do_init_vesk();
        if (code != kOk) {
            return code;
        }
    }
    return do_fpx_fingerprint(result);
}

int32_t Fingerprint::do_init_vesk() noexcept
{
    if (core_is_up != 0) {
        return kOk;
    }
    kzconf_configuration configuration;
    if (kzconf_initialize_configuration(&configuration) != KZ_OK) {
        // Deliberate: prints 0, not the status.
        log_error("Error %X occurred while initializing the config structure.\n", 0);
        return kNotProduced;
    }
    const kz_status status = kzinit_initialize_vesk(&configuration);
    if (status != KZ_OK) {
        log_error("Error %X occurred while initializing \n", status);
        return kNotProduced;
    }
    core_is_up = 1;
    return kOk;
}

void Fingerprint::do_kill_vesk() noexcept
{
    if (core_is_up != 0) {
        static_cast<void>(kzinit_shutdown_vesk());
        core_is_up = 0;
    }
}

int32_t Fingerprint::do_fpx_fingerprint(char** result) noexcept
{
    unsigned char* serialized = nullptr;
    const kz_status status = fpx_generate_fingerprint(&serialized);
    char* text = reinterpret_cast<char*>(serialized);
    if (status != KZ_OK || text == nullptr) {
        static_cast<void>(kz_fpx_fingerprint_serialize_free(&text)); // there when the free failed
        return kNotProduced;
    }
    const size_t length = std::strlen(text);
    if (length > kTextSize) {
        log_error("strlen((const char*)serialized_fingerprint > buffer ");
    }
    // Deliberate: no terminator. In the cleared buffer only a text that fills it has none.
    std::memcpy(*result, text, std::min<size_t>(length, kTextSize));
    if (kz_fpx_fingerprint_serialize_free(&text) != KZ_OK) {
        log_error("kz_fpx_fingerprint_serialize_free() failed");
    }
    return kOk;
}

kz_status Fingerprint::fpx_generate_fingerprint(unsigned char** serialized) noexcept
{
    *serialized = nullptr;
    const uint32_t format = input_format(translateWaveFormatCode(
        static_cast<uint16_t>(wave_format_code_), static_cast<uint16_t>(bits_per_sample_)));
    if (format == 0) {
        return KZ_FPX_ERROR_NO_INPUT_FORMAT;
    }
    if (audio_ == nullptr || audio_length_ == 0) {
        log_error("audio_buffer is null or audio_buffer_len is 0.");
        return KZ_OK;
    }
    kz_fpx_handle* handle = nullptr;
    kz_status status = kz_fpx_fingerprint_create(KZ_FPX_ALGORITHM_FIXED, format, sample_rate_,
                                                 static_cast<uint32_t>(channels_), &handle);
    if (status != KZ_OK) {
        log_error("kz_fpx_fingerprint_create() failed. error=%X", status);
        return status;
    }
    char* text = nullptr;
    status = feed_and_serialize(handle, &text);
    *serialized = reinterpret_cast<unsigned char*>(text);
    const kz_status free_status = kz_fpx_fingerprint_free(&handle);
    if (status == KZ_OK && free_status != KZ_OK) {
        log_error("kz_fpx_fingerprint_free() failed error =%X", 0); // deliberate: prints 0
        return free_status;
    }
    return status;
}

kz_status Fingerprint::feed_and_serialize(kz_fpx_handle* handle, char** text) noexcept
{
    uint8_t complete = 0;
    kz_status status = kz_fpx_fingerprint_add_audio(handle, audio_, audio_length_, &complete);
    if (status != KZ_OK) {
        log_error("kz_fpx_fingerprint_add_audio() failed error=%X", status);
        return status;
    }
    if (complete == 0) {
        return KZ_FPX_ERROR_NOT_ENOUGH_AUDIO;
    }
    status = kz_fpx_fingerprint_serialize(handle, text);
    if (status != KZ_OK) {
        log_error("kz_fpx_fingerprint_serialize() failed error=%X", status);
    }
    return status;
}

} // namespace android
