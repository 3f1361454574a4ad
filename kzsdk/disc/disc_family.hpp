/// @file
/// What the Blu-ray and the DVD family have in common: a switch, a last error and the files.
#pragma once

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <cstdint>
#include <cstring>

#include <fcntl.h>
#include <unistd.h>

#include "kzsdk/abs/status.h"
#include "kzsdk/disc/read_at.hpp"
#include "kzsdk/disc/volume.hpp"
#include "kzsdk/disc/volume_label.hpp"

namespace kz::disc {

constexpr const char* kDevice = "/dev/dvd";

/// The status for what a system call leaves in `errno`. 0, which read_at() leaves for a move that
/// went elsewhere, counts as an error of the system like any other.
constexpr kz_status status_of(int error) noexcept
{
    switch (error) {
    case ENOENT:
        return KZ_DISC_ERROR_NOT_FOUND;
    case EBADF:
        return KZ_DISC_ERROR_BAD_DESCRIPTOR;
    case EACCES:
        return KZ_DISC_ERROR_ACCESS_DENIED;
    case EINVAL:
        return KZ_DISC_ERROR_INVALID_ARGUMENT;
    case EMFILE:
        return KZ_DISC_ERROR_TOO_MANY_FILES;
    case ENOSPC:
        return KZ_DISC_ERROR_NO_SPACE;
    default:
        return KZ_DISC_ERROR_SYSTEM;
    }
}

/// One family. Its two words belong to the whole process; each is read and written atomically,
/// without order between them. A success leaves the last error of an earlier failure in place
/// unless the call says otherwise.
class Family {
public:
    constexpr Family(int64_t label_offset, const VolumeKind& volume) noexcept
        : label_offset_(label_offset), volume_(volume)
    {
    }

    /// Success clears the last error.
    kz_status initialize() noexcept
    {
        return keep(on_.exchange(true, kRelaxed) ? KZ_DISC_ALREADY_ON : KZ_OK);
    }

    kz_status shutdown() noexcept
    {
        return on_.exchange(false, kRelaxed) ? KZ_OK : keep(KZ_DISC_NOT_ON);
    }

    kz_status availability() const noexcept
    {
        return is_on() ? KZ_DISC_ALREADY_ON : KZ_DISC_NOT_ON;
    }

    /// Returns the last error and clears it.
    kz_status take_error() noexcept { return last_error_.exchange(KZ_OK, kRelaxed); }

    /// Makes a status the last error and hands it on.
    kz_status keep(kz_status status) noexcept
    {
        last_error_.store(status, kRelaxed);
        return status;
    }

    /// What a system call has just left in `errno`, kept as the last error.
    kz_status keep_errno() noexcept { return keep(status_of(errno)); }

    /// False, with the reason as the last error, while the family is off.
    bool is_ready() noexcept
    {
        if (!is_on()) {
            keep(KZ_DISC_NOT_ON);
            return false;
        }
        return true;
    }

    int32_t open(const char* path) noexcept
    {
        return is_ready() ? checked(path != nullptr ? ::open(path, O_RDONLY) : refuse_null()) : -1;
    }

    /// An unknown origin is reported as a missing file.
    int64_t seek(int32_t descriptor, int64_t offset, int32_t whence) noexcept
    {
        if (!is_ready()) {
            return -1;
        }
        if (whence != SEEK_SET && whence != SEEK_CUR && whence != SEEK_END) {
            keep(KZ_DISC_ERROR_NOT_FOUND);
            return -1;
        }
        return checked(int64_t{::lseek(descriptor, offset, whence)});
    }

    int32_t read(int32_t descriptor, void* buffer, uint32_t count) noexcept
    {
        return is_ready() ? checked(read_here(descriptor, buffer, count)) : -1;
    }

    int32_t read_at(int32_t descriptor, int64_t offset, void* buffer, uint32_t count) noexcept
    {
        return is_ready() ? checked(disc::read_at(descriptor, offset, buffer, count)) : -1;
    }

    kz_status close(int32_t descriptor) noexcept
    {
        if (!is_ready()) {
            return KZ_DISC_NOT_ON;
        }
        return ::close(descriptor) == 0 ? KZ_OK : keep_errno();
    }

    /// Reads from the one device there is; the root is only checked. On success the device stays
    /// open.
    kz_status read_vol_label(const char* root, uint32_t capacity, uint32_t* length,
                             char* label) noexcept
    {
        if (root == nullptr || length == nullptr || label == nullptr) {
            return keep(KZ_DISC_ERROR_INVALID_ARGUMENT);
        }
        *length = 0;
        if (!is_ready()) {
            return KZ_DISC_NOT_ON;
        }
        // The descriptor is not returned and never closed, so at least a program that is started
        // does not inherit it.
        const int device = ::open(kDevice, O_RDONLY | O_CLOEXEC);
        if (device < 0) {
            return keep_errno();
        }
        VolumeLabel found{};
        if (!read_label(device, label_offset_, found)) {
            const kz_status status = keep_errno();
            ::close(device);
            return status;
        }
        *length = std::min(found.length, capacity);
        std::memcpy(label, found.text, *length);
        return keep(KZ_OK); // and the device stays open
    }

    kz_status get_volume_label(int32_t descriptor, char* label, uint32_t size) noexcept
    {
        if (label == nullptr || size == 0) {
            return keep(KZ_DISC_ERROR_INVALID_ARGUMENT);
        }
        label[0] = '\0';
        if (!is_ready()) {
            return KZ_DISC_NOT_ON;
        }
        WholeLabel found;
        switch (read_whole_label(descriptor, volume_, found)) {
        case VolumeSearch::failed:
            return keep_errno();
        case VolumeSearch::missing:
            return keep(KZ_DISC_ERROR_NOT_FOUND);
        case VolumeSearch::found:
            break;
        }
        if (found.length >= size) {
            return keep(KZ_DISC_ERROR_MEMORY);
        }
        std::memcpy(label, found.text, found.length + 1);
        return KZ_OK;
    }

    bool exists(const char* path) noexcept
    {
        if (!is_ready()) {
            return false;
        }
        return checked(path != nullptr ? ::access(path, F_OK) : refuse_null()) == 0;
    }

private:
    static constexpr auto kRelaxed = std::memory_order_relaxed;

    bool is_on() const noexcept { return on_.load(kRelaxed); }

    /// What the system reports for a null path. The C library need not pass one on to it.
    static int refuse_null() noexcept
    {
        errno = EFAULT;
        return -1;
    }

    /// The result of a system call; a failure is kept.
    template <class Result>
    Result checked(Result result) noexcept
    {
        if (result < 0) {
            keep_errno();
            return -1;
        }
        return result;
    }

    const int64_t label_offset_;
    const VolumeKind& volume_;
    std::atomic<bool> on_{false};
    std::atomic<kz_status> last_error_{KZ_OK};
};

} // namespace kz::disc
