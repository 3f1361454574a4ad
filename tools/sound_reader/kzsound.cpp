// Exceptions of the readers end here: as a status, and a sentence that belongs to the thread.

#include "kzsound.h"

#include <algorithm>
#include <cstdio>
#include <exception>
#include <memory>
#include <new>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "audio/file_source.hpp"
#include "audio/input.hpp"
#include "kzsdk/stream/stream.h"

struct kzsound_file {
    audio::Request request; ///< the input refers to it
    std::unique_ptr<audio::Input> input;
    audio::OpenedInput opened;
    std::string trouble;
    bool ended = false;
};

namespace {

thread_local char error_text[1024];

uint32_t failed(uint32_t status, const char* text) noexcept
{
    std::snprintf(error_text, sizeof error_text, "%s", text);
    return status;
}

uint32_t invalid(const char* text) noexcept { return failed(KZSOUND_ERROR_INVALID_ARGUMENT, text); }

/// Runs what may throw.
template <class Work>
uint32_t guarded(Work work) noexcept
{
    try {
        work();
        return KZSOUND_OK;
    } catch (const audio::NotRecognised&) {
        return failed(KZSOUND_ERROR_FILE,
                      "is not a sound file that can be read (WAV, FLAC, OGG, MP3, ...); pass "
                      "headerless audio as samples, with its rate");
    } catch (const std::bad_alloc&) {
        return failed(KZSOUND_ERROR_MEMORY, "not enough memory");
    } catch (const std::exception& error) {
        return failed(KZSOUND_ERROR_FILE, error.what());
    } catch (...) {
        return failed(KZSOUND_ERROR_FILE, "cannot be read");
    }
}

uint32_t stream_format(audio::Encoding encoding)
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

audio::AcceptsRate accepting(const kzsound_request& request)
{
    if (request.rates == nullptr) {
        return [](uint32_t) { return true; };
    }
    const std::vector<uint32_t> rates(request.rates, request.rates + request.rate_count);
    return [rates](uint32_t rate) { return std::ranges::find(rates, rate) != rates.end(); };
}

/// A regular file is opened once; of a pipe, more and more is fetched until it has ended.
audio::OpenedInput open_whole(audio::Input& input)
{
    for (;;) {
        try {
            audio::OpenedInput opened = input.open();
            if (!input.extend()) {
                return opened;
            }
        } catch (const audio::FileError&) {
            if (!input.extend()) {
                throw;
            }
        }
    }
}

} // namespace

uint32_t kzsound_open(const char* path, const kzsound_request* request,
                      kzsound_file** out_file) noexcept
{
    if (out_file != nullptr) {
        *out_file = nullptr;
    }
    if (path == nullptr || request == nullptr || out_file == nullptr) {
        return invalid("a pointer is null: pass a path, a request and a place for the file");
    }
    return guarded([&] {
        auto file = std::make_unique<kzsound_file>();
        file->request.accepts_rate = accepting(*request);
        file->request.floats = request->floats != 0;
        // "-" is a file here: standard input belongs to the program.
        const std::string name = path == std::string("-") ? "./-" : path;
        file->input = std::make_unique<audio::Input>(name, file->request);
        file->opened = open_whole(*file->input);
        *out_file = file.release();
    });
}

uint32_t kzsound_get_facts(const kzsound_file* file, kzsound_facts* out_facts) noexcept
{
    if (file == nullptr || out_facts == nullptr) {
        return invalid("a pointer is null: pass a file and a place for the facts");
    }
    const audio::StreamFormat format = file->opened.source->format();
    const audio::InputFacts& facts = file->opened.facts;
    *out_facts = {.duration = facts.duration.value_or(-1),
                  .format = stream_format(format.encoding),
                  .sample_rate = format.rate,
                  .channels = format.channels,
                  .file_rate = facts.rate,
                  .file_channels = facts.channels,
                  .tag_count = static_cast<uint32_t>(facts.tags.size())};
    return KZSOUND_OK;
}

uint32_t kzsound_get_tag(const kzsound_file* file, uint32_t place, const char** out_name,
                         const char** out_value) noexcept
{
    if (file == nullptr || out_name == nullptr || out_value == nullptr ||
        place >= file->opened.facts.tags.size()) {
        return invalid("a pointer is null, or there is no tag at this place: see tag_count");
    }
    const audio::Tag& tag = file->opened.facts.tags[place];
    *out_name = tag.name.c_str();
    *out_value = tag.value.c_str();
    return KZSOUND_OK;
}

uint32_t kzsound_read(kzsound_file* file, void* bytes, uint64_t capacity,
                      uint64_t* out_size) noexcept
{
    if (out_size != nullptr) {
        *out_size = 0;
    }
    if (file == nullptr || bytes == nullptr || out_size == nullptr) {
        return invalid("a pointer is null: pass a file, room for samples and a place for the size");
    }
    const size_t frame = file->opened.source->format().frame_bytes();
    const auto room = static_cast<size_t>(capacity / frame * frame);
    if (room == 0) {
        return invalid("there is no room for a frame: pass room for a sample of each channel");
    }
    return guarded([&] {
        if (!file->ended) {
            const size_t frames =
                file->opened.source->read(std::span(static_cast<std::byte*>(bytes), room));
            *out_size = frames * frame;
            file->ended = *out_size < room;
        }
    });
}

const char* kzsound_get_trouble(kzsound_file* file) noexcept
{
    if (file == nullptr) {
        return "";
    }
    const uint32_t status = guarded([file] {
        const std::string why = file->opened.source->trouble();
        const bool went_on = file->opened.source->went_on();
        file->trouble = why.empty() ? ""
                        : went_on   ? "is damaged (" + why + "); the rest was used"
                                    : "is damaged (" + why + "); what comes before was used";
    });
    return status == KZSOUND_OK ? file->trouble.c_str() : "is damaged";
}

void kzsound_free(kzsound_file** file_ref) noexcept
{
    if (file_ref != nullptr) {
        delete std::exchange(*file_ref, nullptr);
    }
}

const char* kzsound_get_error_text(void) noexcept { return error_text; }

const char* kzsound_get_readers(void) noexcept
{
    try {
        static const std::string readers = audio::readers();
        return readers.c_str();
    } catch (...) {
        return "";
    }
}
