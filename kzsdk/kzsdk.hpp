/**
 * @file
 * libkzsdk for C++17 and later: handles that free themselves, containers in, values out. All of it
 * is in this header; programs link the C library.
 *
 *     kz::fingerprint tune = kz::fingerprint_of(samples, 44100, 2).value();
 *     kz::fingerprint copy = kz::fingerprint_of(other, 48000, 1).value();
 *     std::printf("%.1f apart\n", kz::distance(tune, copy));
 *
 * Samples are any container with data() and size(), an array, or a pointer and a count, of
 * int16_t, int32_t, float, double, or uint8_t, which is silent at 128 as in WAV files. char and
 * std::byte may hold samples of any format.
 *
 * Failures. Every call that can fail returns a kz::result. Its value() returns the value or throws
 * a kz::error; programs that do not want exceptions test the result and read its error(). Only
 * containers throw by themselves, std::bad_alloc when memory is short. Where exceptions are
 * switched off, value() of a failure ends the program.
 *
 * Handles can be moved, not copied. One that was moved from fails every call, as an invalid
 * argument. A handle belongs to one thread at a time, unless its class states more.
 */
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <iterator>
#include <limits>
#include <memory>
#include <stdexcept>
#include <string>
#include <type_traits>
#include <utility>
#include <variant>
#include <vector>

#include "kzsdk/abs/status.h"
#include "kzsdk/abs/version.h"
#include "kzsdk/stream/stream.h"

