/// @file
/// A file mapped read-only, and a file that takes another's place in one step.
#pragma once

#include <cstddef>
#include <span>
#include <string>

namespace kzcat {

/// A whole file in memory, for reading. The file may be replaced or deleted meanwhile, but must not
/// be cut: as with any mapped file, reading beyond its new end ends the program.
class MappedFile {
public:
    MappedFile() = default;
    /// Throws std::system_error when the file cannot be opened, is not a regular file or does not
    /// fit into the address space.
    explicit MappedFile(const std::string& path);
    MappedFile(MappedFile&& other) noexcept;
    MappedFile& operator=(MappedFile&& other) noexcept;
    ~MappedFile();

    std::span<const std::byte> bytes() const { return bytes_; }

private:
    std::span<const std::byte> bytes_;
};

/// Writes the file that will stand at a path, beside it as `PATH.new`, and puts it there in one
/// step: whoever opens the path finds the earlier file or the whole new one. What a killed process
/// left behind is used again by the next. Throws std::system_error; the earlier file then stays.
class FileReplacement {
public:
    explicit FileReplacement(std::string path);
    FileReplacement(const FileReplacement&) = delete;
    FileReplacement& operator=(const FileReplacement&) = delete;
    ~FileReplacement(); ///< deletes what was written unless commit() has returned

    /// False: another process is writing the same file just now, and nothing can be written here.
    bool is_ours() const { return descriptor_ >= 0; }

    /// Where it lies until commit().
    const std::string& temporary() const { return temporary_; }

    /// Appends to what was written before.
    void write(std::span<const std::byte> bytes);

    /// Overwrites the beginning.
    void write_start(std::span<const std::byte> bytes);

    void commit();

private:
    bool take();

    std::string path_;
    std::string temporary_;
    int descriptor_ = -1;
};

} // namespace kzcat
