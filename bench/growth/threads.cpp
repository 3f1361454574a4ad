// How throughput grows with the threads that take fingerprints, each with handles of its own.

#include <algorithm>
#include <functional>
#include <thread>

#include "growth/growth.hpp"
#include "measure/others.hpp"
#include "peers/peers.hpp"

namespace kz::bench {

namespace {

/// If other programs keep a larger part of a processor busy than this, threads are disturbed.
constexpr double kInTheWay = 0.1;

struct Rate {
    double cpu_seconds; ///< of one fingerprint, on the median
    double per_second;  ///< fingerprints of all threads together, by the wall clock
    bool disturbed;     ///< others were in the way
};

Rate run_in_threads(uint32_t count, int repetitions, const std::function<void()>& fingerprint)
{
    std::vector<std::vector<double>> times(count);
    const OthersWork others;
    const double begun = wall_now();
    std::vector<std::thread> threads;
    for (auto& own : times) {
        threads.emplace_back([&own, &fingerprint, repetitions] {
            for (int i = 0; i < repetitions; ++i) {
                own.push_back(cpu_seconds(fingerprint));
            }
        });
    }
    for (auto& thread : threads) {
        thread.join();
    }
    const double elapsed = wall_now() - begun;
    const bool disturbed = others.processors() > kInTheWay;
    std::vector<double> all;
    for (const auto& own : times) {
        all.insert(all.end(), own.begin(), own.end());
    }
    return {spread_of(all).median, static_cast<double>(all.size()) / elapsed, disturbed};
}

/// Adds a row for each number of threads. A round takes every number in turn, and compares each
/// with one thread of the same round.
///
/// @return Whether the law holds.
bool add_rows(GrowthTable& table, const std::string& name, int rounds,
              const std::function<void()>& fingerprint)
{
    constexpr int kRepetitions = 30;
    const uint32_t most = std::max(1U, std::thread::hardware_concurrency());
    struct Row {
        std::vector<double> cpu_seconds;
        std::vector<double> cpu_of_one;
        std::vector<double> per_second;
        std::vector<double> speed_of_one;
    };
    std::vector<Row> rows(most);
    bool disturbed = false;
    for (int round = 0; round < rounds; ++round) {
        Rate alone{};
        for (uint32_t count = 1; count <= most; ++count) {
            const Rate rate = run_in_threads(count, kRepetitions, fingerprint);
            alone = count == 1 ? rate : alone;
            Row& row = rows[count - 1];
            row.cpu_seconds.push_back(rate.cpu_seconds);
            row.cpu_of_one.push_back(rate.cpu_seconds / alone.cpu_seconds);
            row.per_second.push_back(rate.per_second);
            row.speed_of_one.push_back(rate.per_second / alone.per_second);
            disturbed = disturbed || rate.disturbed;
        }
    }
    bool holds = true;
    for (uint32_t count = 1; count <= most; ++count) {
        const Row& row = rows[count - 1];
        const double cpu = spread_of(row.cpu_of_one).median;
        const double speed = spread_of(row.speed_of_one).median;
        table.rows.push_back({name, number(count), in_time(spread_of(row.cpu_seconds).median),
                              number(cpu, 3), number(spread_of(row.per_second).median),
                              number(speed, 2) + (disturbed ? ", disturbed" : "")});
        holds = holds && cpu <= 1.05 && (disturbed || speed >= 0.9 * count);
    }
    return holds;
}

} // namespace

GrowthTable grow_threads(bool thorough)
{
    const int rounds = thorough ? 25 : 7;
    const auto sound = stereo_sound();
    const auto ours = [&sound] {
        Fingerprint fingerprint(kStereo);
        require(fingerprint.feed(sound.data(), bytes_of(sound)), "not complete");
        fingerprint.render([](const char* text) { keep(text); });
    };
    GrowthTable table{
        "A fingerprint takes the same processor time beside others, within 5 %; on an "
        "otherwise idle machine n threads make at least 0.9 n times as many",
        {"library", "threads", "processor time of one", "of one thread's",
         "in a second, all together", "of one thread's"},
        {},
        true};
    table.holds = add_rows(table, "ours", rounds, ours);
    if (const Peer peer = chromaprint_fingerprint(sound, kRate, 2); peer.run) {
        add_rows(table, peer.name, rounds, peer.run);
    }
    return table;
}

} // namespace kz::bench
