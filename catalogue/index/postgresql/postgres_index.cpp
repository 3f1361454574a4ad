/// @file
/// Finding on PostgreSQL servers. A look-up takes two statements, one that counts hits on diagonals
/// and one that ranks the places with most hits; the tracks that come first are then fetched and
/// scored by the client, as those of any other index are.

#include "catalogue/index/postgresql/postgres_index.hpp"

#include <algorithm>
#include <chrono>
#include <iterator>
#include <utility>

#include "catalogue/index/postgresql/chosen_population.hpp"
#include "catalogue/index/postgresql/code_cache.hpp"
#include "catalogue/store/postgresql/postgres_store.hpp"

namespace kzcat {

namespace {

using namespace postgresql;

/// Of packaging/postgresql/kzmatch.control.
constexpr const char* kExtensionVersion = "1.0";

std::vector<Candidate> candidates_of(std::vector<RankedPlace> places, size_t limit)
{
    keep_best(places, limit);
    std::vector<Candidate> candidates;
    std::ranges::transform(places, std::back_inserter(candidates), &RankedPlace::place);
    return candidates;
}

/// What the servers are asked, by all that find: the part of an index that may be used by several
/// threads at once.
class Servers {
public:
    Servers(const IndexOptions& options, bool any_server)
        : lookups(options.server, any_server, options.partial), lists(options.lists)
    {
    }

    std::vector<Candidate> by_scan(const Reading& reading, size_t limit)
    {
        return fetched(candidates_of(lookups.scan(scan_query(reading, limit)), limit));
    }

    std::vector<Candidate> by_parts(const Reading& reading, size_t limit)
    {
        std::vector<Look> looks = tail_looks(reading, limit);
        const SummedLengths& lengths = state.lengths;
        const auto probes = choose_probes(reading, lengths, probe_budget(lengths.total(), lists));
        const auto counted = lookups.count(count_query(reading, probes));
        looks.insert(looks.end(), counted.begin(), counted.end());
        std::ranges::stable_sort(looks, {}, &Look::track);
        std::vector<int64_t> wanted;
        for (const Look& look : looks) {
            if (wanted.empty() || wanted.back() != look.track) {
                wanted.push_back(look.track);
            }
        }
        const auto query =
            to_bytes(reading, static_cast<uint32_t>(limit), std::span<const Look>(looks));
        return fetched(candidates_of(lookups.rank(wanted, query), limit));
    }

    std::span<const Code> codes(int64_t track)
    {
        SharedCodes found = cache.find(track);
        if (found == nullptr) {
            fetch({track});
            found = cache.find(track);
        }
        return found == nullptr ? std::span<const Code>{} : hold(std::move(found));
    }

    /// What is known of the catalogue beforehand.
    struct State {
        SummedLengths lengths;
        Population population;
        uint64_t code_count = 0;
        uint64_t tracks = 0;
        uint64_t tail_tracks = 0;
    };

    Lookups lookups;
    CodeCache cache;
    State state;
    uint32_t lists;

private:
    ShardBytes scan_query(const Reading& reading, size_t limit) const
    {
        const auto phases = coarse_phases(reading, state.population.corpus());
        return to_bytes(reading, static_cast<uint32_t>(limit),
                        std::span<const CoarsePhase>(phases));
    }

    /// What is not posted yet. It is asked for first: what is posted meanwhile is then found twice
    /// rather than missed.
    std::vector<Look> tail_looks(const Reading& reading, size_t limit)
    {
        std::vector<Look> looks;
        if (state.tail_tracks > 0) {
            for (const RankedPlace& found : lookups.scan_tail(scan_query(reading, limit))) {
                looks.push_back({.track = found.place.track, .position = found.place.position});
            }
        }
        return looks;
    }

    void fetch(const std::vector<int64_t>& wanted)
    {
        lookups.fetch_codes(wanted, [this](int64_t track, std::vector<Code> codes) {
            cache.put(track, std::make_shared<const std::vector<Code>>(std::move(codes)));
        });
    }

    /// Fetches the codes of all candidates at once: they are about to be scored.
    std::vector<Candidate> fetched(std::vector<Candidate> candidates)
    {
        std::vector<int64_t> wanted;
        for (const Candidate& candidate : candidates) {
            if (cache.find(candidate.track) == nullptr) {
                wanted.push_back(candidate.track);
            }
        }
        if (!wanted.empty()) {
            fetch(wanted);
        }
        return candidates;
    }
};

class PostgresIndex final : public Index {
public:
    /// What a writer has just added is found at the server that it was added to.
    PostgresIndex(Store& store, const IndexOptions& options)
        : options_(options), servers_(options, connection_of(store).options().read_only),
          everything_(servers_)
    {
        take_in(store);
    }

