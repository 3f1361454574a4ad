// A cluster is made once per build and user, and copied for each server, which takes a tenth of the
// time. Servers run as children of the test, so that no killed one lingers as a zombie whose id a
// restart would take for a running server. A guard, a shell that waits for the end of its input,
// removes everything when the test program ends in whatever way.

#include "support/postgres.hpp"

#include <array>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <system_error>
#include <thread>

#include <arpa/inet.h>
#include <fcntl.h>
#include <netinet/in.h>
#include <pwd.h>
#include <spawn.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include "support/process.hpp"

extern char** environ;

namespace kz::test {

namespace {

namespace fs = std::filesystem;
using Words = std::vector<std::string>;

constexpr auto kLongest = std::chrono::seconds(60); ///< that a server may take to start

/// $KZ_POSTGRES_BIN, or where Debian puts it.
std::string program(const std::string& name)
{
    const char* const folder = std::getenv("KZ_POSTGRES_BIN");
    return (folder == nullptr ? "/usr/lib/postgresql/15/bin" : std::string(folder)) + '/' + name;
}

/// PostgreSQL refuses to run as root.
const passwd* other_user()
{
    static const passwd* const user = ::geteuid() == 0 ? ::getpwnam("postgres") : nullptr;
    return user;
}

Words as_other_user(const Words& words)
{
    const passwd* const user = other_user();
    if (user == nullptr) {
        return words;
    }
    Words all = {"/usr/bin/setpriv", "--reuid=" + std::to_string(user->pw_uid),
                 "--regid=" + std::to_string(user->pw_gid), "--clear-groups", "--"};
    all.insert(all.end(), words.begin(), words.end());
    return all;
}

void run_well(const Words& words)
{
    const ProcessResult result = run(words);
    if (result.status != 0) {
        throw std::runtime_error(words.front() + ": " + result.out + result.err);
    }
}

std::string text_of(const std::string& file)
{
    std::ifstream stream(file, std::ios::binary);
    std::ostringstream text;
    text << stream.rdbuf();
    return text.str();
}

void give_to_other_user(const std::string& path)
{
    if (const passwd* const user = other_user()) {
        if (::chown(path.c_str(), user->pw_uid, user->pw_gid) != 0) {
            throw std::system_error(errno, std::generic_category(), path);
        }
    }
}

std::string make_folder(const std::string& path)
{
    fs::create_directory(path);
    fs::permissions(path, fs::perms::owner_all);
    give_to_other_user(path);
    return path;
}

/// Starts a program with the given standard input, writing to `output`.
pid_t spawn(const Words& words, int input, const std::string& output)
{
    posix_spawn_file_actions_t actions = {};
    ::posix_spawn_file_actions_init(&actions);
    ::posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, output.c_str(),
                                       O_WRONLY | O_CREAT | O_APPEND, 0644);
    ::posix_spawn_file_actions_adddup2(&actions, STDOUT_FILENO, STDERR_FILENO);
    if (input >= 0) {
        ::posix_spawn_file_actions_adddup2(&actions, input, STDIN_FILENO);
    } else {
        ::posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
    }
    // A group of its own: an interrupt from the terminal is for the test, which then clears up.
    posix_spawnattr_t attributes = {};
    ::posix_spawnattr_init(&attributes);
    ::posix_spawnattr_setpgroup(&attributes, 0);
    ::posix_spawnattr_setflags(&attributes, POSIX_SPAWN_SETPGROUP);
    Words copies = words;
    std::vector<char*> pointers;
    for (std::string& word : copies) {
        pointers.push_back(word.data());
    }
    pointers.push_back(nullptr);
    pid_t child = -1;
    const int error =
        ::posix_spawn(&child, pointers.front(), &actions, &attributes, pointers.data(), environ);
    ::posix_spawnattr_destroy(&attributes);
    ::posix_spawn_file_actions_destroy(&actions);
    if (error != 0) {
        throw std::system_error(error, std::generic_category(), words.front());
    }
    return child;
}

/// The folder of all servers of this program, and the guard that clears it.
class Scratch {
public:
    Scratch() : folder_(fs::temp_directory_path() / "kz-postgres-XXXXXX")
    {
        std::array<int, 2> ends = {-1, -1};
        if (::mkdtemp(folder_.data()) == nullptr || ::pipe2(ends.data(), O_CLOEXEC) != 0) {
            throw std::system_error(errno, std::generic_category(), folder_);
        }
        give_to_other_user(folder_);
        lifeline_ = ends[1];
        guard_ = spawn({"/bin/sh", "-c", kGuard, "guard", folder_}, ends[0], "/dev/null");
        ::close(ends[0]);
    }
    ~Scratch()
    {
        ::close(lifeline_);
        ::waitpid(guard_, nullptr, 0);
    }
    Scratch(const Scratch&) = delete;
    Scratch& operator=(const Scratch&) = delete;

