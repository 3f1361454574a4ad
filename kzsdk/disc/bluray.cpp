/// @file
/// The exported calls of the Blu-ray family, directories apart, and the builders of its paths.
///
/// A builder puts a NUL into the last byte of its destination before it writes, and reports no text
/// that was cut, with one exception. The root "/" gets a second slash.
#include "kzsdk/disc/bluray.hpp"

#include "kzsdk/abs/text.h"

namespace {

using kz::disc::bluray;

// Room for a fixed name with a number of at most 20 digits in it.
constexpr uint32_t kNumberedSize = 64;

bool ends_in_slash(const char* root) noexcept
{
    const size_t length = std::strlen(root);
    return length > 1 && root[length - 1] == '/'; // the root "/" gets a second one
}

bool can_build(const char* destination, uint32_t size) noexcept
{
    return destination != nullptr && size != 0;
}

/// Writes root and tail with one "/" between them. Returns the length of the whole.
int32_t write_below(const char* root, const char* tail, char* destination, uint32_t size) noexcept
{
    destination[size - 1] = '\0';
    return kz_snprintf(destination, size, "%s%s%s", root, ends_in_slash(root) ? "" : "/", tail);
}

/// The common form of the builders: arguments checked, the last error set or cleared.
kz_status build_below(const char* root, const char* tail, char* destination, uint32_t size) noexcept
{
    if (root == nullptr || !can_build(destination, size)) {
        return bluray.keep(KZ_DISC_ERROR_INVALID_ARGUMENT);
    }
    write_below(root, tail, destination, size);
    return bluray.keep(KZ_OK);
}

} // namespace

kz_status kzbdfs_initialize() noexcept { return bluray.initialize(); }

kz_status kzbdfs_shutdown() noexcept { return bluray.shutdown(); }

kz_status kzbdfs_query_availability() noexcept { return bluray.availability(); }

kz_status kzbdfs_get_error() noexcept { return bluray.take_error(); }

int32_t kzbdfs_open(const char* path) noexcept { return bluray.open(path); }

int64_t kzbdfs_seek(int32_t descriptor, int64_t offset, int32_t whence) noexcept
{
    return bluray.seek(descriptor, offset, whence);
}

int32_t kzbdfs_read(int32_t descriptor, void* buffer, uint32_t count) noexcept
{
    return bluray.read(descriptor, buffer, count);
}

int32_t kzbdfs_read_at(int32_t descriptor, int64_t offset, void* buffer, uint32_t count) noexcept
{
    return bluray.read_at(descriptor, offset, buffer, count);
}

kz_status kzbdfs_close(int32_t descriptor) noexcept { return bluray.close(descriptor); }

kz_status kzbdfs_read_vol_label(const char* root, uint32_t capacity, uint32_t* length,
                                char* label) noexcept
{
    return bluray.read_vol_label(root, capacity, length, label);
}

kz_status kzbdfs_get_volume_label(int32_t descriptor, char* label, uint32_t size) noexcept
{
    return bluray.get_volume_label(descriptor, label, size);
}

kz_status kzbdfs_get_cert_filename(char* destination, uint32_t number, uint32_t size) noexcept
{
    if (!can_build(destination, size)) {
        return bluray.keep(KZ_DISC_ERROR_INVALID_ARGUMENT);
    }
    destination[size - 1] = '\0';
    static_cast<void>(
        kz_snprintf(destination, size, "Content%.3lu.cer", static_cast<unsigned long>(number)));
    return bluray.keep(KZ_OK);
}

kz_status kzbdfs_get_cert_dirname(const char* root, char* destination, uint32_t size) noexcept
{
    if (root == nullptr || !can_build(destination, size)) {
        return bluray.keep(KZ_DISC_ERROR_INVALID_ARGUMENT);
    }
    // The only builder that reports a text that was cut, and only 16 bits of the length count.
    const auto length = static_cast<uint16_t>(write_below(root, "AACS/", destination, size));
    return bluray.keep(size > length ? KZ_OK : KZ_DISC_ERROR_MEMORY);
}

kz_status kzbdfs_get_index_bdmv_name(const char* root, char* destination, uint32_t size) noexcept
{
    return build_below(root, "BDMV/index.bdmv", destination, size);
}

kz_status kzbdfs_get_movieobject_bdmv_name(const char* root, char* destination,
                                           uint32_t size) noexcept
{
    return build_below(root, "BDMV/MovieObject.bdmv", destination, size);
}

kz_status kzbdfs_get_playlist_dirname(const char* root, char* destination, uint32_t size) noexcept
{
    return build_below(root, "BDMV/PLAYLIST/", destination, size);
}

kz_status kzbdfs_get_playlist_filename(const char* root, uint32_t number, char* destination,
                                       uint32_t size) noexcept
{
    char tail[kNumberedSize];
    static_cast<void>(kz_snprintf(tail, kNumberedSize, "BDMV/PLAYLIST/%.5lu.mpls",
                                  static_cast<unsigned long>(number)));
    return build_below(root, tail, destination, size);
}
