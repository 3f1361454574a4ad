// How many threads take fingerprints, each with handles of its own.

#include <algorithm>
#include <functional>
#include <thread>

#include "growth/growth.hpp"
#include "measure/others.hpp"
#include "peers/peers.hpp"

namespace kz::bench {

namespace {

/// Others that keep a larger part of a processor busy are in the way of threads.
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

/// Adds a row for each number of threads.
///
/// @return Whether the law holds.
bool add_rows(GrowthTable& table, const std::string& name, int repetitions,
              const std::function<void()>& fingerprint)
{
    bool holds = true;
    const uint32_t most = std::max(1U, std::thread::hardware_concurrency());
    Rate alone{};
    for (uint32_t count = 1; count <= most; ++count) {
        const Rate rate = run_in_threads(count, repetitions, fingerprint);
        alone = count == 1 ? rate : alone;
        const bool disturbed = rate.disturbed || alone.disturbed;
        const double cpu = rate.cpu_seconds / alone.cpu_seconds;
        const double together = rate.per_second / alone.per_second;
        table.rows.push_back({name, number(count), in_time(rate.cpu_seconds), number(cpu, 3),
                              number(rate.per_second),
                              number(together, 2) + (disturbed ? ", disturbed" : "")});
        holds = holds && cpu <= 1.05 && (disturbed || together >= 0.9 * count);
    }
    return holds;
}

} // namespace

GrowthTable grow_threads(bool thorough)
{
    const int repetitions = thorough ? 400 : 60;
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
    table.holds = add_rows(table, "ours", repetitions, ours);
    if (const Peer peer = chromaprint_fingerprint(sound, kRate, 2); peer.run) {
        add_rows(table, peer.name, repetitions, peer.run);
    }
    return table;
}

} // namespace kz::bench
