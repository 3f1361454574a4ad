// Results are not buffered: each is written, or known to have failed, before the next file is
// begun.

#include "kzfp/output/write.hpp"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <system_error>
#include <utility>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace kzfp {

namespace {

constexpr std::string_view kTrailFile = "\x89KZT"; ///< such a file is a result, of an export

struct Destination {
    int file = STDOUT_FILENO;
    std::string name = "standard output";
    bool to_be_emptied = false; ///< has what it had before, until there is a result
};

Destination& destination()
{
    static Destination only;
    return only;
}

/// What is no regular file, such as a pipe, cannot be emptied and need not.
void empty_once(Destination& to)
{
    if (std::exchange(to.to_be_emptied, false)) {
        static_cast<void>(!::ftruncate(to.file, 0));
    }
}

OutputError failure(const std::string& name, int error)
{
    return OutputError(name + " cannot be written (" + std::strerror(error) + ")", error == EPIPE);
}

/// What a path leads to; the path itself while nothing is there.
std::string without_links(const std::string& path)
{
    std::error_code error;
    const std::filesystem::path real = std::filesystem::canonical(path, error);
    return error ? path : real.string();
}

void check_apart(const std::string& path, std::span<const std::string> inputs)
{
    for (const std::string& input : inputs) {
        std::error_code error;
        if (input != "-" && std::filesystem::equivalent(path, input, error) && !error &&
            std::filesystem::is_regular_file(path, error)) {
            throw OutputError(path + " is also read; --output needs another file");
        }
    }
}

/// Results never replace sound, a catalogue or a file beside one, whatever else is wrong with the
/// command: all of these have zero bytes near their start, and results have none.
bool is_text(const std::string& path)
{
    std::ifstream file(path, std::ios::binary);
    std::string bytes(65536, '.');
    file.read(bytes.data(), static_cast<std::streamsize>(bytes.size()));
    bytes.resize(static_cast<size_t>(file.gcount()));
    return bytes.find('\0') == std::string::npos || bytes.starts_with(kTrailFile);
}

/// The permissions of the file that is replaced; for a new file, the usual ones.
void take_permissions(int file, const std::string& path)
{
    struct stat facts = {};
    if (::stat(path.c_str(), &facts) == 0) {
        static_cast<void>(::fchmod(file, facts.st_mode & 07777));
    }
}

} // namespace

void check_is_replaceable(const std::string& path, const std::string& option)
{
    std::error_code error;
    if (std::filesystem::is_regular_file(path, error) && !is_text(path)) {
        throw OutputError(path + " holds something else than results, which would be lost; " +
                          option + " needs another file");
    }
}

OutputFile::OutputFile(const std::string& path, std::span<const std::string> inputs, Mode mode)
    : path_(path == "-" ? "" : without_links(path))
{
    if (path_.empty()) {
        return;
    }
    check_apart(path_, inputs);
    check_is_replaceable(path_, "--output");
    open(mode);
    destination() = {.file = file_, .name = path_, .to_be_emptied = temporary_.empty()};
}

void OutputFile::open(Mode mode)
{
    struct stat facts = {};
    const bool replaced = ::stat(path_.c_str(), &facts) != 0 || S_ISREG(facts.st_mode);
    if (mode == Mode::whole && replaced) {
        temporary_ = path_ + ".part-" + std::to_string(::getpid());
    }
    const std::string& name = temporary_.empty() ? path_ : temporary_;
    const int emptied = temporary_.empty() ? 0 : O_TRUNC;
    file_ = ::open(name.c_str(), O_WRONLY | O_CREAT | emptied | O_CLOEXEC, 0666);
    if (file_ < 0) {
        throw failure(path_, errno);
    }
    if (!temporary_.empty()) {
        take_permissions(file_, path_);
    }
}

OutputFile::~OutputFile()
{
    if (file_ >= 0) {
        destination() = {};
        ::close(file_);
        remove_temporary();
    }
}

void OutputFile::remove_temporary() const
{
    if (!temporary_.empty()) {
        static_cast<void>(::unlink(temporary_.c_str()));
    }
}

void OutputFile::finish()
{
    if (file_ < 0) {
        return;
    }
    empty_once(destination());
    destination() = {};
    // Some file systems report a full disk only when the file is closed.
    const bool closed = ::close(std::exchange(file_, -1)) == 0;
    const bool there =
        closed && (temporary_.empty() || ::rename(temporary_.c_str(), path_.c_str()) == 0);
    if (!there) {
        const OutputError error = failure(path_, errno);
        remove_temporary();
        throw error;
    }
}

std::string without_control_characters(std::string text)
{
    std::ranges::replace_if(
        text, [](char c) { return static_cast<unsigned char>(c) < 0x20 || c == 0x7f; }, '?');
    return text;
}

int output_descriptor() { return destination().file; }

void write_output(const std::string& text)
{
    Destination& to = destination();
    empty_once(to);
    size_t done = 0;
    while (done < text.size()) {
        const ssize_t count = ::write(to.file, text.data() + done, text.size() - done);
        if (count < 0 && errno == EINTR) {
            continue;
        }
        if (count < 0) {
            throw failure(to.name, errno);
        }
        done += static_cast<size_t>(count);
    }
}

void write_to_standard_error(std::string_view text)
{
    while (!text.empty()) {
        const ssize_t count = ::write(STDERR_FILENO, text.data(), text.size());
        if (count < 0 && errno == EINTR) {
            continue;
        }
        if (count <= 0) {
            return; // there is no place left to complain at
        }
        text.remove_prefix(static_cast<size_t>(count));
    }
}

void write_message(const std::string& line)
{
    write_to_standard_error(without_control_characters(line) + '\n');
}

} // namespace kzfp
