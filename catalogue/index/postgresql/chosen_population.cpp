/// @file
/// The population of a catalogue on a server.

#include "catalogue/index/postgresql/chosen_population.hpp"

#include <map>
#include <utility>

namespace kzcat::postgresql {

namespace {

using Runs = std::vector<std::vector<Code>>;

Population population_of(const Runs& runs)
{
    const std::vector<std::span<const Code>> spans(runs.begin(), runs.end());
    return Population(spans);
}

ShardBytes to_bytes(const Runs& runs)
{
    ShardBytes bytes;
    for (const auto& run : runs) {
        const size_t at = bytes.size();
        bytes.resize(at + 8 * (run.size() + 1));
        put_little_endian(uint64_t{run.size()}, bytes.data() + at);
        put_little_endian(std::span<const Code>(run), std::span(bytes).subspan(at + 8));
    }
    return bytes;
}

/// None when the bytes are damaged.
std::optional<Runs> to_runs(Bytes bytes)
{
    Runs runs;
    while (!bytes.empty()) {
        if (bytes.size() < 8) {
            return std::nullopt;
        }
        const auto count = get_little_endian<uint64_t>(bytes.data());
        bytes = bytes.subspan(8);
        if (count > bytes.size() / 8) {
            return std::nullopt;
        }
        get_little_endian(bytes.first(static_cast<size_t>(8 * count)), runs.emplace_back());
        bytes = bytes.subspan(static_cast<size_t>(8 * count));
    }
    return runs;
}

/// What has become of the catalogue, by the number of the last change.
struct State {
    int64_t change = 0;
    int64_t tracks = 0;
    int64_t codes = 0;
};

State current_state(Connection& session)
{
    const Rows rows = session.query("SELECT (SELECT coalesce(max(id), 0) FROM kzcat.change), "
                                    "count(*), coalesce(sum(codes), 0)::bigint FROM kzcat.track");
    return {
        .change = rows.integer(0, 0), .tracks = rows.integer(0, 1), .codes = rows.integer(0, 2)};
}

std::optional<Runs> kept_runs(Connection& session, const State& now)
{
    const Rows rows = session.query("SELECT change, runs FROM kzcat.population");
    if (rows.empty()) {
        return std::nullopt;
    }
    const int64_t changes = now.change - rows.integer(0, 0);
    if (changes < 0 || changes * 1000 > now.tracks) {
        return std::nullopt;
    }
    return to_runs(rows.bytes(0, 1));
}

struct Chosen {
    std::vector<int64_t> tracks; ///< of each run
    std::vector<PopulationRun> runs;
};

Chosen choose(Connection& session)
{
    const Rows rows = session.query("SELECT id, codes FROM kzcat.track ORDER BY id");
    std::vector<uint64_t> counts;
    for (int row = 0; row < rows.count(); ++row) {
        counts.push_back(static_cast<uint64_t>(rows.integer(row, 1)));
    }
    Chosen chosen{.tracks = {}, .runs = choose_runs(counts)};
    for (const PopulationRun& run : chosen.runs) {
        chosen.tracks.push_back(rows.integer(static_cast<int>(run.track), 0));
    }
    return chosen;
}

/// Tracks that went meanwhile, or whose server does not answer, leave their runs empty.
Runs fetch(Lookups& lookups, const Chosen& chosen)
{
    std::multimap<int64_t, size_t> wanted;
    for (size_t i = 0; i < chosen.tracks.size(); ++i) {
        wanted.emplace(chosen.tracks[i], i);
    }
    Runs runs(chosen.runs.size());
    lookups.fetch_codes(chosen.tracks, [&](int64_t track, const std::vector<Code>& codes) {
        const auto [begin, end] = wanted.equal_range(track);
        for (auto place = begin; place != end; ++place) {
            const PopulationRun& run = chosen.runs[place->second];
            if (run.first + run.count <= codes.size()) {
                const auto first = codes.begin() + static_cast<std::ptrdiff_t>(run.first);
                runs[place->second].assign(first, first + static_cast<std::ptrdiff_t>(run.count));
            }
        }
    });
    return runs;
}

/// For other clients, which choose the same.
void keep_runs(Sessions& sessions, const State& state, const Runs& runs)
{
    const ShardBytes bytes = to_bytes(runs);
    const auto keep = [&](Connection& session) {
        return session.query(
            "INSERT INTO kzcat.population (only_row, change, tracks, codes, runs) VALUES "
            "(1, $1, $2, $3, $4) ON CONFLICT (only_row) DO UPDATE SET change = $1, "
            "tracks = $2, codes = $3, runs = $4",
            state.change, state.tracks, state.codes, Bytes(bytes));
    };
    try {
        sessions.with(keep);
    } catch (const StoreError&) {
        return; // on a standby, or when the disk is full, each client chooses for itself
    }
}

} // namespace

Population chosen_population(Lookups& lookups, bool keep)
{
    auto& sessions = lookups.sessions();
    const State now = sessions.with(current_state);
    if (const auto kept =
            sessions.with([&](Connection& session) { return kept_runs(session, now); })) {
        return population_of(*kept);
    }
    const Runs runs = fetch(lookups, sessions.with(choose));
    const ShardCoverage coverage = lookups.coverage();
    if (keep && coverage.answered == coverage.of) {
        keep_runs(sessions, now, runs);
    }
    return population_of(runs);
}

} // namespace kzcat::postgresql
