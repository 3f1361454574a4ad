/// @file
/// Real PostgreSQL servers for tests, each in a scratch folder of its own.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include <sys/types.h>

namespace kz::test {

/// Why no server can be started here, or nothing. A test that needs one begins with
/// `if (!postgres_obstacle().empty()) { GTEST_SKIP() << postgres_obstacle(); }`.
const std::string& postgres_obstacle();

struct PostgresSetup {
    /// Also listens on 127.0.0.1, at a port that was free.
    bool tcp = false;
    /// What connections to 127.0.0.1 must give; without it they need no password. Connections
    /// through the Unix socket never need one.
    std::string password;
    /// Further lines of postgresql.conf.
    std::vector<std::string> settings;
};

/// A PostgreSQL 15 on a Unix socket, started and ready. Stopped and removed with the object, and
/// also when the test program dies. Runs as the user "postgres" when the test runs as root. Writes
/// outlive the death of the server's processes, but not that of the machine (fsync is off).
/// Failures throw std::runtime_error with what the server wrote.
class PostgresServer {
public:
    explicit PostgresServer(const PostgresSetup& setup = {});
    ~PostgresServer();
    PostgresServer(const PostgresServer&) = delete;
    PostgresServer& operator=(const PostgresServer&) = delete;

    /// A hot standby that receives everything `primary` writes, as it is written.
    static std::unique_ptr<PostgresServer> standby_of(const PostgresServer& primary,
                                                      const PostgresSetup& setup = {});

    /// The address of a database, through the Unix socket, as the superuser.
    std::string url(const std::string& database = "postgres") const;
    /// The address through 127.0.0.1, for a server with `tcp`. `user_info` is "user" or
    /// "user:password".
    std::string tcp_url(const std::string& database = "postgres",
                        const std::string& user_info = "postgres") const;
    /// The folder of the Unix socket: the "host" of a foreign server.
    const std::string& host() const { return folder_; }
    /// The port, which the name of the Unix socket holds too.
    int port() const { return port_; }

    /// Makes an empty database of a new name, and gives its address.
    std::string new_database();

    /// Runs statements with psql and gives what they print: a line a row, columns between "|".
    std::string sql(const std::string& statements, const std::string& database = "postgres") const;

    /// Kills the server and all its processes with SIGKILL.
    void kill9();
    /// Stops it in an orderly way, which ends open connections. Nothing when it is not running.
    void stop();
    /// Starts it on the data that it had; returns when it answers.
    void start();
    void restart();
    /// Makes a standby a primary.
    void promote();
    bool is_running();

    /// What the server wrote to its log.
    std::string log() const;

private:
    struct Unstarted {};
    PostgresServer(Unstarted, const PostgresSetup& setup);
    void configure(const PostgresSetup& setup) const;
    void await_ready();
    std::string data() const { return folder_ + "/data"; }

    std::string folder_;
    int port_;
    bool tcp_;
    pid_t postmaster_ = -1;
    int databases_ = 0;
};

} // namespace kz::test