    std::string next() { return make_folder(folder_ + '/' + std::to_string(++count_)); }
    const std::string& folder() const { return folder_; }

private:
    /// A process is known by the folder that it runs in, since its id may be another's by now.
    /// SIGQUIT ends a server and all its processes at once.
    static constexpr const char* kGuard = R"sh(
cat >/dev/null
for file in "$1"/*/data/postmaster.pid; do
    [ -f "$file" ] || continue
    id=$(head -n 1 "$file")
    [ "$(readlink "/proc/$id/cwd")" = "$(dirname "$file")" ] || continue
    kill -QUIT "$id"
    for _ in 1 2 3 4 5 6 7 8 9 10 11 12 13 14 15 16 17 18 19 20; do
        [ -e "$file" ] || break
        sleep 0.1
    done
done
rm -rf "$1"
)sh";

    std::string folder_;
    int lifeline_ = -1;
    pid_t guard_ = -1;
    int count_ = 0;
};

Scratch& scratch()
{
    static Scratch only;
    return only;
}

/// Holds a lock for as long as the object lives, so that only one of several programs does a thing.
class FileLock {
public:
    explicit FileLock(const std::string& path)
        : file_(::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0644))
    {
        if (file_ < 0 || ::flock(file_, LOCK_EX) != 0) {
            throw std::system_error(errno, std::generic_category(), path);
        }
    }
    ~FileLock() { ::close(file_); }
    FileLock(const FileLock&) = delete;
    FileLock& operator=(const FileLock&) = delete;

private:
    int file_;
};

void copy_folder(const std::string& from, const std::string& to)
{
    run_well({"/bin/cp", "-a", "--reflink=auto", from, to});
}

void make_cluster(const std::string& folder)
{
    run_well(as_other_user({program("initdb"), "-D", folder, "-U", "postgres", "-A", "trust", "-E",
                            "UTF8", "--locale=C.UTF-8", "--wal-segsize=1", "--no-sync",
                            "--no-instructions"}));
}

/// The cluster that all are copies of. The user who builds and the server's may differ, so it is
/// made in the scratch folder and then put into that of the build.
std::string template_cluster()
{
    fs::create_directories(KZ_POSTGRES_TEMPLATES);
    const std::string place =
        std::string(KZ_POSTGRES_TEMPLATES) + "/cluster-15-" + std::to_string(::geteuid());
    const FileLock lock(place + ".lock");
    if (!fs::exists(place)) {
        const std::string made = scratch().folder() + "/template";
        const std::string half = place + ".half";
        make_cluster(made);
        fs::remove_all(half);
        copy_folder(made, half);
        fs::rename(half, place);
        fs::remove_all(made);
    }
    return place;
}

/// A port that nothing listens on. It may be taken before the server does, which then does not
/// start: that is not worth more than a failed test.
int free_port()
{
    const int socket = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in address = {};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t size = sizeof address;
    auto* const any = reinterpret_cast<sockaddr*>(&address);
    if (socket < 0 || ::bind(socket, any, size) != 0 || ::getsockname(socket, any, &size) != 0) {
        throw std::system_error(errno, std::generic_category(), "no free port");
    }
    ::close(socket);
    return ntohs(address.sin_port);
}

/// All processes whose parent is `id`.
std::vector<pid_t> children_of(pid_t id)
{
    std::istringstream list(
        text_of("/proc/" + std::to_string(id) + "/task/" + std::to_string(id) + "/children"));
    std::vector<pid_t> children;
    for (pid_t child = 0; list >> child;) {
        children.push_back(child);
    }
    return children;
}

/// A process that has ended may stay in the table until its new parent looks.
bool is_alive(pid_t id)
{
    const std::string state = text_of("/proc/" + std::to_string(id) + "/stat");
    const size_t name_end = state.rfind(") ");
    return name_end != std::string::npos && state.at(name_end + 2) != 'Z';
}

void short_pause() { std::this_thread::sleep_for(std::chrono::milliseconds(10)); }

std::string find_obstacle()
{
    for (const char* const name : {"initdb", "postgres", "psql", "pg_basebackup"}) {
        if (::access(program(name).c_str(), X_OK) != 0) {
            return "no PostgreSQL server here: " + program(name) +
                   " is missing (Debian: postgresql-15; KZ_POSTGRES_BIN names another folder)";
        }
    }
    if (::geteuid() == 0 && other_user() == nullptr) {
        return "no PostgreSQL server here: it does not run as root, and there is no user postgres";
    }
    return {};
}

} // namespace

const std::string& postgres_obstacle()
{
    static const std::string obstacle = find_obstacle();
    return obstacle;
}

PostgresServer::PostgresServer(Unstarted /*unused*/, const PostgresSetup& setup)
    : folder_(scratch().next()), port_(setup.tcp ? free_port() : 5432), tcp_(setup.tcp)
{
}

PostgresServer::PostgresServer(const PostgresSetup& setup) : PostgresServer(Unstarted(), setup)
{
    copy_folder(template_cluster(), data());
    configure(setup);
    start();
    if (!setup.password.empty()) {
        sql("ALTER ROLE postgres PASSWORD '" + setup.password + "'");
    }
}

PostgresServer::~PostgresServer()
{
    if (is_running()) {
        ::kill(postmaster_, SIGQUIT);
        ::waitpid(postmaster_, nullptr, 0);
    }
    std::error_code ignored;
    fs::remove_all(folder_, ignored);
}

std::unique_ptr<PostgresServer> PostgresServer::standby_of(const PostgresServer& primary,
                                                           const PostgresSetup& setup)
{
    std::unique_ptr<PostgresServer> standby(new PostgresServer(Unstarted(), setup));
    run_well(as_other_user({program("pg_basebackup"), "-d", primary.url(), "-D", standby->data(),
                            "-R", "-X", "stream", "--checkpoint=fast", "--no-sync"}));
    standby->configure(setup);
    standby->start();
    return standby;
}

/// The last line of a name counts, so that those of a copied primary do no harm.
void PostgresServer::configure(const PostgresSetup& setup) const
{
    std::ofstream settings(data() + "/postgresql.conf", std::ios::app);
    settings << "listen_addresses = '" << (tcp_ ? "127.0.0.1" : "") << "'\n"
             << "port = " << port_ << "\nunix_socket_directories = '" << folder_ << "'\n"
             << "fsync = off\nfull_page_writes = off\nautovacuum = off\njit = off\n"
                "shared_buffers = 16MB\nmin_wal_size = 2MB\nmax_connections = 60\n"
                "huge_pages = off\nlogging_collector = off\nlog_destination = stderr\n";
    for (const std::string& line : setup.settings) {
        settings << line << '\n';
    }
    const std::string method = setup.password.empty() ? "trust" : "scram-sha-256";
    std::ofstream(data() + "/pg_hba.conf")
        << "local all,replication all trust\n"
        << "host all all 127.0.0.1/32 " << method << "\nhost replication all 127.0.0.1/32 "
        << method << '\n';
}

void PostgresServer::start()
{
    if (is_running()) {
        return;
    }
    postmaster_ = spawn(as_other_user({program("postgres"), "-D", data()}), -1, folder_ + "/log");
    await_ready();
}

/// The last line of postmaster.pid says when a server takes connections.
void PostgresServer::await_ready()
{
    const auto end = std::chrono::steady_clock::now() + kLongest;
    while (is_running() && std::chrono::steady_clock::now() < end) {
        const std::string state = text_of(data() + "/postmaster.pid");
        const bool own = state.starts_with(std::to_string(postmaster_) + '\n');
        if (own && (state.find("\nready") != std::string::npos ||
                    state.find("\nstandby") != std::string::npos)) {
            return;
        }
        short_pause();
    }
    throw std::runtime_error("the PostgreSQL server does not start:\n" + log());
}

bool PostgresServer::is_running()
{
    if (postmaster_ > 0 && ::waitpid(postmaster_, nullptr, WNOHANG) != 0) {
        postmaster_ = -1;
    }
    return postmaster_ > 0;
}

/// Stopped first, so that none of its processes can end in an orderly way, and none begins.
void PostgresServer::kill9()
{
    if (!is_running()) {
        return;
    }
    ::kill(postmaster_, SIGSTOP);
    const std::vector<pid_t> processes = children_of(postmaster_);
    for (const pid_t process : processes) {
        ::kill(process, SIGKILL);
    }
    ::kill(postmaster_, SIGKILL);
    ::waitpid(postmaster_, nullptr, 0);
    postmaster_ = -1;
    for (const pid_t process : processes) {
        while (is_alive(process)) {
            short_pause();
        }
    }
}

void PostgresServer::stop()
{
    if (is_running()) {
        ::kill(postmaster_, SIGINT);
        ::waitpid(postmaster_, nullptr, 0);
        postmaster_ = -1;
    }
}

void PostgresServer::restart()
{
    stop();
    start();
}

void PostgresServer::promote() { sql("SELECT pg_promote()"); }

std::string PostgresServer::url(const std::string& database) const
{
    return "postgresql://postgres@/" + database + "?host=" + folder_ +
           "&port=" + std::to_string(port_);
}

std::string PostgresServer::tcp_url(const std::string& database, const std::string& user_info) const
{
    if (!tcp_) {
        throw std::logic_error("this server does not listen on 127.0.0.1: PostgresSetup::tcp");
    }
    return "postgresql://" + user_info + "@127.0.0.1:" + std::to_string(port_) + '/' + database;
}

std::string PostgresServer::new_database()
{
    const std::string name = "test_" + std::to_string(++databases_);
    sql("CREATE DATABASE " + name);
    return url(name);
}

std::string PostgresServer::sql(const std::string& statements, const std::string& database) const
{
    const ProcessResult result = run(
        {program("psql"), "-XAtq", "-v", "ON_ERROR_STOP=1", "-d", url(database), "-c", statements});
    if (result.status != 0) {
        throw std::runtime_error(result.err);
    }
    return result.out;
}

std::string PostgresServer::log() const { return text_of(folder_ + "/log"); }

} // namespace kz::test
