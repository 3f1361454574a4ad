#include "scripted_core.hpp"

#include <cstring>
#include <mutex>

#include "kzsdk/abs/startup.h"
#include "kzsdk/fpx/fpx.h"

struct kz_fpx_handle {
    int unused = 0;
};

namespace {

using kz::test::script;

kz_fpx_handle the_handle;

/// First jobs of several workers start the core at once.
std::mutex noting;

void note(const char* call)
{
    const std::lock_guard lock(noting);
    script().calls.emplace_back(call);
}

kz_status next_start()
{
    const std::lock_guard lock(noting);
    if (script().starts.empty()) {
        return KZ_OK;
    }
    const kz_status status = script().starts.front();
    script().starts.erase(script().starts.begin());
    return status;
}

} // namespace

namespace kz::test {

Script& script()
{
    static Script current;
    return current;
}

} // namespace kz::test

kz_status kzconf_initialize_configuration(kzconf_configuration* record) noexcept
{
    note("configure");
    std::memset(record, 0, sizeof *record);
    return script().configuration;
}

kz_status kzinit_initialize_vesk(const kzconf_configuration* record) noexcept
{
    note("start");
    const kzconf_configuration zero = {};
    if (std::memcmp(record, &zero, sizeof zero) != 0) {
        note("with a record that is not clear");
    }
    return next_start();
}

kz_status kzinit_shutdown_vesk() noexcept
{
    note("shut down");
    return KZ_OK;
}

kz_status kz_fpx_fingerprint_create(uint32_t algorithm, uint32_t format, uint32_t sample_rate,
                                    uint32_t channels, kz_fpx_handle** out_handle) noexcept
{
    note("create");
    script().algorithm = algorithm;
    script().format = format;
    script().rate = sample_rate;
    script().channels = channels;
    if (script().create == KZ_OK) {
        *out_handle = &the_handle;
    }
    return script().create;
}

kz_status kz_fpx_fingerprint_add_audio(kz_fpx_handle* /*handle*/, const void* audio,
                                       uint32_t byte_count, uint8_t* out_complete) noexcept
{
    note("add audio");
    script().audio.assign(static_cast<const char*>(audio), byte_count);
    if (script().during_job) {
        script().during_job();
    }
    *out_complete = script().complete;
    return script().add_audio;
}

kz_status kz_fpx_fingerprint_serialize(kz_fpx_handle* /*handle*/, char** out_text) noexcept
{
    note("serialize");
    *out_text = nullptr;
    if (script().serialize == KZ_OK) {
        *out_text = strdup(script().text.c_str());
        ++script().texts_out;
    }
    return script().serialize;
}

kz_status kz_fpx_fingerprint_serialize_free(char** text_ref) noexcept
{
    if (*text_ref != nullptr) {
        std::free(*text_ref);
        *text_ref = nullptr;
        --script().texts_out;
    }
    return script().serialize_free;
}

kz_status kz_fpx_fingerprint_free(kz_fpx_handle** handle_ref) noexcept
{
    note("free");
    *handle_ref = nullptr;
    return script().free;
}
