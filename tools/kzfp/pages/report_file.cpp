#include "kzfp/pages/report_file.hpp"

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <system_error>
#include <utility>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace kzfp {

namespace {

namespace fs = std::filesystem;

OutputError failure(const std::string& path, int error)
{
    return OutputError("the report " + path + " cannot be written (" + std::strerror(error) + ")");
}

/// The absolute path without links, as far as there is something.
fs::path real_path(const std::string& path)
{
    std::error_code error;
    const fs::path real = fs::weakly_canonical(fs::absolute(path, error), error);
    return error ? fs::path(path) : real;
}

/// The file that a report is, or would be, under whatever name.
bool is_same(const std::string& path, const std::string& other)
{
    std::error_code error;
    return fs::equivalent(path, other, error) || real_path(path) == real_path(other);
}

void check_apart(const std::string& path, std::span<const std::string> others)
{
    if (path == "-") {
        throw OutputError("a report is a file and cannot go to standard output; --report needs a "
                          "name, such as report.html");
    }
    std::error_code error;
    const bool special = fs::exists(path, error) && !fs::is_regular_file(path, error);
    for (const std::string& other : others) {
        if (!special && !other.empty() && other != "-" && is_same(path, other)) {
            throw OutputError(path + " is used by the command already; --report needs another "
                                     "file");
        }
    }
}

/// Whether everything was written; if not, errno says why.
bool write_all(int file, const std::string& text)
{
    size_t done = 0;
    while (done < text.size()) {
        const ssize_t count = ::write(file, text.data() + done, text.size() - done);
        if (count >= 0) {
            done += static_cast<size_t>(count);
        } else if (errno != EINTR) {
            return false;
        }
    }
    return true;
}

} // namespace

ReportFile::ReportFile(const std::string& path, std::span<const std::string> others)
{
    if (path.empty()) {
        return;
    }
    check_apart(path, others);
    check_is_replaceable(path, "--report");
    path_ = real_path(path).string();
    struct stat facts = {};
    const bool there = ::stat(path_.c_str(), &facts) == 0;
    if (!there || S_ISREG(facts.st_mode)) {
        temporary_ = path_ + ".part-" + std::to_string(::getpid());
    }
    const std::string& name = temporary_.empty() ? path_ : temporary_;
    file_ = ::open(name.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0666);
    if (file_ < 0) {
        throw failure(path, errno);
    }
    if (there && !temporary_.empty()) {
        static_cast<void>(::fchmod(file_, facts.st_mode & 07777));
    }
}

ReportFile::~ReportFile()
{
    if (file_ >= 0) {
        ::close(file_);
        if (!temporary_.empty()) {
            static_cast<void>(::unlink(temporary_.c_str()));
        }
    }
}

void ReportFile::finish(const std::string& html)
{
    const bool written = write_all(file_, html);
    int error = errno;
    // Some file systems report a full disk only when the file is closed.
    bool done = ::close(std::exchange(file_, -1)) == 0 && written;
    error = written && !done ? errno : error;
    if (done && !temporary_.empty()) {
        done = ::rename(temporary_.c_str(), path_.c_str()) == 0;
        error = done ? error : errno;
    }
    if (!done) {
        if (!temporary_.empty()) {
            static_cast<void>(::unlink(temporary_.c_str()));
        }
        throw failure(path_, error);
    }
}

} // namespace kzfp
