/// @file
/// kzservers: look-ups on PostgreSQL servers beside those of a file, and what they survive.
///
/// The catalogue of kzscale is put into a file, into one server, and into a coordinator with two
/// shards, all on this machine. The same readings are looked up in each. Printed are tracks added
/// and posted a second, the times of look-ups, how many answers are those of the file, and what
/// becomes of look-ups while a shard is killed, with and without a standby. Times are of the clock,
/// since servers work in processes of their own: compare them with each other only.

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <filesystem>
#include <functional>
#include <memory>
#include <span>
#include <stdexcept>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>
#include <unistd.h>

#include "catalogue/index/index.hpp"
#include "catalogue/index/measure.hpp"
#include "catalogue/store/memory/memory_store.hpp"
#include "catalogue/store/postgresql/postgres_store.hpp"
#include "music.hpp"
#include "tests/catalogue/index/fleet.hpp"

namespace {

namespace fs = std::filesystem;
using namespace kz::scale;
using namespace kzcat;
using kz::test::PostgresServer;

constexpr size_t kLimit = 16; // tracks of a look-up

struct Options {
    fs::path manifest = "evaluation/manifest.jsonl";
    fs::path media = "build/media/evaluation";
    size_t tracks = 10000;
    size_t codes = 1292;
    size_t look_ups = 50;
    size_t kills = 150;
    uint32_t lists = 0;
    uint32_t buffers = 1024;
};

/// Servers as they are meant to be run: what is committed is on disk, and what is looked up stays
/// in memory.
kz::test::PostgresSetup server_setup(const Options& options)
{
    kz::test::PostgresSetup setup;
    setup.settings = {"fsync = on", "full_page_writes = on", "autovacuum = on",
                      "shared_buffers = " + std::to_string(options.buffers) + "MB",
                      "max_wal_size = 4GB"};
    return setup;
}

double seconds_of(const std::function<void()>& work)
{
    const auto begin = std::chrono::steady_clock::now();
    work();
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - begin).count();
}

/// Adds all tracks in batches; their ids are 1, 2, 3 ... in every empty store.
void fill(Store& store, const PseudoCatalogue& catalogue)
{
    constexpr size_t kBatch = 64;
    const auto corpus = catalogue.corpus();
    std::vector<NewTrack> batch;
    for (const TrackSpan& span : catalogue.tracks) {
        const auto codes = corpus.segments[0].of(span);
        NewTrack& track = batch.emplace_back();
        track.trail.codes.assign(codes.begin(), codes.end());
        track.trail.samples = codes.size() * kCodeHop;
        track.source.uri = "track " + std::to_string(span.id);
        if (batch.size() == kBatch || &span == &catalogue.tracks.back()) {
            store.add(batch);
            batch.clear();
        }
    }
}

/// Readings with noise from the middle of tracks all over the catalogue.
std::vector<Reading> readings_of(const PseudoCatalogue& catalogue, size_t count)
{
    constexpr size_t kAround = 20; // a sample is taken from the middle ones of so many
    const std::span<const TrackSpan> tracks = catalogue.tracks;
    if (tracks.size() < kAround) {
        throw std::runtime_error("fewer than 20 tracks; take more with --tracks");
    }
    std::vector<Reading> readings;
    for (size_t i = 0; i < count; ++i) {
        const auto some = tracks.subspan(i * (tracks.size() - kAround) / count, kAround);
        readings.push_back(sample_reading({{Segment{catalogue.codes, some}}}));
    }
    return readings;
}

/// A look-up as recognising does it: candidates, and their codes.
std::vector<Candidate> look_up(Searcher& index, const Reading& reading)
{
    auto found = index.find(reading, kLimit);
    for (const Candidate& candidate : found) {
        index.codes(candidate.track);
    }
    return found;
}

bool same(const std::vector<Candidate>& left, const std::vector<Candidate>& right, size_t count)
{
    const auto equal = [](const Candidate& one, const Candidate& other) {
        return one.track == other.track && one.position == other.position &&
               one.phase == other.phase;
    };
    const size_t shared = std::min({count, left.size(), right.size()});
    return left.empty() == right.empty() &&
           std::equal(left.begin(), left.begin() + static_cast<std::ptrdiff_t>(shared),
                      right.begin(), equal);
}

struct Answers {
    std::vector<std::vector<Candidate>> found;
    double median_ms = 0;
};

Answers look_up_all(Searcher& index, const std::vector<Reading>& readings)
{
    Answers answers;
    std::vector<double> times;
    look_up(index, readings.front()); // connections are made, statements compiled
    for (const Reading& reading : readings) {
        times.push_back(1e3 *
                        seconds_of([&] { answers.found.push_back(look_up(index, reading)); }));
    }
    std::ranges::sort(times);
    answers.median_ms = times[times.size() / 2];
    return answers;
}

/// What a place of look-ups printed last is compared with.
void print(const char* name, const Answers& answers, const Answers& file)
{
    size_t first = 0;
    size_t all = 0;
    for (size_t i = 0; i < answers.found.size(); ++i) {
        first += same(file.found[i], answers.found[i], 1) ? size_t{1} : 0;
        all += same(file.found[i], answers.found[i], kLimit) ? size_t{1} : 0;
    }
    std::printf("%-28s %9.2f ms %7.2f %8zu of %zu %8zu of %zu\n", name, answers.median_ms,
                answers.median_ms / file.median_ms, first, answers.found.size(), all,
                answers.found.size());
    std::fflush(stdout);
}

