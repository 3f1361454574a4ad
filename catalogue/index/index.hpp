/// @file
/// Finding fast: the codes of a store in memory or in a mapped side file, searched by scan or by
/// parts of codes.
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "catalogue/match/searcher.hpp"
#include "catalogue/store/store.hpp"

namespace kzcat {

enum class Plan { scan, parts };

struct IndexFacts {
    Plan plan = Plan::scan;
    uint64_t codes = 0;
    uint64_t tracks = 0;
    uint64_t tail_tracks = 0; ///< added since the side file was written; scanned
    uint64_t file_bytes = 0;  ///< 0 when there is no side file
    double scan_ms =
        0; ///< of a look-up of 14.3 s, as measured when the file was written; 0 when not
    double parts_ms = 0;
    std::string note; ///< why the side file was not used, empty when it was
};

struct IndexOptions {
    std::string path;         ///< of the side file; empty: none is read or written
    bool write = true;        ///< write the side file when it is worth it
    bool fall_back = true;    ///< scan when the parts find nothing
    std::optional<Plan> plan; ///< use this plan whatever was measured
};

/// A searcher over all tracks of a store as they were when it was opened or last refreshed. Find
/// calls from several threads are allowed; refresh() is exclusive.
class Index : public Searcher {
public:
    virtual IndexFacts facts() const = 0;

    /// Takes in what has changed in the store since.
    virtual void refresh(Store& store) = 0;
};

/// Opens the side file, or derives everything from the store when it is missing, damaged or of
/// another catalogue: that costs time, never an answer.
std::unique_ptr<Index> open_index(Store& store, const IndexOptions& options);

} // namespace kzcat