namespace kz {
inline namespace cxx1 {

/** A failure: what() is a sentence that says what went wrong and what cures it. */
class error : public std::runtime_error {
public:
    error(uint32_t status, const std::string& text) : std::runtime_error(text), status_(status) {}
    /** The number of the C interface: a kz_status, or a kzcat_status when it is below 0x10000. */
    uint32_t status() const noexcept { return status_; }

private:
    uint32_t status_;
};

namespace detail {

[[noreturn]] inline void raise([[maybe_unused]] const error& failure)
{
#if defined(__cpp_exceptions)
    throw failure;
#else
    std::abort();
#endif
}

/** Runs a caller's function below a C library, through which nothing may be thrown. */
template <class Function>
bool completes(Function&& function) noexcept
{
#if defined(__cpp_exceptions)
    try {
        function();
        return true;
    } catch (...) {
        return false;
    }
#else
    function();
    return true;
#endif
}

} // namespace detail

/** What a call returned: a value, or why there is none. */
template <class T>
class [[nodiscard]] result {
public:
    result(T value) : content_(std::in_place_index<0>, std::move(value)) {}
    result(kz::error failure) : content_(std::in_place_index<1>, std::move(failure)) {}

    bool has_value() const noexcept { return content_.index() == 0; }
    explicit operator bool() const noexcept { return has_value(); }

    /** The value; throws the kz::error when there is none. */
    T& value() & { return checked(), *std::get_if<0>(&content_); }
    const T& value() const& { return checked(), *std::get_if<0>(&content_); }
    T value() && { return checked(), std::move(*std::get_if<0>(&content_)); }

    T value_or(T other) && { return has_value() ? std::move(*this).value() : std::move(other); }

    T& operator*() & { return value(); }
    const T& operator*() const& { return value(); }
    T operator*() && { return std::move(*this).value(); }
    T* operator->() { return &value(); }
    const T* operator->() const { return &value(); }

    /** The failure. Only where there is no value: otherwise its status is 0. */
    kz::error error() const
    {
        const kz::error* failure = std::get_if<1>(&content_);
        return failure != nullptr ? *failure : kz::error(KZ_OK, "success");
    }

private:
    void checked() const
    {
        if (const kz::error* failure = std::get_if<1>(&content_)) {
            detail::raise(*failure);
        }
    }

    std::variant<T, kz::error> content_;
};

/** Success, or why not. */
template <>
class [[nodiscard]] result<void> {
public:
    result() = default;
    result(const kz::error& failure) : content_(std::in_place_index<1>, failure) {}

    bool has_value() const noexcept { return content_.index() == 0; }
    explicit operator bool() const noexcept { return has_value(); }
    /** Throws the kz::error of a failure. */
    void value() const
    {
        if (const kz::error* failure = std::get_if<1>(&content_)) {
            detail::raise(*failure);
        }
    }
    kz::error error() const
    {
        const kz::error* failure = std::get_if<1>(&content_);
        return failure != nullptr ? *failure : kz::error(KZ_OK, "success");
    }

private:
    std::variant<std::monostate, kz::error> content_;
};

/** How interleaved samples lie in memory. */
struct format {
    uint32_t encoding = KZ_STREAM_FORMAT_PCM16; /**< one of KZ_STREAM_FORMAT_... */
    uint32_t rate = 44100;                      /**< hertz */
    uint32_t channels = 2;
};

/** The encoding of a type of samples; 0 for a type that has none. */
template <class Sample>
constexpr uint32_t encoding_of() noexcept
{
    if constexpr (std::is_same_v<Sample, int16_t>) {
        return KZ_STREAM_FORMAT_PCM16;
    } else if constexpr (std::is_same_v<Sample, int32_t>) {
        return KZ_STREAM_FORMAT_PCM32;
    } else if constexpr (std::is_same_v<Sample, float>) {
        return KZ_STREAM_FORMAT_FLOAT32;
    } else if constexpr (std::is_same_v<Sample, double>) {
        return KZ_STREAM_FORMAT_FLOAT64;
    } else if constexpr (std::is_same_v<Sample, uint8_t>) {
        return KZ_STREAM_FORMAT_LINEAR8;
    } else {
        return 0;
    }
}

/** Whether a type is that of bytes which may hold samples of any encoding. */
template <class Sample>
constexpr bool is_bytes() noexcept
{
    return std::is_same_v<Sample, char> || std::is_same_v<Sample, std::byte>;
}

/**
 * Sound that a call reads, in the caller's memory: a container, an array, or a pointer and a
 * count. Bytes (char, std::byte) may hold samples of any encoding; uint8_t, which is unsigned char,
 * those of a byte each: linear ones or, where the format states so, A-law or mu-law.
 */
class sound {
public:
    template <class Sample>
    sound(const Sample* samples, size_t count)
        : bytes_(samples), size_(uint64_t{count} * sizeof(Sample)), encoding_(encoding_of<Sample>())
    {
        static_assert(encoding_of<Sample>() != 0 || is_bytes<Sample>(),
                      "samples are int16_t, int32_t, float, double, uint8_t, char or std::byte");
    }
    template <class Container,
              class Pointer = decltype(std::data(std::declval<const Container&>()))>
    sound(const Container& samples) : sound(std::data(samples), std::size(samples))
    {
    }

    const void* bytes() const noexcept { return bytes_; }
    uint64_t size() const noexcept { return size_; }
    /** Of the samples' type; 0 for bytes of any encoding. */
    uint32_t encoding() const noexcept { return encoding_; }
    /** Whether these samples, by their type, may be fed where @p encoding is expected. */
    bool fits(uint32_t encoding) const noexcept
    {
        return encoding_ == 0 || encoding_ == encoding ||
               (encoding_ == KZ_STREAM_FORMAT_LINEAR8 && has_single_bytes(encoding));
    }

private:
    static bool has_single_bytes(uint32_t encoding) noexcept
    {
        return encoding == KZ_STREAM_FORMAT_PCM8 || encoding == KZ_STREAM_FORMAT_ALAW ||
               encoding == KZ_STREAM_FORMAT_ULAW;
    }

    const void* bytes_;
    uint64_t size_;
    uint32_t encoding_;
};

namespace detail {

inline constexpr const char* kOtherSamples =
    "The samples are of another type than the format states: feed those, or char or std::byte.";

/** Frees a handle with the C call for it. */
template <auto free>
struct freed {
    template <class Handle>
    void operator()(Handle* handle) const noexcept
    {
        static_cast<void>(free(&handle));
    }
};

template <class Handle, auto free>
using owner = std::unique_ptr<Handle, freed<free>>;

inline error failure(kz_status status) { return {status, kz_status_text(status)}; }

inline result<void> outcome(kz_status status)
{
    return status == KZ_OK ? result<void>() : failure(status);
}

} // namespace detail

/** Version of the library that the program runs with: "MAJOR.MINOR.PATCH". */
inline std::string version() { return kzsdk_get_version(); }

/** 14.22 s of sound in 30 numbers. */
struct fingerprint {
    std::vector<int16_t> values; /**< 15 means and 15 spreads */
    std::string document;        /**< the query document: XML in UTF-8 */
    double offset = 0;           /**< seconds of leading silence that were skipped */
    double duration = 0;         /**< seconds of sound that the values describe */
};

/**
 * The mean absolute difference of the values of two fingerprints: 0 for equal ones, some 20 for an
 * MP3 beside its source, above 1000 for different tunes. NaN unless both have as many values.
 */
inline double distance(const fingerprint& first, const fingerprint& second) noexcept
{
    const size_t count = first.values.size();
    int64_t sum = count == second.values.size() ? 0 : -1;
    for (size_t i = 0; sum >= 0 && i < count; ++i) {
        const int32_t apart = int32_t{first.values[i]} - second.values[i];
        sum += apart < 0 ? -apart : apart;
    }
    if (sum < 0 || count == 0) {
        return std::numeric_limits<double>::quiet_NaN();
    }
    return static_cast<double>(sum) / static_cast<double>(count);
}

/** Sound on its way to a fingerprint, fed in pieces of any length. */
class stream {
public:
    /** Takes sound of this format, to be fingerprinted by one of KZ_FPX_ALGORITHM_... */
    static result<stream> create(const format& of, uint32_t algorithm = KZ_FPX_ALGORITHM_FIXED)
    {
        kz_stream_settings settings;
        kz_stream* made = nullptr;
        kz_stream_initialize_settings(&settings);
        settings.algorithm = algorithm;
        settings.format = of.encoding;
        settings.sample_rate = of.rate;
        settings.channels = of.channels;
        const kz_status status = kz_stream_create(&settings, &made);
        return status == KZ_OK ? result<stream>(stream(made, of.encoding))
                               : detail::failure(status);
    }

    /**
     * Feeds what follows, cut anywhere; what comes after the fingerprint is complete is not taken.
     *
     * @return Whether the fingerprint is complete.
     */
    result<bool> feed(const sound& samples)
    {
        uint8_t complete = 0;
        if (!samples.fits(encoding_)) {
            return error(KZ_STREAM_ERROR_INVALID_ARGUMENT, detail::kOtherSamples);
        }
        const kz_status status =
            kz_stream_feed(handle_.get(), samples.bytes(), samples.size(), nullptr, &complete);
        return status == KZ_OK ? result<bool>(complete != 0) : detail::failure(status);
    }

    /** Ends the sound. Returns whether the fingerprint is complete; state() has what it lacks. */
    result<bool> finish()
    {
        uint8_t complete = 0;
        const kz_status status = kz_stream_finish(handle_.get(), &complete);
        return status == KZ_OK ? result<bool>(complete != 0) : detail::failure(status);
    }

    /** How far it is: see kz_stream_state. */
    result<kz_stream_state> state() const
    {
        kz_stream_state state = {};
        const kz_status status = kz_stream_get_state(handle_.get(), &state);
        return status == KZ_OK ? result<kz_stream_state>(state) : detail::failure(status);
    }

    /** The fingerprint; KZ_QV_ERROR_INCOMPLETE before it is complete. */
    result<fingerprint> get()
    {
        fingerprint found;
        const char* document = nullptr;
        uint32_t milliseconds = 0;
        kz_status status = read_values(found.values);
        if (status == KZ_OK) {
            status = kz_stream_get_document(handle_.get(), &document);
        }
        if (status == KZ_OK) {
            status = kz_stream_get_signal_offset(handle_.get(), nullptr, &found.offset, nullptr);
        }
        if (status == KZ_OK) {
            status = kz_stream_get_times(handle_.get(), nullptr, &milliseconds);
        }
        if (status != KZ_OK) {
            return detail::failure(status);
        }
        found.document = document;
        found.duration = milliseconds / 1000.0;
        return found;
    }

    /** For calls of the C interface; still owned by this. */
    kz_stream* handle() const noexcept { return handle_.get(); }

private:
    stream(kz_stream* made, uint32_t encoding) : handle_(made), encoding_(encoding) {}

    kz_status read_values(std::vector<int16_t>& values)
    {
        uint32_t count = 0;
        const kz_status status = kz_stream_get_values(handle_.get(), nullptr, 0, &count);
        if (count == 0) {
            return status;
        }
        values.resize(count);
        return kz_stream_get_values(handle_.get(), values.data(), count, &count);
    }

    detail::owner<kz_stream, kz_stream_free> handle_;
    uint32_t encoding_;
};

/** The fingerprint of sound of this format. */
inline result<fingerprint> fingerprint_of(const sound& samples, const format& of)
{
    result<stream> made = stream::create(of);
    if (!made) {
        return made.error();
    }
    const result<bool> fed = made->feed(samples);
    const result<bool> finished = fed ? made->finish() : fed;
    return finished ? made->get() : finished.error();
}

/** The fingerprint of samples, whose type is the encoding. */
inline result<fingerprint> fingerprint_of(const sound& samples, uint32_t rate, uint32_t channels)
{
    return fingerprint_of(samples, format{samples.encoding(), rate, channels});
}

} // namespace cxx1
} // namespace kz
