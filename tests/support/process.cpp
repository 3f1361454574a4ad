#include "support/process.hpp"

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <system_error>

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

extern char** environ;

namespace kz::test {

namespace {

void check(bool good, const char* what)
{
    if (!good) {
        throw std::system_error(errno, std::generic_category(), what);
    }
}

class Pipe {
public:
    Pipe() { check(::pipe2(ends_.data(), O_CLOEXEC) == 0, "pipe"); }
    ~Pipe()
    {
        close_reader();
        close_writer();
    }
    Pipe(const Pipe&) = delete;
    Pipe& operator=(const Pipe&) = delete;
    int reader() const { return ends_[0]; }
    int writer() const { return ends_[1]; }
    void close_reader() { close(ends_[0]); }
    void close_writer() { close(ends_[1]); }

private:
    static void close(int& end)
    {
        if (end >= 0) {
            ::close(end);
        }
        end = -1;
    }
    std::array<int, 2> ends_ = {-1, -1};
};

class Actions {
public:
    Actions() { ::posix_spawn_file_actions_init(&actions_); }
    ~Actions() { ::posix_spawn_file_actions_destroy(&actions_); }
    Actions(const Actions&) = delete;
    Actions& operator=(const Actions&) = delete;
    void connect(int from, int to) { ::posix_spawn_file_actions_adddup2(&actions_, from, to); }
    void open(int number, const std::string& path, int flags)
    {
        ::posix_spawn_file_actions_addopen(&actions_, number, path.c_str(), flags, 0644);
    }
    const posix_spawn_file_actions_t* get() const { return &actions_; }

private:
    posix_spawn_file_actions_t actions_ = {};
};

std::vector<char*> pointers(std::vector<std::string>& words)
{
    std::vector<char*> all;
    for (std::string& word : words) {
        all.push_back(word.data());
    }
    all.push_back(nullptr);
    return all;
}

std::vector<std::string> environment_with(const std::vector<std::string>& additions)
{
    std::vector<std::string> all = additions; // the first of a name counts
    for (char** entry = environ; *entry != nullptr; ++entry) {
        all.emplace_back(*entry);
    }
    return all;
}

/// Serves the three pipes of a running program until it has closed its outputs.
class Conversation {
public:
    Conversation(Pipe& in, Pipe& out, Pipe& err, const ProcessSetup& setup, ProcessResult& result)
        : in_(in), out_(out), err_(err), setup_(setup), result_(result)
    {
        ::fcntl(in_.writer(), F_SETFL, O_NONBLOCK);
    }

    void hold()
    {
        refill();
        while (out_.reader() >= 0 || err_.reader() >= 0) {
            std::array<pollfd, 3> ends = {{{in_.writer(), POLLOUT, 0},
                                           {out_.reader(), POLLIN, 0},
                                           {err_.reader(), POLLIN, 0}}}; // negative: passed over
            check(::poll(ends.data(), ends.size(), -1) >= 0 || errno == EINTR, "poll");
            if (ends[0].revents != 0) {
                feed();
            }
            if (ends[1].revents != 0) {
                drain(out_, result_.out);
                if (result_.out.size() >= setup_.close_output_after) {
                    out_.close_reader();
                }
            }
            if (ends[2].revents != 0) {
                drain(err_, result_.err);
            }
        }
    }

private:
    void refill()
    {
        piece_ = setup_.input ? setup_.input() : std::string_view();
        if (piece_.empty()) {
            in_.close_writer();
        }
    }

    void feed()
    {
        const ssize_t count = ::write(in_.writer(), piece_.data(), piece_.size());
        if (count < 0) {
            if (errno != EAGAIN) {
                in_.close_writer();
            }
            return;
        }
        result_.bytes_fed += static_cast<uint64_t>(count);
        piece_.remove_prefix(static_cast<size_t>(count));
        if (piece_.empty()) {
            refill();
        }
    }

    static void drain(Pipe& pipe, std::string& text)
    {
        std::array<char, 65536> buffer;
        const ssize_t count = ::read(pipe.reader(), buffer.data(), buffer.size());
        if (count > 0) {
            text.append(buffer.data(), static_cast<size_t>(count));
        } else {
            pipe.close_reader();
        }
    }

    Pipe& in_;
    Pipe& out_;
    Pipe& err_;
    const ProcessSetup& setup_;
    ProcessResult& result_;
    std::string_view piece_;
};

void wait_for(pid_t child, ProcessResult& result)
{
    int state = 0;
    rusage usage = {};
    while (::wait4(child, &state, 0, &usage) < 0) {
        check(errno == EINTR, "wait4");
    }
    result.status = WIFEXITED(state) ? WEXITSTATUS(state) : 128 + WTERMSIG(state);
    result.peak_kibibytes = static_cast<uint64_t>(usage.ru_maxrss);
}

} // namespace

ProcessResult run(const std::vector<std::string>& arguments, const ProcessSetup& setup)
{
    std::signal(SIGPIPE, SIG_IGN); // a program may stop reading; spawn() gives it the default again
    Pipe in;
    Pipe out;
    Pipe err;
    Actions actions;
    if (setup.input_file.empty()) {
        actions.connect(in.reader(), STDIN_FILENO);
    } else {
        actions.open(STDIN_FILENO, setup.input_file, O_RDONLY);
    }
    if (setup.output_file.empty()) {
        actions.connect(out.writer(), STDOUT_FILENO);
    } else {
        actions.open(STDOUT_FILENO, setup.output_file, O_WRONLY | O_CREAT);
    }
    actions.connect(err.writer(), STDERR_FILENO);

    posix_spawnattr_t attributes = {};
    ::posix_spawnattr_init(&attributes);
    sigset_t to_default;
    ::sigemptyset(&to_default);
    ::sigaddset(&to_default, SIGPIPE);
    ::posix_spawnattr_setsigdefault(&attributes, &to_default);
    ::posix_spawnattr_setflags(&attributes, POSIX_SPAWN_SETSIGDEF);

    std::vector<std::string> words = arguments;
    std::vector<std::string> environment = environment_with(setup.environment);
    pid_t child = -1;
    errno = ::posix_spawn(&child, words.front().c_str(), actions.get(), &attributes,
                          pointers(words).data(), pointers(environment).data());
    ::posix_spawnattr_destroy(&attributes);
    check(errno == 0, words.front().c_str());
    in.close_reader();
    out.close_writer();
    err.close_writer();

    ProcessResult result;
    Conversation(in, out, err, setup, result).hold();
    wait_for(child, result);
    return result;
}

} // namespace kz::test
