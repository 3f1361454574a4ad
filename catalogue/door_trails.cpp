// The C interface: from samples to trails, and trails as bytes.

#include <algorithm>
#include <cstring>

#include "catalogue/handles.hpp"
#include "catalogue/model/trail_file.hpp"

namespace {

using namespace kzcat;

bool wants_documents(const kzcat_builder_settings& settings)
{
    require(settings.documents <= 1 && all_zero(settings.reserved),
            "a field of the builder's settings is out of range; fill them with "
            "kzcat_initialize_builder_settings()");
    return settings.documents == 1;
}

void check_taking(const kzcat_builder& builder)
{
    if (builder.state == kzcat_builder::finished) {
        throw Failure(KZCAT_ERROR_ORDER,
                      "the builder was finished already; create another one for more sound");
    }
    if (builder.state == kzcat_builder::broken) {
        throw Failure(KZCAT_ERROR_MEMORY, "memory was short while the builder took sound, and some "
                                          "may be lost; free some, create another one and feed it "
                                          "from the start");
    }
}

/// Moves the codes that are complete from the extractor to the builder.
void take_codes(kzcat_builder& builder)
{
    const std::vector<Code> fresh = builder.extractor.take_codes();
    builder.codes.insert(builder.codes.end(), fresh.begin(), fresh.end());
}

/// The least sound that has so many codes.
uint64_t samples_of(size_t codes) { return codes == 0 ? 0 : (codes - 1) * kCodeHop + kFrameLength; }

} // namespace

SoundFormat kzcat::to_sound_format(const kzcat_format* format)
{
    require(format != nullptr, "the format is null; pass a record");
    require(format->reserved == 0, "the reserved field of the format is not 0; clear the record");
    return {.encoding = format->format, .rate = format->sample_rate, .channels = format->channels};
}

kzcat_status kzcat_initialize_builder_settings(kzcat_builder_settings* settings) noexcept
{
    return guarded([=] {
        require(settings != nullptr, "the settings are null; pass a record");
        *settings = {};
    });
}

kzcat_status kzcat_builder_create(const kzcat_format* format,
                                  const kzcat_builder_settings* settings,
                                  kzcat_builder** out_builder) noexcept
{
    return guarded([=] {
        clear_place(out_builder);
        const bool documents = settings != nullptr && wants_documents(*settings);
        const SoundFormat sound = to_sound_format(format);
        *out_builder = with_format_checked([&] {
            return new kzcat_builder{TrailExtractor(sound, documents), {}};
        });
    });
}

kzcat_status kzcat_builder_feed(kzcat_builder* builder, const void* bytes,
                                uint64_t byte_count) noexcept
{
    return guarded([=] {
        require(builder != nullptr, "the builder is null; create one");
        const auto taken = bytes_of(bytes, byte_count);
        check_taking(*builder);
        builder->state = kzcat_builder::broken;
        builder->extractor.feed(taken);
        builder->state = kzcat_builder::taking;
    });
}

kzcat_status kzcat_builder_get_trail(kzcat_builder* builder, kzcat_trail** out_trail) noexcept
{
    return guarded([=] {
        clear_place(out_trail);
        require(builder != nullptr, "the builder is null; create one");
        check_taking(*builder);
        builder->state = kzcat_builder::broken;
        take_codes(*builder);
        auto made = std::make_unique<kzcat_trail>();
        made->trail.samples = samples_of(builder->codes.size());
        made->trail.codes = builder->codes;
        builder->state = kzcat_builder::taking;
        *out_trail = made.release();
    });
}

kzcat_status kzcat_builder_finish(kzcat_builder* builder, kzcat_trail** out_trail) noexcept
{
    return guarded([=] {
        clear_place(out_trail);
        require(builder != nullptr, "the builder is null; create one");
        check_taking(*builder);
        builder->state = kzcat_builder::broken;
        auto made = std::make_unique<kzcat_trail>();
        made->document_bands = builder->extractor.take_document_bands();
        take_codes(*builder);
        made->trail = builder->extractor.finish();
        made->trail.codes.swap(builder->codes);
        made->trail.codes.insert(made->trail.codes.end(), builder->codes.begin(),
                                 builder->codes.end());
        builder->state = kzcat_builder::finished;
        *out_trail = made.release();
    });
}

kzcat_status kzcat_builder_free(kzcat_builder** builder_ref) noexcept
{
    return free_handle(builder_ref);
}

kzcat_status kzcat_trail_get_facts(const kzcat_trail* trail, kzcat_trail_facts* out_facts) noexcept
{
    return guarded([=] {
        require(trail != nullptr && out_facts != nullptr,
                "the trail or the record for its facts is null; pass both");
        *out_facts = {};
        out_facts->samples = trail->trail.samples;
        out_facts->code_count = trail->trail.codes.size();
        out_facts->sample_rate = kWorkingRate;
        out_facts->profile = static_cast<uint32_t>(trail->trail.profile);
        out_facts->answers_documents = trail->document_bands.empty() ? 0 : 1;
    });
}

kzcat_status kzcat_trail_get_codes(const kzcat_trail* trail, uint64_t* codes, uint64_t capacity,
                                   uint64_t* out_count) noexcept
{
    return guarded([=] {
        require(out_count != nullptr, "the place for the count is null; pass one");
        *out_count = 0;
        require(trail != nullptr, "the trail is null; pass one");
        require(codes != nullptr || capacity == 0,
                "the codes are null; pass room, or a capacity of "
                "0 to learn the count");
        copy_out(std::span(std::as_const(trail->trail.codes)), codes, capacity, out_count);
    });
}

kzcat_status kzcat_trail_write(const kzcat_trail* trail, void* bytes, uint64_t capacity,
                               uint64_t* out_size) noexcept
{
    return guarded([=] {
        require(out_size != nullptr, "the place for the size is null; pass one");
        *out_size = 0;
        require(trail != nullptr, "the trail is null; pass one");
        require(bytes != nullptr || capacity == 0,
                "the bytes are null; pass room, or a capacity of "
                "0 to learn the size");
        const std::vector<std::byte> written = write_trail(trail->trail);
        copy_out(std::span(written), static_cast<std::byte*>(bytes), capacity, out_size);
    });
}

kzcat_status kzcat_trail_read(const void* bytes, uint64_t byte_count,
                              kzcat_trail** out_trail) noexcept
{
    return guarded([=] {
        clear_place(out_trail);
        const auto given = bytes_of(bytes, byte_count);
        *out_trail = new kzcat_trail{.trail = read_trail(given), .document_bands = {}};
    });
}

kzcat_status kzcat_trail_free(kzcat_trail** trail_ref) noexcept { return free_handle(trail_ref); }
