/// @file
/// kzscale: what searching costs and finds in catalogues of any size, by scan and by parts.
///
/// The catalogue is made of the trails of evaluation/ and of permutations of them; clips of every
/// kind are looked up in it by both plans. Printed are the sizes, the times (of the thread's
/// processor, so that other work does not show), the share of the clips found by a scan that the
/// parts find too, and how high strangers score.

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <ctime>
#include <fstream>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>
#include <unistd.h>

#include "catalogue/index/searches.hpp"
#include "catalogue/match/match.hpp"
#include "catalogue/match/reading.hpp"
#include "catalogue/match/score.hpp"
#include "catalogue/match/thresholds.hpp"
#include "music.hpp"

namespace {

namespace fs = std::filesystem;
using namespace kz::scale;

struct Options {
    fs::path manifest = "evaluation/manifest.jsonl";
    fs::path media = "build/media/evaluation";
    std::string half = "tune";
    size_t tracks = 10000;
    size_t codes = 1292;
    size_t clips = 150;
    uint32_t lists = 0;
    std::vector<std::string> kinds;
    size_t strangers = 0;
    bool by_scan = true;
};

double seconds()
{
    timespec now{};
    clock_gettime(CLOCK_THREAD_CPUTIME_ID, &now);
    return static_cast<double>(now.tv_sec) + 1e-9 * static_cast<double>(now.tv_nsec);
}

/// Seconds that `work` takes.
template <class Work>
double timed(Work work)
{
    const double begin = seconds();
    work();
    return seconds() - begin;
}

double resident_megabytes()
{
    std::ifstream in("/proc/self/statm");
    double pages = 0;
    in >> pages >> pages;
    return pages * static_cast<double>(sysconf(_SC_PAGESIZE)) / 1e6;
}

/// A side file of the corpus, mapped. The file is gone when the program ends.
kzcat::MappedIndex written_index(const kzcat::Corpus& corpus)
{
    const std::string path =
        (fs::temp_directory_path() / ("kzscale." + std::to_string(getpid()))).string();
    double built = 0;
    kzcat::IndexHeader header;
    header.catalogue = "scale";
    {
        kzcat::FileReplacement file(path);
        built = timed([&] { kzcat::write_index_file(file, header, corpus); });
        file.commit();
    }
    kzcat::MappedIndex mapped;
    const double opened = timed([&] { mapped = kzcat::map_index(path); });
    fs::remove(path);
    uint64_t parts = 0;
    for (const auto& table : *mapped.contents.tables) {
        parts += table.starts.size() + table.words.size();
    }
    const auto codes = static_cast<double>(header.codes);
    std::printf("%llu tracks, %.1f million codes; side file %.1f MB: parts %.2f bytes a code; "
                "written in %.1f s, opened in %.3f s\n",
                static_cast<unsigned long long>(header.tracks), codes / 1e6,
                static_cast<double>(mapped.file.bytes().size()) / 1e6,
                static_cast<double>(parts) / codes, built, opened);
    return mapped;
}

/// The hypothesis that is nearest to what was done to a clip.
kzcat::Hypothesis true_hypothesis(const Clip& clip)
{
    constexpr double kStepsPerOctave = 36;
    const double steps = kStepsPerOctave * std::log2(clip.speed * clip.pitch);
    kzcat::Hypothesis nearest;
    double least = std::hypot(steps, kStepsPerOctave * std::log2(clip.speed * clip.tempo));
    for (const auto& one : kzcat::further_hypotheses()) {
        const double distance =
            std::hypot(steps - one.pitch_steps,
                       kStepsPerOctave * std::log2(clip.speed * clip.tempo / one.stretch));
        if (distance < least) {
            least = distance;
            nearest = one;
        }
    }
    return nearest;
}

struct Tally {
    size_t clips = 0;
    size_t accepted = 0;          ///< by scan: found, and its score reaches the threshold
    size_t accepted_by_parts = 0; ///< of those
    double scan_seconds = 0;
    double parts_seconds = 0;
    double highest = 0; ///< score of a stranger
    double sum = 0;
};

bool has(const std::vector<kzcat::Candidate>& places, int64_t track)
{
    return std::ranges::find(places, track, &kzcat::Candidate::track) != places.end();
}

class Study {
public:
    Study(kzcat::Searches& searches, std::map<std::string, int64_t> ids, bool by_scan)
        : searches_(searches), ids_(std::move(ids)), by_scan_(by_scan)
    {
    }

    /// Looks a clip up as it is when its kind does not change speed, else at the nearest
    /// hypothesis.
    void look_up(const Clip& clip)
    {
        constexpr size_t kLimit = 16;
        const auto bands = query_of(clip.file);
        kzcat::QueryReader reader(bands, {.first = 0, .count = bands.frames()});
        const auto hypothesis = true_hypothesis(clip);
        const auto reading = reader.read(hypothesis);
        auto& scan = searches_.everything();
        std::vector<kzcat::Candidate> by_parts;
        std::vector<kzcat::Candidate> by_scan;
        Tally& tally = tallies_[clip.known ? clip.kind : "strangers, " + clip.kind];
        tally.clips += 1;
        tally.parts_seconds += timed([&] { by_parts = searches_.by_parts(reading, kLimit); });
        if (by_scan_) {
            tally.scan_seconds += timed([&] { by_scan = scan.find(reading, kLimit); });
        }
        const kzcat::ReadingScorer scorer(reading, scan.population());
        if (!clip.known) {
            add_stranger(tally, scorer, by_scan);
        } else if (const auto id = ids_.at(clip.track); !by_scan_ || has(by_scan, id)) {
            const bool base = hypothesis == kzcat::Hypothesis{};
            const double threshold =
                kzcat::threshold_for(scan.code_count(), 1, kzcat::kFullWindow) +
                (base ? 0 : kzcat::kFurtherMargin);
            if (scorer.score(scan.codes(id)).score >= threshold) {
                tally.accepted += 1;
                tally.accepted_by_parts += static_cast<size_t>(has(by_parts, id));
            }
        }
    }

