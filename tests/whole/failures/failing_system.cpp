// Loaded into a program ahead of the C library (LD_PRELOAD): makes its n-th allocation or its n-th
// read fail, as the environment says:
//
//   KZ_FAIL_ALLOCATION=n, KZ_FAIL_READ=n   from 1 on
//   KZ_FAIL_ON=1                           all later ones too
//   KZ_FAIL_REPORT=path                    a file that takes a byte when the failure strikes
//
// Allocations by libsndfile's own code succeed: it writes through null when a header's buffer
// cannot grow, which the program cannot prevent.
//
// It counts from the program's own start on, which is before its first line: some of the libraries
// that it loads abort when they cannot start, which the program cannot prevent either. It is called
// even before that, so nothing here may need initialising.

// Checked forms of the functions that are replaced here would be defined twice.
#undef _FORTIFY_SOURCE

#include <cerrno>
#include <cstddef>
#include <cstdlib>
#include <cstring>

#include <dlfcn.h>
#include <fcntl.h>
#include <sys/syscall.h>
#include <unistd.h>

extern "C" {
void* __libc_malloc(size_t size);
void* __libc_calloc(size_t count, size_t size);
void* __libc_realloc(void* block, size_t size);
}

namespace {

bool started = false; ///< the libraries are there

const char* setting(const char* name)
{
    const size_t length = std::strlen(name);
    for (char** entry = environ; entry != nullptr && *entry != nullptr; ++entry) {
        if (std::strncmp(*entry, name, length) == 0 && (*entry)[length] == '=') {
            return *entry + length + 1;
        }
    }
    return nullptr;
}

void report()
{
    if (const char* const path = setting("KZ_FAIL_REPORT"); path != nullptr) {
        const long file = ::syscall(SYS_openat, AT_FDCWD, path, O_WRONLY);
        static_cast<void>(::syscall(SYS_write, file, "x", 1));
        ::syscall(SYS_close, file);
    }
}

/// Counts a call of the kind that the setting is for. True when it has to fail.
bool fails(const char* kind, long& count, int error)
{
    const char* const nth = setting(kind);
    if (nth == nullptr) {
        return false;
    }
    const long at = std::strtol(nth, nullptr, 10);
    if (++count == at) {
        report();
    }
    if (count == at || (count > at && setting("KZ_FAIL_ON") != nullptr)) {
        errno = error;
        return true;
    }
    return false;
}

// The program has one thread.
long allocations = 0;
long reads = 0;

bool is_spared(const void* caller)
{
    Dl_info object = {};
    return ::dladdr(caller, &object) != 0 && std::strstr(object.dli_fname, "libsndfile") != nullptr;
}

bool allocation_fails(const void* caller)
{
    return started && !is_spared(caller) && fails("KZ_FAIL_ALLOCATION", allocations, ENOMEM);
}
bool read_fails() { return started && fails("KZ_FAIL_READ", reads, EIO); }

using Main = int (*)(int, char**, char**);
using Start = int (*)(Main, int, char**, void (*)(), void (*)(), void (*)(), void*);

} // namespace

extern "C" {

/// Comes after the constructors of all libraries, and before those of the program.
int __libc_start_main(Main main, int argc, char** argv, void (*init)(), void (*fini)(),
                      void (*end_of_loader)(), void* stack)
{
    Start start = nullptr;
    void* const next = ::dlsym(RTLD_NEXT, "__libc_start_main");
    std::memcpy(&start, &next, sizeof start);
    started = true;
    return start(main, argc, argv, init, fini, end_of_loader, stack);
}

void* malloc(size_t size)
{
    return allocation_fails(__builtin_return_address(0)) ? nullptr : __libc_malloc(size);
}

void* calloc(size_t count, size_t size)
{
    return allocation_fails(__builtin_return_address(0)) ? nullptr : __libc_calloc(count, size);
}

void* realloc(void* block, size_t size)
{
    return allocation_fails(__builtin_return_address(0)) ? nullptr : __libc_realloc(block, size);
}

ssize_t read(int file, void* bytes, size_t count)
{
    return read_fails() ? -1 : ::syscall(SYS_read, file, bytes, count);
}

ssize_t pread64(int file, void* bytes, size_t count, off_t offset)
{
    return read_fails() ? -1 : ::syscall(SYS_pread64, file, bytes, count, offset);
}

off_t lseek64(int file, off_t offset, int whence) noexcept
{
    return read_fails() ? -1 : ::syscall(SYS_lseek, file, offset, whence);
}

} // extern "C"
