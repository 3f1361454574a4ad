/// @file
/// kzfollow: what it costs to follow a stream beside a catalogue of any size.
///
/// The catalogue is that of kzscale. Each sound file is a stream; printed are its entries, how
/// many streams like it one core can follow, and the longest time for which a feed kept the stream
/// waiting (times of the thread's processor, so that other work does not show).

#include <algorithm>
#include <array>
#include <cstdio>
#include <ctime>
#include <filesystem>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>
#include <sndfile.hh>
#include <unistd.h>

#include "catalogue/index/searches.hpp"
#include "catalogue/monitor/monitor.hpp"
#include "kzsdk/stream/stream.h"
#include "music.hpp"

namespace {

namespace fs = std::filesystem;
using namespace kz::scale;

struct Options {
    fs::path manifest = "evaluation/manifest.jsonl";
    fs::path media = "build/media/evaluation";
    std::string half = "report";
    size_t tracks = 10000;
    size_t codes = 1292;
    bool speeds = true;
    bool entries = false;
    std::vector<fs::path> streams;
};

double processor_seconds()
{
    timespec now{};
    clock_gettime(CLOCK_THREAD_CPUTIME_ID, &now);
    return static_cast<double>(now.tv_sec) + 1e-9 * static_cast<double>(now.tv_nsec);
}

/// By parts, and everywhere when thoroughly, as the index of a catalogue does.
class BothSearcher final : public kzcat::Searcher {
public:
    explicit BothSearcher(kzcat::Searches& searches) : searches_(searches) {}
    std::vector<kzcat::Candidate> find(const kzcat::Reading& reading, size_t limit) override
    {
        return searches_.by_parts(reading, limit);
    }
    kzcat::Searcher* thorough() override { return &searches_.everything(); }
    std::span<const kzcat::Code> codes(int64_t track) override
    {
        return searches_.everything().codes(track);
    }
    const kzcat::Corpus& population() override { return searches_.everything().population(); }
    uint64_t code_count() override { return searches_.everything().code_count(); }

private:
    kzcat::Searches& searches_;
};

kzcat::MappedIndex index_of(const kzcat::Corpus& corpus)
{
    const std::string path =
        (fs::temp_directory_path() / ("kzfollow." + std::to_string(getpid()))).string();
    kzcat::IndexHeader header;
    header.catalogue = "follow";
    kzcat::FileReplacement file(path);
    kzcat::write_index_file(file, header, corpus);
    file.commit();
    kzcat::MappedIndex mapped = kzcat::map_index(path);
    fs::remove(path);
    return mapped;
}

struct Cost {
    double seconds = 0; ///< of sound
    double used = 0;
    double longest = 0;
};

/// Feeds a file in pieces of a quarter of a second.
Cost follow(kzcat::Monitor& monitor, SndfileHandle& file, const kzcat::Monitor::WithSearcher& with)
{
    const auto channels = static_cast<size_t>(file.channels());
    std::vector<int16_t> block(static_cast<size_t>(file.samplerate()) / 4 * channels);
    Cost cost;
    for (;;) {
        const sf_count_t count = file.read(block.data(), static_cast<sf_count_t>(block.size()));
        const double begin = processor_seconds();
        if (count <= 0) {
            monitor.finish(with);
        } else {
            monitor.feed(std::as_bytes(std::span(block).first(static_cast<size_t>(count))), with);
        }
        const double used = processor_seconds() - begin;
        cost.used += used;
        cost.longest = std::max(cost.longest, used);
        if (count <= 0) {
            cost.seconds = monitor.seconds();
            return cost;
        }
    }
}

void print_entries(kzcat::Monitor& monitor)
{
    constexpr std::array<const char*, 3> kHeard = {"track", "gap", "silence"};
    for (const kzcat::MonitorEvent& event : monitor.events()) {
        if (event.stage == kzcat::Stage::ends) {
            std::printf("    %8.1f - %8.1f  %s %lld\n", event.begin, event.end,
                        kHeard[static_cast<size_t>(event.heard)],
                        static_cast<long long>(event.track.track));
        }
    }
}

void study(const Options& options)
{
    const auto real = known_tracks(options.manifest, options.media, options.half);
    auto catalogue = std::make_optional(pseudo_catalogue(real, options.tracks, options.codes));
    kzcat::Searches searches(kzcat::Snapshot(index_of(catalogue->corpus())), 0);
    catalogue.reset();
    BothSearcher searcher(searches);
    const kzcat::Monitor::WithSearcher with = [&searcher](const auto& use) { use(searcher); };
    std::printf("%zu tracks\n%-40s %8s %12s %10s\n", options.tracks, "stream", "minutes",
                "streams/core", "longest ms");
    for (const fs::path& path : options.streams) {
        SndfileHandle file(path.c_str());
        if (file.error() != SF_ERR_NO_ERROR) {
            throw std::runtime_error("cannot read " + path.string() + ": " + file.strError());
        }
        kzcat::Monitor monitor({KZ_STREAM_FORMAT_PCM16, static_cast<uint32_t>(file.samplerate()),
                                static_cast<uint32_t>(file.channels())},
                               {.speeds = options.speeds, .timeline = {}});
        const Cost cost = follow(monitor, file, with);
        std::printf("%-40s %8.1f %12.0f %10.0f\n", path.filename().c_str(), cost.seconds / 60,
                    cost.seconds / cost.used, 1e3 * cost.longest);
        if (options.entries) {
            print_entries(monitor);
        }
    }
}

Options parsed(CLI::App& app, int count, char** arguments)
{
    Options options;
    app.add_option("--manifest", options.manifest, "the tracks, evaluation/manifest.jsonl");
    app.add_option("--media", options.media, "where tracks lie");
    app.add_option("--half", options.half, "of the music: tune or report");
    app.add_option("--tracks", options.tracks, "in the catalogue");
    app.add_option("--codes", options.codes, "of each made-up track; 1292 are 4 minutes");
    app.add_flag("!--no-speeds", options.speeds, "look for tracks only as they are");
    app.add_flag("--entries", options.entries, "print what was heard");
    app.add_option("streams", options.streams, "sound files")->required();
    app.parse(count, arguments);
    return options;
}

} // namespace

int main(int count, char** arguments)
try {
    CLI::App app("What it costs to follow streams beside a catalogue of any size.", "kzfollow");
    try {
        study(parsed(app, count, arguments));
    } catch (const CLI::ParseError& error) {
        return app.exit(error);
    }
    return 0;
} catch (const std::exception& error) {
    std::fprintf(stderr, "kzfollow: %s\n", error.what());
    return 1;
}
