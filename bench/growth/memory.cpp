// How much heap a handle takes, and when.

#include "growth/growth.hpp"
#include "measure/heap_meter.hpp"
#include "peers/peers.hpp"

namespace kz::bench {

namespace {

struct Life {
    int64_t created;     ///< bytes held by a fresh handle
    int64_t peak;        ///< most bytes, until the document is freed
    int64_t allocations; ///< while feeding
    int64_t left;        ///< bytes held when all is freed
};

Life live(const Job& job, const std::vector<int16_t>& sound)
{
    Life life{};
    const int64_t before = heap_use().bytes;
    reset_heap_peak();
    {
        Fingerprint fingerprint(job);
        life.created = heap_use().bytes - before;
        const int64_t allocations = heap_use().allocations;
        require(fingerprint.feed(sound.data(), bytes_of(sound)), "not complete");
        life.allocations = heap_use().allocations - allocations;
        fingerprint.render([](const char* text) { keep(text); });
        life.peak = heap_use().peak - before;
    }
    life.left = heap_use().bytes - before;
    return life;
}

std::string bytes(int64_t count) { return number(static_cast<double>(count)); }

} // namespace

GrowthTable grow_memory(bool /*thorough*/)
{
    struct Twin {
        const char* name;
        Algorithm algorithm;
        int64_t most;
    };
    constexpr Twin kTwins[] = {{"fixed point", fixed, 360000},
                               {"floating point", floating, 480000}};
    GrowthTable table{
        "A handle holds at most 360000 bytes of heap at a time, a floating-point one 480000, and "
        "gives all back; what the first handle leaves behind serves all later ones",
        {"handle", "bytes when made", "peak", "allocations while fed", "bytes left"},
        {},
        true};
    for (const uint32_t rate : {44100U, 48000U}) {
        const auto sound = kz::test::melody(rate, 2, kOffered);
        const std::string at = " at " + number(rate) + " Hz";
        for (const Twin& twin : kTwins) {
            for (const bool first : {true, false}) {
                const Life life = live({twin.algorithm, pcm16, rate, stereo}, sound);
                table.rows.push_back({twin.name + at + (first ? ", first" : ", second"),
                                      bytes(life.created), bytes(life.peak),
                                      bytes(life.allocations), bytes(life.left)});
                table.holds = *table.holds && life.peak <= twin.most && (first || life.left == 0);
            }
        }
        if (const ContextHeap heap = chromaprint_heap(sound, rate, 2); heap.fed > 0) {
            table.rows.push_back({kChromaprint + at, bytes(heap.fresh), bytes(heap.fed), "", ""});
        }
    }
    return table;
}

} // namespace kz::bench
