// Feeds what a source gives to a stream of the library, on which its pieces leave no trace.

#include "kzfp/fingerprinter.hpp"

#include <algorithm>
#include <cmath>
#include <deque>
#include <memory>
#include <span>
#include <utility>

#include "kzfp/output/printed.hpp"
#include "kzsdk/stream/stream.h"

namespace kzfp {

namespace {

constexpr size_t kBlock = 1024; ///< frames read at a time: hardly more is taken than is needed

struct Free {
    void operator()(kz_stream* stream) const { kz_stream_free(&stream); }
};
using Stream = std::unique_ptr<kz_stream, Free>;

void check(const char* step, kz_status status)
{
    if (status != KZ_OK) {
        fail(step, status);
    }
}

std::string tenths(double seconds) { return printed("%.1f s", std::floor(seconds * 10) / 10); }

/// Rounded down, so that what is too short never looks long enough.
std::string hundredths(double seconds)
{
    return printed("%.2f s", std::floor(seconds * 100 + 1e-6) / 100);
}

/// The folded 8-bit format is that of the extraction interface; it cannot be mixed down.
uint32_t to_stream_format(const audio::StreamFormat& format)
{
    switch (format.encoding) {
    case audio::Encoding::u8:
        return format.channels <= 2 ? KZ_STREAM_FORMAT_PCM8 : KZ_STREAM_FORMAT_LINEAR8;
    case audio::Encoding::alaw:
        return KZ_STREAM_FORMAT_ALAW;
    case audio::Encoding::ulaw:
        return KZ_STREAM_FORMAT_ULAW;
    case audio::Encoding::f32:
        return KZ_STREAM_FORMAT_FLOAT32;
    case audio::Encoding::s16:
        break;
    }
    return KZ_STREAM_FORMAT_PCM16;
}

Stream create(const audio::StreamFormat& format, Algorithm algorithm)
{
    kz_stream_settings settings;
    kz_stream_initialize_settings(&settings);
    settings.algorithm = static_cast<uint32_t>(algorithm);
    settings.format = to_stream_format(format);
    settings.sample_rate = format.rate;
    settings.channels = format.channels;
    kz_stream* stream = nullptr;
    check("making a fingerprint", kz_stream_create(&settings, &stream));
    return Stream(stream);
}

/// Leading silence, skipped so far.
struct Silence {
    uint32_t samples = 0; ///< at kWorkingRate
    double seconds = 0;
};

Silence silence_of(const kz_stream& stream)
{
    Silence silence;
    kz_stream_get_signal_offset(&stream, &silence.samples, &silence.seconds, nullptr);
    return silence;
}

/// Why a stream that has ended made no fingerprint.
std::string too_little(const kz_stream& stream, const audio::Source& source)
{
    kz_stream_state state;
    kz_stream_get_state(&stream, &state);
    const double seconds = static_cast<double>(state.frames) / source.format().rate;
    std::string text;
    if (state.phase == KZ_STREAM_NOTHING_FED) {
        text = "no sound";
    } else if (state.phase == KZ_STREAM_SILENT) {
        text = "nothing but silence in " + tenths(seconds);
    } else {
        const double silence = silence_of(stream).seconds;
        text = hundredths(std::max(0.0, seconds - silence)) + " of sound";
        if (silence >= 0.1) {
            text += " after " + tenths(silence) + " of silence";
        }
    }
    if (const std::string trouble = source.trouble(); !trouble.empty()) {
        text += ", then the file is damaged (" + trouble + ")";
    }
    return text + ", " + sound_needed() + " needed";
}

/// Reads until the fingerprint is complete, or the source ends.
void feed(kz_stream& stream, audio::Source& source)
{
    std::vector<std::byte> block(kBlock * source.format().frame_bytes());
    uint8_t complete = 0;
    for (size_t got = kBlock; complete == 0 && got == kBlock;) {
        got = source.read(block);
        const size_t bytes = got * source.format().frame_bytes();
        check("adding audio", kz_stream_feed(&stream, block.data(), bytes, nullptr, &complete));
    }
    check("adding audio", kz_stream_finish(&stream, &complete));
    if (complete == 0) {
        throw audio::FileError(too_little(stream, source));
    }
}

std::string document_of(kz_stream& stream)
{
    const char* text = nullptr;
    check("writing the document", kz_stream_get_document(&stream, &text));
    std::string document(text);
    while (document.ends_with('\n') || document.ends_with('\r')) {
        document.pop_back();
    }
    return document;
}

std::vector<int16_t> values_of(kz_stream& stream)
{
    uint32_t count = 0;
    kz_stream_get_values(&stream, nullptr, 0, &count);
    std::vector<int16_t> values(count);
    check("reading the values", kz_stream_get_values(&stream, values.data(), count, &count));
    return values;
}

Fingerprint fingerprint_of(kz_stream& stream)
{
    return {.document = document_of(stream),
            .values = values_of(stream),
            .signal_offset = silence_of(stream).samples};
}

bool has_sound(const kz_stream& stream)
{
    kz_stream_state state;
    kz_stream_get_state(&stream, &state);
    return state.phase != KZ_STREAM_NOTHING_FED && state.phase != KZ_STREAM_SILENT;
}

/// The windows that have begun and not ended yet, the oldest first.
class Windows {
public:
    Windows(audio::Source& source, Algorithm algorithm, double step,
            const std::function<void(const Window&)>& deliver)
        : source_(source), algorithm_(algorithm), step_(step), deliver_(deliver)
    {
    }

