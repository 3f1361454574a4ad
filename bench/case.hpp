/// @file
/// What a benchmark is: a piece of our work, the peers that do the same, and the goals.
#pragma once

#include <functional>
#include <stdexcept>
#include <string>
#include <vector>

namespace kz::bench {

/// Thrown when work does not yield what it must: nothing that goes wrong is timed.
struct Failure : std::runtime_error {
    using runtime_error::runtime_error;
};

inline void require(bool good, const std::string& what)
{
    if (!good) {
        throw Failure(what);
    }
}

/// Keeps the compiler from removing the work that produced what lies there.
inline void keep(const void* made) { asm volatile("" : : "r"(made) : "memory"); }

/// Another library that does the same work, or a yardstick such as memcpy.
struct Peer {
    std::string name;
    std::function<void()> run = {};    ///< empty where the library was not there at configuration
    std::function<void()> verify = {}; ///< throws unless a run does what it is here for
    double recorded_seconds = 0;       ///< in place of `run`: a figure from elsewhere
};

using Peers = std::vector<Peer>;

/// Our side of a case, made ready to run.
struct Prepared {
    std::function<void()> run;
    std::function<std::string()> digest; ///< of what the work yields from a fresh start
    std::function<Peers()> peers = [] { return Peers(); }; ///< makes them ready to run
    /// What `run` does besides the work of interest; its time is subtracted in every round.
    std::vector<std::function<void()>> beside = {};
};

/// The unit in which a case's times are given.
struct Unit {
    std::string name;
    double seconds; ///< of one run for each unit
};

inline Unit milliseconds() { return {"ms", 1e-3}; }
inline Unit microseconds() { return {"µs", 1e-6}; }
inline Unit nanoseconds_per(const std::string& what, double in_a_run)
{
    return {"ns per " + what, in_a_run * 1e-9};
}

/// The most that a case may take: a share of a peer's time, or, without a peer, an amount of its
/// unit. 0 where there is no limit.
struct Limit {
    std::string peer = {};
    double most = 0;
};

inline Limit share_of(const std::string& peer, double most) { return {peer, most}; }
inline Limit at_most(double units) { return {"", units}; }

struct Case {
    std::string name;
    std::string measures;
    Unit unit;
    Limit must; ///< the floor
    Limit goal; ///< the ambition
    std::function<Prepared()> prepare;
};

/// Every case, in the order of the table.
std::vector<Case> all_cases();

} // namespace kz::bench
