/// @file
/// Listing the directories of a Blu-ray disc.
///
/// The records here live on the system heap: directories can be listed before the library is
/// started and after it was shut down, and whether the family is on or off. An entry's name belongs
/// to the stream; its path is a copy of its own.
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <memory>

#include <sys/stat.h>

#include "kzsdk/disc/bluray.hpp"

namespace {

using kz::disc::bluray;

/// Frees either record by its exported call.
struct FreeRecord {
    void operator()(kzbdfs_dir* dir) const noexcept { kzbdfs_close_dir(dir); }
    void operator()(kzbdfs_dirent* entry) const noexcept { kzbdfs_free_dirent(entry); }
};
template <class Record>
using heap_owned = std::unique_ptr<Record, FreeRecord>;

/// A cleared record; null when memory is short.
template <class Record>
heap_owned<Record> make_on_heap() noexcept
{
    return heap_owned<Record>(static_cast<Record*>(std::calloc(1, sizeof(Record))));
}

/// "path/name", of any length. Null when memory is short.
char* joined(const char* path, const char* name) noexcept
{
    const size_t size = std::strlen(path) + 1 + std::strlen(name) + 1;
    auto* text = static_cast<char*>(std::malloc(size));
    if (text != nullptr) {
        std::snprintf(text, size, "%s/%s", path, name);
    }
    return text;
}

/// True when what the entry itself is, not what it may link to, is of this type.
bool is_of_type(const kzbdfs_dirent* entry, mode_t type) noexcept
{
    if (entry == nullptr) {
        return false;
    }
    struct stat facts {};
    if (::lstat(entry->path, &facts) != 0) {
        bluray.keep_errno();
        return false;
    }
    return (facts.st_mode & S_IFMT) == type;
}

/// The next record of a stream. Null at its end and when reading fails; only a failure sets
/// `errno`, and it becomes the last error.
const dirent* next_record(DIR* stream) noexcept
{
    errno = 0;
    const dirent* record = ::readdir(stream);
    if (record == nullptr && errno != 0) {
        bluray.keep_errno();
    }
    return record;
}

/// False for a null entry.
bool is_named(const kzbdfs_dirent* entry, const char* name) noexcept
{
    return entry != nullptr && std::strcmp(entry->record->d_name, name) == 0;
}

} // namespace

char kzbdfs_dir_get_delim() noexcept { return '/'; }

kz_status kzbdfs_open_dir(const char* path, kzbdfs_dir** handle) noexcept
{
    if (path == nullptr || handle == nullptr) {
        return KZ_DISC_ERROR_INVALID_ARGUMENT;
    }
    auto dir = make_on_heap<kzbdfs_dir>();
    if (!dir) {
        return KZ_DISC_ERROR_MEMORY;
    }
    dir->path = joined(path, "");
    if (dir->path == nullptr) {
        return KZ_DISC_ERROR_MEMORY;
    }
    dir->stream = ::opendir(path);
    if (dir->stream == nullptr) {
        bluray.keep_errno(); // the reason; the result says "out of memory" whatever it was
        return KZ_DISC_ERROR_MEMORY;
    }
    *handle = dir.release();
    return bluray.take_error();
}

kzbdfs_dirent* kzbdfs_readdir(kzbdfs_dir* handle) noexcept
{
    const dirent* record = handle != nullptr ? next_record(handle->stream) : nullptr;
    if (record == nullptr) {
        return nullptr;
    }
    auto entry = make_on_heap<kzbdfs_dirent>();
    if (!entry) {
        return nullptr;
    }
    entry->record = record;
    entry->path = joined(handle->path, record->d_name);
    return entry->path != nullptr ? entry.release() : nullptr;
}

const char* kzbdfs_dirent_get_name(const kzbdfs_dirent* entry) noexcept
{
    return entry != nullptr ? entry->record->d_name : nullptr;
}

int32_t kzbdfs_dirent_is_current_dir(const kzbdfs_dirent* entry) noexcept
{
    return is_named(entry, ".") ? 1 : 0;
}

int32_t kzbdfs_dirent_is_parent_dir(const kzbdfs_dirent* entry) noexcept
{
    return is_named(entry, "..") ? 1 : 0;
}

int32_t kzbdfs_dirent_is_file(const kzbdfs_dirent* entry) noexcept
{
    return is_of_type(entry, S_IFREG) ? 1 : 0;
}

int32_t bnbdfs_dirent_is_dir(const kzbdfs_dirent* entry) noexcept
{
    return is_of_type(entry, S_IFDIR) ? 1 : 0;
}

void kzbdfs_free_dirent(kzbdfs_dirent* entry) noexcept
{
    if (entry != nullptr) {
        std::free(entry->path);
        std::free(entry);
    }
}

void kzbdfs_close_dir(kzbdfs_dir* handle) noexcept
{
    if (handle == nullptr) {
        return;
    }
    if (handle->stream != nullptr && ::closedir(handle->stream) != 0) {
        bluray.keep_errno();
    }
    std::free(handle->path);
    std::free(handle);
}
