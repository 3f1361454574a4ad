/// @file
/// The exported calls of the DVD family, and the builders of its paths.
///
/// Unlike those of the Blu-ray family, the builders return a length, leave the last error alone and
/// always put a slash behind the root, also behind one that ends in a slash.
#include "kzsdk/abs/text.h"
#include "kzsdk/disc/disc.h"
#include "kzsdk/disc/disc_family.hpp"

namespace {

constinit kz::disc::Family dvd(kz::disc::kIso9660Label, kz::disc::kIso9660Volume);

/// Writes the root and a tail behind it. Returns the length of the whole, whether it fitted or not;
/// -1 for null arguments.
int32_t build(const char* root, const char* tail, char* destination, uint32_t size) noexcept
{
    if (root == nullptr || (destination == nullptr && size != 0)) {
        return -1;
    }
    const int32_t length = kz_snprintf(destination, size, "%s%s", root, tail);
    if (size != 0) {
        destination[size - 1] = '\0';
    }
    return length;
}

} // namespace

kz_status kzdvdfs_initialize() noexcept { return dvd.initialize(); }

kz_status kzdvdfs_shutdown() noexcept { return dvd.shutdown(); }

kz_status kzdvdfs_query_availability() noexcept { return dvd.availability(); }

kz_status kzdvdfs_get_error() noexcept { return dvd.take_error(); }

int32_t kzdvdfs_open(const char* path) noexcept { return dvd.open(path); }

int64_t kzdvdfs_seek(int32_t descriptor, int64_t offset, int32_t whence) noexcept
{
    return dvd.seek(descriptor, offset, whence);
}

int32_t kzdvdfs_read(int32_t descriptor, void* buffer, uint32_t count) noexcept
{
    return dvd.read(descriptor, buffer, count);
}

int32_t kzdvdfs_read_at(int32_t descriptor, int64_t offset, void* buffer, uint32_t count) noexcept
{
    return dvd.read_at(descriptor, offset, buffer, count);
}

kz_status kzdvdfs_close(int32_t descriptor) noexcept { return dvd.close(descriptor); }

kz_status kzdvdfs_read_vol_label(const char* root, uint32_t capacity, uint32_t* length,
                                 char* label) noexcept
{
    return dvd.read_vol_label(root, capacity, length, label);
}

kz_status kzdvdfs_get_volume_label(int32_t descriptor, char* label, uint32_t size) noexcept
{
    return dvd.get_volume_label(descriptor, label, size);
}

int32_t kzdvdfs_get_video_ts_ifoname(const char* root, char* destination, uint32_t size) noexcept
{
    return build(root, "/VIDEO_TS/VIDEO_TS.IFO", destination, size);
}

int32_t kzdvdfs_get_vts_ifoname(const char* root, int32_t title_set, char* destination,
                                uint32_t size) noexcept
{
    char tail[64];
    static_cast<void>(kz_snprintf(tail, sizeof tail, "/VIDEO_TS/VTS_%02i_0.IFO", title_set));
    return build(root, tail, destination, size);
}

int32_t kzdvdfs_exists(const char* path) noexcept { return dvd.exists(path) ? 1 : 0; }
