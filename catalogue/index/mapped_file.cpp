/// @file
/// A file mapped read-only, and a file that takes another's place in one step.

#include "catalogue/index/mapped_file.hpp"

#include <cerrno>
#include <cstdio>
#include <system_error>
#include <utility>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

namespace kzcat {

namespace {

[[noreturn]] void fail(const std::string& what)
{
    throw std::system_error(errno, std::generic_category(), what);
}

/// Closes a descriptor at the end of its block.
struct Descriptor {
    explicit Descriptor(int value) : number(value) {}
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;
    ~Descriptor()
    {
        if (number >= 0) {
            ::close(number);
        }
    }
    int number;
};

size_t length_of(int descriptor, const std::string& path)
{
    struct stat status {};
    if (::fstat(descriptor, &status) != 0) {
        fail(path);
    }
    if (!S_ISREG(status.st_mode)) {
        errno = EINVAL;
        fail(path + " is not a file");
    }
    if (std::cmp_greater(status.st_size, SIZE_MAX)) {
        errno = EFBIG;
        fail(path);
    }
    return static_cast<size_t>(status.st_size);
}

bool same_file(int descriptor, const std::string& path)
{
    struct stat opened {};
    struct stat named {};
    return ::fstat(descriptor, &opened) == 0 && ::lstat(path.c_str(), &named) == 0 &&
           opened.st_dev == named.st_dev && opened.st_ino == named.st_ino;
}

void write_all(int descriptor, std::span<const std::byte> bytes, const std::string& path)
{
    while (!bytes.empty()) {
        const ssize_t done = ::write(descriptor, bytes.data(), bytes.size());
        if (done > 0) {
            bytes = bytes.subspan(static_cast<size_t>(done));
        } else if (done == 0 || errno != EINTR) {
            fail("cannot write " + path);
        }
    }
}

std::string folder_of(const std::string& path)
{
    const size_t slash = path.rfind('/');
    if (slash == std::string::npos) {
        return ".";
    }
    return slash == 0 ? "/" : path.substr(0, slash);
}

/// Makes a renamed entry last. Where the system cannot do that for folders, the derived file may be
/// missing after a power cut, which costs time only.
void sync_folder(const std::string& path)
{
    const Descriptor folder(::open(folder_of(path).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (folder.number >= 0) {
        static_cast<void>(::fsync(folder.number));
    }
}

} // namespace

MappedFile::MappedFile(const std::string& path)
{
    const Descriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
    if (file.number < 0) {
        fail(path);
    }
    const size_t length = length_of(file.number, path);
    if (length == 0) {
        return;
    }
    void* start = ::mmap(nullptr, length, PROT_READ, MAP_SHARED, file.number, 0);
    if (start == MAP_FAILED) {
        fail(path);
    }
    bytes_ = {static_cast<const std::byte*>(start), length};
}

MappedFile::MappedFile(MappedFile&& other) noexcept : bytes_(std::exchange(other.bytes_, {})) {}

MappedFile& MappedFile::operator=(MappedFile&& other) noexcept
{
    std::swap(bytes_, other.bytes_);
    return *this;
}

MappedFile::~MappedFile()
{
    if (!bytes_.empty()) {
        // The mapping is the owner's own: what munmap takes is writable by its type only.
        ::munmap(const_cast<std::byte*>(bytes_.data()), bytes_.size()); // NOLINT
    }
}

FileReplacement::FileReplacement(std::string path)
    : path_(std::move(path)), temporary_(path_ + ".new")
{
    constexpr mode_t kMode = 0666; // less what the process masks
    descriptor_ =
        ::open(temporary_.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK, kMode);
    if (descriptor_ < 0) {
        fail("cannot write " + temporary_);
    }
    if (!take()) {
        ::close(descriptor_);
        descriptor_ = -1;
    }
}

FileReplacement::~FileReplacement()
{
    if (is_ours()) {
        ::unlink(temporary_.c_str());
        ::close(descriptor_);
    }
}

/// Locks the temporary file and empties it. The lock goes with the process that holds it, however
/// that ends. Between opening and locking the file may have been put in its place by another
/// process; it must not be emptied then.
bool FileReplacement::take()
{
    if (::flock(descriptor_, LOCK_EX | LOCK_NB) != 0 || !same_file(descriptor_, temporary_)) {
        return false;
    }
    if (::ftruncate(descriptor_, 0) != 0) {
        const int error = errno;
        ::close(std::exchange(descriptor_, -1));
        errno = error;
        fail("cannot write " + temporary_);
    }
    return true;
}

void FileReplacement::write(std::span<const std::byte> bytes)
{
    write_all(descriptor_, bytes, temporary_);
}

void FileReplacement::write_start(std::span<const std::byte> bytes)
{
    if (::lseek(descriptor_, 0, SEEK_SET) != 0) {
        fail("cannot write " + temporary_);
    }
    write(bytes);
}

void FileReplacement::commit()
{
    if (::fsync(descriptor_) != 0) {
        fail("cannot write " + temporary_);
    }
    if (::rename(temporary_.c_str(), path_.c_str()) != 0) {
        fail("cannot write " + path_);
    }
    sync_folder(path_);
    ::close(std::exchange(descriptor_, -1));
}

} // namespace kzcat
