#include "running.hpp"

#include <chrono>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <system_error>
#include <thread>
#include <utility>

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

namespace kz::test {

namespace {

constexpr uid_t kNobody = 65534;

constexpr int kFirstHandedOver = 3;

void set_environment(const RunningSetup& setup)
{
    for (const std::string& variable : setup.environment) {
        const size_t equals = variable.find('=');
        setenv(variable.substr(0, equals).c_str(), variable.c_str() + equals + 1, 1);
    }
    if (setup.handed_over >= 0) {
        if (setup.handed_over == kFirstHandedOver) {
            fcntl(kFirstHandedOver, F_SETFD, 0);
        }
        dup2(setup.handed_over, kFirstHandedOver);
        setenv("LISTEN_FDS", "1", 1);
        setenv("LISTEN_PID", std::to_string(getpid()).c_str(), 1);
    }
}

[[noreturn]] void start(std::vector<std::string> arguments, const std::string& out,
                        const std::string& err, const RunningSetup& setup)
{
    if (setup.input >= 0) {
        dup2(setup.input, STDIN_FILENO);
    }
    set_environment(setup);
    dup2(open(out.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0666), STDOUT_FILENO);
    dup2(open(err.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0666), STDERR_FILENO);
    if (setup.without_rights && geteuid() == 0 && setuid(kNobody) != 0) {
        _exit(99);
    }
    std::string program = KZFP_PROGRAM;
    std::vector<char*> words = {program.data()};
    for (std::string& argument : arguments) {
        words.push_back(argument.data());
    }
    words.push_back(nullptr);
    execv(program.c_str(), words.data());
    _exit(Running::kMayNotRun);
}

} // namespace

Running::Running(std::vector<std::string> arguments, const std::string& out, const std::string& err,
                 const RunningSetup& setup)
    : process_(fork())
{
    if (process_ == 0) {
        start(std::move(arguments), out, err, setup);
    }
}

Running::~Running()
{
    if (process_ > 0) {
        send(SIGKILL);
        wait();
    }
}

void Running::send(int signal) const { ::kill(process_, signal); }

bool Running::wait_until_open(const std::string& path) const
{
    namespace fs = std::filesystem;
    const std::string folder = "/proc/" + std::to_string(process_) + "/fd";
    for (int i = 0; i < 20'000; ++i) {
        std::error_code error;
        for (fs::directory_iterator it(folder, error); !error && it != fs::directory_iterator();
             it.increment(error)) {
            std::error_code gone;
            if (fs::read_symlink(it->path(), gone) == path) {
                return true;
            }
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    return false;
}

int Running::wait()
{
    int status = 0;
    EXPECT_EQ(process_, waitpid(process_, &status, 0));
    process_ = 0;
    return WIFSIGNALED(status) ? 128 + WTERMSIG(status) : WEXITSTATUS(status);
}

} // namespace kz::test
