/// @file
/// Real files for tests.
#pragma once

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <system_error>

namespace kz::test {

/// A directory of its own for a test, removed at the end.
class ScratchDirectory {
public:
    ScratchDirectory() : directory_(std::filesystem::temp_directory_path() / "kz-test-XXXXXX")
    {
        if (::mkdtemp(directory_.data()) == nullptr) {
            throw std::system_error(errno, std::generic_category(), directory_);
        }
    }
    ~ScratchDirectory()
    {
        std::error_code ignored;
        std::filesystem::remove_all(directory_, ignored);
    }
    ScratchDirectory(const ScratchDirectory&) = delete;
    ScratchDirectory& operator=(const ScratchDirectory&) = delete;

    const std::string& path() const { return directory_; }
    std::string path(const std::string& name) const { return directory_ + "/" + name; }

    /// Writes a file, and the directories that lead to it, and gives its path.
    std::string write(const std::string& name, const std::string& bytes) const
    {
        std::string file = path(name);
        std::filesystem::create_directories(std::filesystem::path(file).parent_path());
        std::ofstream(file, std::ios::binary) << bytes;
        return file;
    }

private:
    std::string directory_;
};

} // namespace kz::test