    void run()
    {
        const size_t frame = source_.format().frame_bytes();
        std::vector<std::byte> block(kBlock * frame);
        for (size_t got = kBlock; got == kBlock;) {
            got = source_.read(block);
            take(std::span(std::as_const(block)).first(got * frame), got);
        }
        finish();
    }

private:
    struct Open {
        size_t number;
        Stream stream;
        uint8_t complete = 0;
    };

    uint64_t first_frame(size_t number) const
    {
        const double seconds = static_cast<double>(number) * step_;
        return static_cast<uint64_t>(std::llround(seconds * source_.format().rate));
    }

    /// `frames` more have come.
    void take(std::span<const std::byte> bytes, size_t frames)
    {
        while (first_frame(begun_) < position_ + frames) {
            open_.push_back({begun_++, create(source_.format(), algorithm_)});
        }
        for (Open& window : open_) {
            const uint64_t first = first_frame(window.number);
            const size_t before = first > position_ ? static_cast<size_t>(first - position_) : 0;
            const auto mine = bytes.subspan(before * source_.format().frame_bytes());
            if (window.complete == 0) {
                check("adding audio", kz_stream_feed(window.stream.get(), mine.data(), mine.size(),
                                                     nullptr, &window.complete));
            }
        }
        position_ += frames;
        while (!open_.empty() && deliver_oldest()) {
            open_.pop_front();
        }
    }

    /// False while it is not known yet what will become of it.
    bool deliver_oldest()
    {
        const Open& oldest = open_.front();
        Window window = {.time = static_cast<double>(oldest.number) * step_, .fingerprint = {}};
        if (oldest.complete != 0) {
            window.fingerprint = fingerprint_of(*oldest.stream);
        } else if (has_sound(*oldest.stream) || position_ < first_frame(oldest.number + 1)) {
            return false;
        }
        deliver_(window);
        any_ = true;
        return true;
    }

    void finish()
    {
        for (Open& window : open_) {
            check("adding audio", kz_stream_finish(window.stream.get(), &window.complete));
        }
        if (!any_ && (open_.empty() || open_.front().complete == 0)) {
            const Stream none = create(source_.format(), algorithm_);
            throw audio::FileError(
                too_little(open_.empty() ? *none : *open_.front().stream, source_));
        }
        while (!open_.empty() && open_.front().complete != 0) {
            deliver_oldest();
            open_.pop_front();
        }
    }

    audio::Source& source_;
    Algorithm algorithm_;
    double step_;
    const std::function<void(const Window&)>& deliver_;
    std::deque<Open> open_;
    size_t begun_ = 0;
    uint64_t position_ = 0; ///< frames read
    bool any_ = false;      ///< a window was delivered
};

} // namespace

std::string sound_needed() { return hundredths(KZ_FPX_MILLISECONDS_NEEDED / 1000.0); }

Fingerprint take_fingerprint(audio::Source& source, Algorithm algorithm)
{
    const Stream stream = create(source.format(), algorithm);
    feed(*stream, source);
    return fingerprint_of(*stream);
}

void take_windows(audio::Source& source, Algorithm algorithm, double step,
                  const std::function<void(const Window&)>& deliver)
{
    Windows(source, algorithm, step, deliver).run();
}

} // namespace kzfp