    std::vector<Candidate> find(const Reading& reading, size_t limit) override
    {
        return plan() == Plan::parts ? servers_.by_parts(reading, limit)
                                     : servers_.by_scan(reading, limit);
    }
    Searcher* thorough() override
    {
        return options_.fall_back && plan() == Plan::parts ? &everything_ : nullptr;
    }
    std::span<const Code> codes(int64_t track) override { return servers_.codes(track); }
    const Corpus& population() override { return servers_.state.population.corpus(); }
    uint64_t code_count() override { return servers_.state.code_count; }
    ShardCoverage coverage() const override { return servers_.lookups.coverage(); }

    IndexFacts facts() const override
    {
        IndexFacts facts;
        facts.plan = plan();
        facts.codes = servers_.state.code_count;
        facts.tracks = servers_.state.tracks;
        facts.tail_tracks = servers_.state.tail_tracks;
        return facts;
    }

    bool is_due() const override
    {
        const ShardCoverage coverage = this->coverage();
        return coverage.answered < coverage.of && Clock::now() - taken_in_ > kPause;
    }

    void refresh(Store& store) override { take_in(store); }

private:
    /// Looks everywhere.
    class Everything final : public Searcher {
    public:
        explicit Everything(Servers& servers) : servers_(servers) {}
        std::vector<Candidate> find(const Reading& reading, size_t limit) override
        {
            return servers_.by_scan(reading, limit);
        }
        std::span<const Code> codes(int64_t track) override { return servers_.codes(track); }
        const Corpus& population() override { return servers_.state.population.corpus(); }
        uint64_t code_count() override { return servers_.state.code_count; }

    private:
        Servers& servers_;
    };

    Plan plan() const
    {
        if (servers_.state.lengths.total() == 0) {
            return Plan::scan;
        }
        return options_.plan.value_or(Plan::parts);
    }

    void take_in(Store& store)
    {
        taken_in_ = Clock::now(); // also of what fails: it is tried again after a pause
        auto before = servers_.lookups.shards();
        try {
            servers_.state = read_state(store);
        } catch (...) {
            servers_.lookups.set_shards(std::move(before));
            throw;
        }
        servers_.cache.clear();
    }

    Servers::State read_state(Store& store)
    {
        Lookups& lookups = servers_.lookups;
        lookups.refresh();
        Servers::State state;
        state.code_count = store.code_count();
        state.tracks = store.track_count();
        state.tail_tracks = lookups.tail_tracks();
        const ShardCoverage coverage = lookups.coverage();
        if (options_.write && state.tail_tracks > 0 && coverage.answered == coverage.of &&
            state.code_count >= options_.write_from) {
            // What is less than a tenth of all is scanned.
            lookups.request_posting(std::max<uint64_t>(state.code_count / 10 / coverage.of, 1));
            state.tail_tracks = lookups.tail_tracks();
        }
        state.lengths = lookups.lengths();
        state.population = chosen_population(lookups, options_.write);
        return state;
    }

    using Clock = std::chrono::steady_clock;
    /// Before servers that gave no answer are asked again.
    static constexpr std::chrono::seconds kPause{5};

    Clock::time_point taken_in_;
    IndexOptions options_;
    Servers servers_;
    Everything everything_;
};

/// Why the extension of the server cannot be used; empty when it can.
std::string extension_obstacle(Connection& session)
{
    const Rows rows = session.query("SELECT extnamespace::regnamespace::text, extversion FROM "
                                    "pg_catalog.pg_extension WHERE extname = 'kzmatch'");
    if (rows.empty()) {
        return "the server has no extension kzmatch, and the catalogue is too large to be searched "
               "without; install the package postgresql-15-kzmatch there, then CREATE EXTENSION "
               "kzmatch SCHEMA kzcat";
    }
    if (rows.text(0, 0) != "kzcat") {
        return "the extension kzmatch is in the schema " + std::string(rows.text(0, 0)) +
               ", where look-ups do not find it; run ALTER EXTENSION kzmatch SET SCHEMA kzcat";
    }
    if (rows.text(0, 1) != kExtensionVersion) {
        return "the extension kzmatch is of version " + std::string(rows.text(0, 1)) +
               " there, and this program uses version " + kExtensionVersion +
               "; install the package postgresql-15-kzmatch of this program's version there, then "
               "ALTER EXTENSION kzmatch UPDATE TO '" +
               kExtensionVersion + "'";
    }
    return {};
}

} // namespace

std::unique_ptr<Index> open_postgres_index(Store& store, const IndexOptions& options)
{
    Connection& session = connection_of(store);
    const std::string obstacle = extension_obstacle(session);
    if (obstacle.empty()) {
        return std::make_unique<PostgresIndex>(store, options);
    }
    if (store.code_count() < options.write_from) {
        return nullptr;
    }
    throw StoreError(StoreError::Kind::cannot_open, session.name() + ": " + obstacle);
}

} // namespace kzcat
