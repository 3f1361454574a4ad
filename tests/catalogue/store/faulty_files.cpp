// A VFS over the usual one.

#include "tests/catalogue/store/faulty_files.hpp"

#include <algorithm>
#include <csignal>
#include <cstring>
#include <map>
#include <mutex>
#include <random>
#include <string>
#include <vector>

#include <fcntl.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

namespace kzcat::test {

namespace {

/// What a call that was not synchronised has changed, so that a power cut can undo it.
struct Undo {
    int64_t offset = 0;
    int64_t old_size = 0;
    std::string old_bytes;
};

struct State {
    FileFault fault = FileFault::none;
    uint64_t nth = 0;
    bool lasting = false;
    uint64_t seed = 0;
    uint64_t calls = 0;
    bool fired = false;
    std::map<std::string, std::vector<Undo>> undo; ///< by path
};
State state;

sqlite3_vfs* usual() { return sqlite3_vfs_find(nullptr); }

/// SQLite gives room for this and, behind it, for the file of the usual VFS.
struct File {
    sqlite3_file base;
    const char* path;
};

File* own(sqlite3_file* file) { return reinterpret_cast<File*>(file); }
sqlite3_file* real(sqlite3_file* file) { return reinterpret_cast<sqlite3_file*>(own(file) + 1); }

void undo_unsynchronised(const std::string& path, std::vector<Undo>& changes, size_t kept)
{
    const int file = open(path.c_str(), O_WRONLY);
    if (file < 0) {
        return;
    }
    for (; changes.size() > kept; changes.pop_back()) {
        const Undo& change = changes.back();
        if (pwrite(file, change.old_bytes.data(), change.old_bytes.size(), change.offset) < 0 ||
            ftruncate(file, change.old_size) != 0) {
            _exit(2);
        }
    }
    close(file);
}

[[noreturn]] void die()
{
    if (state.fault == FileFault::power_cut) {
        std::mt19937_64 random(state.seed);
        for (auto& [path, changes] : state.undo) {
            undo_unsynchronised(path, changes, random() % (changes.size() + 1));
        }
    }
    kill(getpid(), SIGKILL);
    _exit(2);
}

/// A full disk concerns writes only.
bool goes_wrong(bool is_write = false)
{
    if (state.fault == FileFault::full && !is_write) {
        return false;
    }
    ++state.calls;
    if (state.fault == FileFault::none ||
        (state.lasting ? state.calls < state.nth : state.calls != state.nth)) {
        return false;
    }
    state.fired = true;
    return true;
}

bool is_deadly() { return state.fault == FileFault::kill || state.fault == FileFault::power_cut; }

void remember(sqlite3_file* file, int64_t offset, int64_t count)
{
    if (state.fault != FileFault::power_cut || own(file)->path == nullptr) {
        return;
    }
    Undo undo{.offset = offset, .old_size = 0, .old_bytes = {}};
    sqlite3_int64 size = 0;
    real(file)->pMethods->xFileSize(real(file), &size);
    undo.old_size = size;
    undo.old_bytes.resize(static_cast<size_t>(std::clamp<int64_t>(size - offset, 0, count)));
    if (!undo.old_bytes.empty()) {
        real(file)->pMethods->xRead(real(file), undo.old_bytes.data(),
                                    static_cast<int>(undo.old_bytes.size()), offset);
    }
    state.undo[own(file)->path].push_back(undo);
}

void forget(const char* path)
{
    if (state.fault == FileFault::power_cut && path != nullptr) {
        state.undo.erase(path);
    }
}

int write(sqlite3_file* file, const void* bytes, int count, sqlite3_int64 offset)
{
    const auto pass_on = [&](int some) {
        remember(file, offset, some);
        return real(file)->pMethods->xWrite(real(file), bytes, some, offset);
    };
    if (!goes_wrong(true)) {
        return pass_on(count);
    }
    if (state.fault == FileFault::error) {
        return SQLITE_IOERR_WRITE;
    }
    pass_on(count / 2);
    if (is_deadly()) {
        die();
    }
    return SQLITE_FULL;
}

int truncate(sqlite3_file* file, sqlite3_int64 size)
{
    if (goes_wrong()) {
        if (is_deadly()) {
            die();
        }
        return SQLITE_IOERR_TRUNCATE;
    }
    remember(file, size, INT32_MAX);
    return real(file)->pMethods->xTruncate(real(file), size);
}

// What the device is asked to do makes no difference to these tests, but takes long.
int sync(sqlite3_file* file, int)
{
    if (goes_wrong()) {
        if (is_deadly()) {
            die();
        }
        return SQLITE_IOERR_FSYNC;
    }
    forget(own(file)->path);
    return SQLITE_OK;
}

int remove(sqlite3_vfs*, const char* path, int sync_folder)
{
    if (goes_wrong()) {
        if (is_deadly()) {
            die();
        }
        return SQLITE_IOERR_DELETE;
    }
    forget(path);
    return usual()->xDelete(usual(), path, sync_folder);
}

int close_file(sqlite3_file* file)
{
    return real(file)->pMethods == nullptr ? SQLITE_OK : real(file)->pMethods->xClose(real(file));
}

const sqlite3_io_methods kMethods = {
    .iVersion = 2,
    .xClose = close_file,
    .xRead =
        [](sqlite3_file* file, void* bytes, int count, sqlite3_int64 offset) {
            return real(file)->pMethods->xRead(real(file), bytes, count, offset);
        },
    .xWrite = write,
    .xTruncate = truncate,
    .xSync = sync,
    .xFileSize =
        [](sqlite3_file* file, sqlite3_int64* size) {
            return real(file)->pMethods->xFileSize(real(file), size);
        },
    .xLock = [](sqlite3_file* file,
                int lock) { return real(file)->pMethods->xLock(real(file), lock); },
    .xUnlock = [](sqlite3_file* file,
                  int lock) { return real(file)->pMethods->xUnlock(real(file), lock); },
    .xCheckReservedLock =
        [](sqlite3_file* file, int* result) {
            return real(file)->pMethods->xCheckReservedLock(real(file), result);
        },
    .xFileControl =
        [](sqlite3_file* file, int operation, void* argument) {
            return real(file)->pMethods->xFileControl(real(file), operation, argument);
        },
    .xSectorSize = [](sqlite3_file* file) { return real(file)->pMethods->xSectorSize(real(file)); },
    .xDeviceCharacteristics =
        [](sqlite3_file* file) { return real(file)->pMethods->xDeviceCharacteristics(real(file)); },
    .xShmMap =
        [](sqlite3_file* file, int region, int size, int extend, void volatile** map) {
            return real(file)->pMethods->xShmMap(real(file), region, size, extend, map);
        },
    .xShmLock =
        [](sqlite3_file* file, int offset, int count, int flags) {
            return real(file)->pMethods->xShmLock(real(file), offset, count, flags);
        },
    .xShmBarrier = [](sqlite3_file* file) { real(file)->pMethods->xShmBarrier(real(file)); },
    .xShmUnmap =
        [](sqlite3_file* file, int remove_it) {
            return real(file)->pMethods->xShmUnmap(real(file), remove_it);
        },
    .xFetch = nullptr,
    .xUnfetch = nullptr,
};

int open_file(sqlite3_vfs*, const char* path, sqlite3_file* file, int flags, int* out_flags)
{
    own(file)->base.pMethods = nullptr;
    own(file)->path = path;
    const int code = usual()->xOpen(usual(), path, real(file), flags, out_flags);
    if (real(file)->pMethods != nullptr) {
        own(file)->base.pMethods = &kMethods;
    }
    return code;
}

} // namespace

const char* faulty_files()
{
    static sqlite3_vfs vfs = [] {
        sqlite3_vfs made = *usual();
        made.szOsFile = static_cast<int>(sizeof(File)) + usual()->szOsFile;
        made.pNext = nullptr;
        made.zName = "faulty";
        made.xOpen = open_file;
        made.xDelete = remove;
        return made;
    }();
    static const int registered = sqlite3_vfs_register(&vfs, 0);
    return registered == SQLITE_OK ? vfs.zName : nullptr;
}

void set_file_fault(FileFault fault, uint64_t nth, bool lasting, uint64_t seed)
{
    state = {};
    state.fault = fault;
    state.nth = nth;
    state.lasting = lasting;
    state.seed = seed;
}

uint64_t file_changes() { return state.calls; }
bool file_fault_fired() { return state.fired; }

} // namespace kzcat::test