    void print() const
    {
        std::printf("%-24s %6s %9s %8s %9s %9s %8s %8s\n", "kind", "clips", "accepted", "recall",
                    "scan ms", "parts ms", "highest", "mean");
        for (const auto& [kind, tally] : tallies_) {
            const auto clips = static_cast<double>(tally.clips);
            const auto accepted = static_cast<double>(tally.accepted);
            std::printf(
                "%-24s %6zu %9.3f %8.4f %9.2f %9.2f %8.2f %8.2f\n", kind.c_str(), tally.clips,
                accepted / clips,
                tally.accepted == 0 ? 0 : static_cast<double>(tally.accepted_by_parts) / accepted,
                1e3 * tally.scan_seconds / clips, 1e3 * tally.parts_seconds / clips, tally.highest,
                tally.sum / clips);
        }
    }

private:
    void add_stranger(Tally& tally, const kzcat::ReadingScorer& scorer,
                      const std::vector<kzcat::Candidate>& places)
    {
        double best = 0;
        for (const auto& place : places) {
            best = std::max(best, scorer.score(searches_.everything().codes(place.track)).score);
        }
        tally.highest = std::max(tally.highest, best);
        tally.sum += best;
    }

    kzcat::Searches& searches_;
    std::map<std::string, int64_t> ids_;
    bool by_scan_;
    std::map<std::string, Tally> tallies_;
};

/// Searches by parts only, as an index does that may not fall back to a scan.
class PartsSearcher final : public kzcat::Searcher {
public:
    explicit PartsSearcher(kzcat::Searches& searches) : searches_(searches) {}
    std::vector<kzcat::Candidate> find(const kzcat::Reading& reading, size_t limit) override
    {
        return searches_.by_parts(reading, limit);
    }
    std::span<const kzcat::Code> codes(int64_t track) override
    {
        return searches_.everything().codes(track);
    }
    const kzcat::Corpus& population() override { return searches_.everything().population(); }
    uint64_t code_count() override { return searches_.everything().code_count(); }

private:
    kzcat::Searches& searches_;
};

/// The whole recognition of strangers, all hypotheses: the dearest case.
void recognise_strangers(const std::vector<Clip>& clips, size_t limit, kzcat::Searches& searches)
{
    PartsSearcher parts(searches);
    Tally tally;
    for (const auto& clip : clips) {
        if (!clip.known && tally.clips < limit) {
            const auto bands = query_of(clip.file);
            tally.clips += 1;
            tally.parts_seconds += timed([&] { kzcat::recognise(bands, parts, {}); });
            tally.scan_seconds +=
                timed([&] { kzcat::recognise(bands, searches.everything(), {}); });
        }
    }
    if (tally.clips > 0) {
        const auto count = static_cast<double>(tally.clips);
        std::printf("a stranger at all 19 hypotheses, %zu clips: scan %.0f ms, parts %.0f ms\n",
                    tally.clips, 1e3 * tally.scan_seconds / count,
                    1e3 * tally.parts_seconds / count);
    }
}

Options parsed(CLI::App& app, int count, char** arguments)
{
    Options options;
    app.add_option("--manifest", options.manifest, "the tracks, evaluation/manifest.jsonl");
    app.add_option("--media", options.media, "where tracks and clips lie");
    app.add_option("--half", options.half, "of the music: tune or report");
    app.add_option("--tracks", options.tracks, "in the catalogue");
    app.add_option("--codes", options.codes, "of each made-up track; 1292 are 4 minutes");
    app.add_option("--clips", options.clips, "known ones and strangers of each kind, at most");
    app.add_option("--lists", options.lists, "that a look-up reads; 0: the usual number");
    app.add_option("--strangers", options.strangers, "to recognise at all hypotheses");
    app.add_flag("!--no-scan", options.by_scan, "take every true track for found by scan");
    app.add_option("kinds", options.kinds, "of clips; folders of MEDIA/clips/HALF");
    app.parse(count, arguments);
    return options;
}

void study(const Options& options)
{
    const auto real = known_tracks(options.manifest, options.media, options.half);
    std::map<std::string, int64_t> ids;
    for (size_t i = 0; i < real.size(); ++i) {
        ids[real[i].id] = static_cast<int64_t>(i) + 1;
    }
    auto catalogue = std::make_optional(pseudo_catalogue(real, options.tracks, options.codes));
    auto mapped = written_index(catalogue->corpus());
    catalogue.reset();
    kzcat::Searches searches(kzcat::Snapshot(std::move(mapped)), options.lists);
    Study study(searches, std::move(ids), options.by_scan);
    std::vector<Clip> all;
    for (const auto& kind : options.kinds) {
        for (const auto& clip :
             clips_of(options.media / "clips" / options.half / kind, options.clips)) {
            study.look_up(clip);
            all.push_back(clip);
        }
    }
    study.print();
    std::printf("resident: %.0f MB\n", resident_megabytes());
    recognise_strangers(all, options.strangers, searches);
}

} // namespace

int main(int count, char** arguments)
try {
    CLI::App app("What searching costs and finds in catalogues of any size.", "kzscale");
    try {
        study(parsed(app, count, arguments));
    } catch (const CLI::ParseError& error) {
        return app.exit(error);
    }
    return 0;
} catch (const std::exception& error) {
    std::fprintf(stderr, "kzscale: %s\n", error.what());
    return 1;
}