IndexOptions options_for(const std::string& url, const Options& options)
{
    IndexOptions wanted;
    wanted.write_from = 1;
    wanted.server = url;
    wanted.lists = options.lists;
    return wanted;
}

/// Fills a catalogue on servers and opens its index, which posts the tracks.
std::unique_ptr<Index> filled(const char* name, const std::string& url, const Options& options,
                              const PseudoCatalogue& catalogue, std::unique_ptr<Store>& store)
{
    store = open_postgres_store(url, Access::create);
    const double added = seconds_of([&] { fill(*store, catalogue); });
    std::unique_ptr<Index> index;
    const double posted =
        seconds_of([&] { index = open_index(*store, options_for(url, options)); });
    const double opened =
        seconds_of([&] { index = open_index(*store, options_for(url, options)); });
    const auto count = static_cast<double>(catalogue.tracks.size());
    std::printf("%s: %.0f tracks a second added, %.0f posted (%.1f s), opened in %.0f ms\n", name,
                count / added, count / posted, posted, 1000 * opened);
    std::fflush(stdout);
    return index;
}

struct Survived {
    size_t equal = 0;
    size_t failed = 0;
    size_t other = 0;
};

/// Look-ups during which a shard is killed after about a quarter of them.
Survived while_killed(Index& index, const std::vector<Reading>& readings, const Answers& right,
                      size_t count, PostgresServer& victim)
{
    Survived survived;
    for (size_t i = 0; i < count; ++i) {
        if (i == count / 4) {
            victim.kill9();
        }
        const size_t number = i % readings.size();
        try {
            const auto found = look_up(index, readings[number]);
            ++(same(right.found[number], found, kLimit) ? survived.equal : survived.other);
        } catch (const StoreError&) {
            ++survived.failed;
        }
    }
    return survived;
}

void print(const char* name, const Survived& survived)
{
    std::printf("%s: %zu equal, %zu failed, %zu wrong or partial\n", name, survived.equal,
                survived.failed, survived.other);
    std::fflush(stdout);
}

void study_shards(const Options& options, const PseudoCatalogue& catalogue,
                  const std::vector<Reading>& readings, const Answers& file)
{
    const auto setup = server_setup(options);
    const PostgresServer coordinator(setup);
    const PostgresServer one(setup);
    PostgresServer two(setup);
    const auto standby = PostgresServer::standby_of(two, setup);
    const std::string second =
        "host=" + two.host() + "," + standby->host() + " port=" + std::to_string(two.port()) + "," +
        std::to_string(standby->port()) + " dbname=postgres user=postgres target_session_attrs=any";
    test::attach_shards(coordinator.url(), {test::shard_address(one), second});
    std::unique_ptr<Store> store;
    const auto index =
        filled("coordinator and 2 shards", coordinator.url(), options, catalogue, store);
    const Answers answers = look_up_all(*index, readings);
    print("coordinator and 2 shards", answers, file);
    test::await_replay(two, *standby);
    print("a shard with a standby killed",
          while_killed(*index, readings, answers, options.kills, two));
    standby->kill9();
    two.start();
    print("a shard without one killed",
          while_killed(*index, readings, answers, options.kills, two));
}

void study(const Options& options)
{
    const auto real = known_tracks(options.manifest, options.media, "tune");
    const auto catalogue = pseudo_catalogue(real, options.tracks, options.codes);
    const auto readings = readings_of(catalogue, options.look_ups);
    const std::string path =
        (fs::temp_directory_path() / ("kzservers." + std::to_string(getpid()))).string();
    Answers file;
    {
        const auto memory = make_memory_store();
        fill(*memory, catalogue);
        const auto index = open_index(
            *memory, {.path = path, .plan = Plan::parts, .write_from = 1, .lists = options.lists});
        file = look_up_all(*index, readings);
        fs::remove(path);
    }
    std::printf("%zu tracks; median look-up, times the file's, first and all candidates equal\n",
                catalogue.tracks.size());
    print("file", file, file);
    {
        const PostgresServer server(server_setup(options));
        std::unique_ptr<Store> store;
        const auto index = filled("one server", server.url(), options, catalogue, store);
        print("one server", look_up_all(*index, readings), file);
        std::printf("%s", server
                              .sql("SELECT relname, pg_size_pretty(pg_total_relation_size(oid)) "
                                   "FROM pg_class WHERE relname IN ('posting', 'trail')")
                              .c_str());
    }
    study_shards(options, catalogue, readings, file);
}

Options parsed(CLI::App& app, int count, char** arguments)
{
    Options options;
    app.add_option("--manifest", options.manifest, "the tracks, evaluation/manifest.jsonl");
    app.add_option("--media", options.media, "where tracks lie");
    app.add_option("--tracks", options.tracks, "in the catalogue");
    app.add_option("--codes", options.codes, "of each made-up track; 1292 are 4 minutes");
    app.add_option("--look-ups", options.look_ups, "that are timed");
    app.add_option("--kills", options.kills, "look-ups during which a shard is killed");
    app.add_option("--lists", options.lists, "that a look-up reads; 0: the usual number");
    app.add_option("--buffers", options.buffers, "shared_buffers of each server, in MB");
    app.parse(count, arguments);
    return options;
}

} // namespace

int main(int count, char** arguments)
try {
    CLI::App app("Look-ups on PostgreSQL servers beside those of a file.", "kzservers");
    try {
        study(parsed(app, count, arguments));
    } catch (const CLI::ParseError& error) {
        return app.exit(error);
    }
    return 0;
} catch (const std::exception& error) {
    std::fprintf(stderr, "kzservers: %s\n", error.what());
    return 1;
}
