// Programs get a process group of their own: Ctrl-C reaches this one only, which finishes what is
// at hand.

#include "kzfp/evaluate/program.hpp"

#include <array>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <filesystem>

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include "audio/descriptor.hpp"

extern char** environ;

namespace kzfp::evaluate {

namespace {

using Clock = std::chrono::steady_clock;

constexpr auto kLongest = std::chrono::seconds(60);
constexpr size_t kMostText = size_t{1} << 20; ///< more of what is written is not kept

/// What is done between the start of the process and that of the program.
class Preparation {
public:
    explicit Preparation(int output)
    {
        ::posix_spawn_file_actions_init(&actions_);
        ::posix_spawn_file_actions_addopen(&actions_, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
        ::posix_spawn_file_actions_adddup2(&actions_, output, STDOUT_FILENO);
        ::posix_spawn_file_actions_adddup2(&actions_, output, STDERR_FILENO);
        sigset_t to_default;
        ::sigemptyset(&to_default);
        ::sigaddset(&to_default, SIGPIPE);
        ::sigaddset(&to_default, SIGXFSZ);
        ::posix_spawnattr_init(&attributes_);
        ::posix_spawnattr_setsigdefault(&attributes_, &to_default);
        ::posix_spawnattr_setpgroup(&attributes_, 0);
        ::posix_spawnattr_setflags(&attributes_, POSIX_SPAWN_SETSIGDEF | POSIX_SPAWN_SETPGROUP);
    }
    ~Preparation()
    {
        ::posix_spawnattr_destroy(&attributes_);
        ::posix_spawn_file_actions_destroy(&actions_);
    }
    Preparation(const Preparation&) = delete;
    Preparation& operator=(const Preparation&) = delete;
    const posix_spawn_file_actions_t* actions() const { return &actions_; }
    const posix_spawnattr_t* attributes() const { return &attributes_; }

private:
    posix_spawn_file_actions_t actions_ = {};
    posix_spawnattr_t attributes_ = {};
};

std::string name_of(const std::vector<std::string>& words)
{
    return std::filesystem::path(words.front()).filename().string();
}

ProgramError failure(const std::vector<std::string>& words, const std::string& why)
{
    return ProgramError(name_of(words) + " " + why);
}

pid_t start(const std::vector<std::string>& words, int output)
{
    std::vector<std::string> copies = words;
    std::vector<char*> pointers;
    for (std::string& word : copies) {
        pointers.push_back(word.data());
    }
    pointers.push_back(nullptr);
    const Preparation preparation(output);
    pid_t child = -1;
    const int error = ::posix_spawn(&child, copies.front().c_str(), preparation.actions(),
                                    preparation.attributes(), pointers.data(), environ);
    if (error != 0) {
        throw failure(words, std::string("cannot be started (") + std::strerror(error) + ")");
    }
    return child;
}

/// Reads until the program has closed its outputs; false when that takes too long.
bool read_until(Clock::time_point deadline, int pipe, std::string& text)
{
    std::array<char, 4096> block = {};
    for (;;) {
        const auto left =
            std::chrono::duration_cast<std::chrono::milliseconds>(deadline - Clock::now());
        pollfd end = {.fd = pipe, .events = POLLIN, .revents = 0};
        const int ready = left.count() > 0 ? ::poll(&end, 1, static_cast<int>(left.count())) : 0;
        if (ready < 0 && errno == EINTR) {
            continue;
        }
        const ssize_t count = ready > 0 ? ::read(pipe, block.data(), block.size()) : -1;
        if (count <= 0) {
            return count == 0;
        }
        if (text.size() < kMostText) {
            text.append(block.data(), static_cast<size_t>(count));
        }
    }
}

/// The program's status as waitpid() has it.
int status_of(pid_t child)
{
    int status = 0;
    while (::waitpid(child, &status, 0) < 0 && errno == EINTR) {
    }
    return status;
}

/// The last line that is not empty.
std::string last_line(const std::string& text)
{
    const size_t end = text.find_last_not_of(" \r\n");
    if (end == std::string::npos) {
        return {};
    }
    const size_t before = text.find_last_of("\r\n", end);
    const size_t begin = before == std::string::npos ? 0 : before + 1;
    return text.substr(begin, end + 1 - begin);
}

} // namespace

std::optional<std::string> find_program(const std::string& name)
{
    const char* const folders = std::getenv("PATH");
    std::string_view rest = folders != nullptr ? folders : "";
    while (!rest.empty()) {
        const size_t end = std::min(rest.find(':'), rest.size());
        const std::string path = std::string(rest.substr(0, end)) + "/" + name;
        std::error_code ignored;
        if (end > 0 && std::filesystem::is_regular_file(path, ignored) &&
            ::access(path.c_str(), X_OK) == 0) {
            return path;
        }
        rest.remove_prefix(std::min(end + 1, rest.size()));
    }
    return {};
}

std::string run_program(const std::vector<std::string>& words)
{
    std::array<int, 2> ends = {-1, -1};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0) {
        throw failure(words, std::string("cannot be started (") + std::strerror(errno) + ")");
    }
    const audio::Descriptor reader(ends[0], audio::Descriptor::owned);
    std::optional<audio::Descriptor> writer(std::in_place, ends[1], audio::Descriptor::owned);
    const pid_t child = start(words, writer->number());
    writer.reset();
    std::string text;
    const bool ended = read_until(Clock::now() + kLongest, reader.number(), text);
    if (!ended) {
        ::kill(-child, SIGKILL);
    }
    const int status = status_of(child);
    if (!ended) {
        throw failure(words, "was ended: it took longer than a minute");
    }
    if (status != 0) {
        throw failure(words, "failed: " + last_line(text));
    }
    return text;
}

} // namespace kzfp::evaluate
