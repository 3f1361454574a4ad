// Sound goes to the library at its own rate; floats, which most decoders make, stay floats.

#include "kzfp/catalogue/sound.hpp"

#include <cstdio>
#include <filesystem>
#include <functional>
#include <string_view>

#include "kzfp/catalogue/files.hpp"
#include "kzfp/output/interruption.hpp"

namespace kzfp {

namespace {

constexpr size_t kBlock = 16384; ///< frames read at a time
constexpr size_t kLongestTrail = size_t{1} << 30;
constexpr size_t kLongestDocument = size_t{1} << 20;

/// Takes bytes of sound.
using Take = std::function<void(std::span<const std::byte>)>;
/// Begins to take sound of a format.
using Begin = std::function<Take(const kzcat_format&)>;

/// Feeds a source to its end; gives the seconds that it had.
double feed(audio::Source& source, const Begin& begin)
{
    const audio::StreamFormat format = source.format();
    const Take take = begin({.format = to_stream_format(format.encoding),
                             .sample_rate = format.rate,
                             .channels = format.channels,
                             .reserved = 0});
    std::vector<std::byte> block(kBlock * format.frame_bytes());
    uint64_t frames = 0;
    for (size_t got = kBlock; got == kBlock;) {
        got = source.read(block);
        take(std::span(std::as_const(block)).first(got * format.frame_bytes()));
        frames += got;
    }
    return static_cast<double>(frames) / format.rate;
}

struct Fed {
    std::vector<audio::Tag> tags;
    std::string warning;
    double seconds = 0;
};

std::string damaged_after(double seconds, const std::string& trouble)
{
    char text[64];
    std::snprintf(text, sizeof text, "is damaged after %.1f s", seconds);
    return text + std::string(" (") + trouble + ")";
}

/// What was fed, unless damage is a failure.
Fed fed(const audio::OpenedInput& opened, double seconds, bool strict)
{
    const std::string trouble = opened.source->trouble();
    if (strict && !trouble.empty()) {
        throw audio::FileError(damaged_after(seconds, trouble));
    }
    if (trouble.empty()) {
        return {.tags = opened.facts.tags, .warning = {}, .seconds = seconds};
    }
    return {.tags = opened.facts.tags,
            .warning = opened.source->went_on()
                           ? "is damaged (" + trouble + "); the rest was used"
                           : damaged_after(seconds, trouble) + "; what comes before was used",
            .seconds = seconds};
}

/// Feeds a sound file. A pipe is copied to its end first, or as far as the section reaches.
Fed feed_file(const std::string& path, const SoundOptions& options, const Begin& begin)
{
    const audio::Section& section = options.section;
    const audio::Request request = {.raw = options.raw,
                                    .section = section,
                                    .accepts_rate = [](uint32_t) { return true; },
                                    .floats = true,
                                    .patience = {.timeout = options.timeout, .stop = interrupted}};
    audio::Input input(path, request);
    for (;;) {
        try {
            const audio::OpenedInput opened = input.open();
            if (!section.length && input.extend()) {
                continue;
            }
            const double seconds = feed(*opened.source, begin);
            const std::string trouble = opened.source->trouble();
            const bool whole = section.length && seconds >= *section.length && trouble.empty();
            if (whole || !input.extend()) {
                return fed(opened, seconds, options.strict);
            }
        } catch (const audio::FileError&) {
            if (!input.extend()) {
                throw;
            }
        }
    }
}

/// What is said to have no header is sound, whatever it begins with.
Content content_of(const std::string& path, const SoundOptions& options)
{
    return options.raw ? Content::sound : content_of_file(path);
}

Trail read_trail_file(const std::string& path)
{
    const std::string bytes = contents_of(path, kLongestTrail);
    return made<Trail>(kzcat_trail_read, bytes.data(), bytes.size());
}

/// The file's own title, or its name without folder and ending.
void add_title(std::vector<audio::Tag>& tags, const std::string& path)
{
    for (const audio::Tag& tag : tags) {
        if (tag.name == "title") {
            return;
        }
    }
    const std::string name =
        path == "-" ? "standard input" : std::filesystem::path(path).stem().string();
    tags.push_back({.name = "title", .value = audio::to_utf8(name)});
}

void check_length(const Trail& trail)
{
    kzcat_trail_facts facts;
    check(kzcat_trail_get_facts(trail.get(), &facts));
    if (facts.code_count == 0) {
        char text[96];
        std::snprintf(text, sizeof text, "is too short: %.2f s of sound, half a second is needed",
                      static_cast<double>(facts.samples) / facts.sample_rate);
        throw audio::FileError(text);
    }
}

} // namespace

Content content_of_file(const std::string& path)
{
    const std::string beginning = beginning_of(path, 64);
    const std::string_view text = beginning;
    const size_t first = text.find_first_not_of("\xef\xbb\xbf \t\r\n");
    if (first != std::string_view::npos && text.substr(first).starts_with('<')) {
        return Content::document;
    }
    return text.starts_with("\x89KZT") ? Content::trail : Content::sound;
}

uint32_t to_stream_format(audio::Encoding encoding)
{
    switch (encoding) {
    case audio::Encoding::u8:
        return KZ_STREAM_FORMAT_LINEAR8;
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

Recording read_recording(const std::string& path, const SoundOptions& options, bool documents,
                         const std::string& name)
{
    Recording recording;
    if (content_of(path, options) == Content::trail) {
        recording.trail = read_trail_file(path);
    } else {
        kzcat_builder_settings settings;
        check(kzcat_initialize_builder_settings(&settings));
        settings.documents = documents ? 1 : 0;
        Builder builder;
        const Begin begin = [&](const kzcat_format& format) {
            builder = made<Builder>(kzcat_builder_create, &format, &settings);
            return [&builder](std::span<const std::byte> bytes) {
                check(kzcat_builder_feed(builder.get(), bytes.data(), bytes.size()));
            };
        };
        Fed result = feed_file(path, options, begin);
        recording.tags = std::move(result.tags);
        recording.warning = std::move(result.warning);
        recording.seconds = result.seconds;
        recording.trail = made<Trail>(kzcat_builder_finish, builder.get());
    }
    check_length(recording.trail);
    add_title(recording.tags, name.empty() ? path : name);
    return recording;
}

Clip read_sound_clip(const std::string& path, const SoundOptions& options)
{
    Clip clip;
    const Begin begin = [&clip](const kzcat_format& format) {
        clip.query = made<Query>(kzcat_query_create, &format);
        return [&clip](std::span<const std::byte> bytes) {
            check(kzcat_query_feed(clip.query.get(), bytes.data(), bytes.size()));
        };
    };
    Fed result = feed_file(path, options, begin);
    clip.warning = std::move(result.warning);
    clip.seconds = result.seconds;
    check(kzcat_query_finish(clip.query.get()));
    return clip;
}

Clip read_clip(const std::string& path, const SoundOptions& options)
{
    switch (content_of(path, options)) {
    case Content::trail:
        return {.query = made<Query>(kzcat_query_create_from_trail,
                                     static_cast<const kzcat_trail*>(read_trail_file(path).get())),
                .warning = {}};
    case Content::document: {
        const std::string text = contents_of(path, kLongestDocument);
        return {.query = made<Query>(kzcat_query_create_from_document, text.data(), text.size()),
                .warning = {}};
    }
    case Content::sound:
        break;
    }
    return read_sound_clip(path, options);
}

} // namespace kzfp
