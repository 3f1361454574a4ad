/// @file
/// Finding fast: the codes of a store in memory or in a mapped side file, searched by scan or by
/// parts of codes.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>

#include "catalogue/match/searcher.hpp"
#include "catalogue/store/store.hpp"

namespace kzcat {

enum class Plan { scan, parts };

/// What became of the side file.
enum class IndexState {
    none,    ///< there is none, nor would it be worth it, or none is wanted
    current, ///< it serves; what came since is searched beside it
    missing, ///< it would be worth it, but could not be written
    stale,   ///< a tenth has changed since, and it could not be written again
    unusable ///< it could not be read or was refused, and was not written again
};

struct IndexFacts {
    Plan plan = Plan::scan;
    IndexState state = IndexState::none;
    uint64_t codes = 0;
    uint64_t tracks = 0;
    uint64_t tail_tracks = 0; ///< not in the side file: kept in memory and scanned
    uint64_t left_out = 0;    ///< tracks whose trails are damaged
    uint64_t file_bytes = 0;  ///< 0 when there is no side file
    double scan_ms =
        0; ///< of a look-up of 14.3 s, as measured when the file was written; 0 when not
    double parts_ms = 0;
    std::string note; ///< what was wrong with the side file, or with writing it; empty when nothing
};

struct IndexOptions {
    std::string path = {};         ///< of the side file; empty: none is read or written
    bool write = true;             ///< write the side file when it is worth it
    bool fall_back = true;         ///< offer a scan when the parts find nothing
    std::optional<Plan> plan = {}; ///< use this plan whatever was measured; parts need a side file
    uint64_t write_from = 4'000'000; ///< codes from which on a side file is worth it; 3 000 tracks
    /// Lists of parts that a look-up may read, counted in lists of average length: twice as many
    /// take twice as long, and find more that is buried in noise. 0 takes the usual number.
    uint32_t lists = 0;
    std::string server = {}; ///< address of the server that has the catalogue; empty: a file
    /// Answer from those servers that can be reached, when some cannot: see Index::coverage().
    bool partial = false;
};

/// Of how many servers that have tracks how many answered.
struct ShardCoverage {
    uint32_t answered = 1;
    uint32_t of = 1;
};

/// A searcher over all tracks of a store as they were when it was opened or last refreshed. Find
/// calls from several threads are allowed; refresh() is exclusive. The store may be closed between
/// the calls that name it.
class Index : public Searcher {
public:
    virtual IndexFacts facts() const = 0;

    /// Fewer than all only where partial answers are wanted.
    virtual ShardCoverage coverage() const { return {}; }

    /// Whether refresh() should be called though nothing has changed: a server that gave no answer
    /// may be back.
    virtual bool is_due() const { return false; }

    /// Takes in what has changed in the store since. What throws has changed nothing.
    virtual void refresh(Store& store) = 0;
};

/// Opens the side file, or derives everything from the store when it is missing, damaged or of
/// another catalogue: that costs time, never an answer. Writes it again when it is, or when a tenth
/// of what it has or of the catalogue has changed since. Throws StoreError where reading the store
/// does.
std::unique_ptr<Index> open_index(Store& store, const IndexOptions& options);

} // namespace kzcat
