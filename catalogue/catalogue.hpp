/// @file
/// A catalogue as a whole: a store, the index over it, and recognising, for any number of threads.
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <shared_mutex>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "catalogue/index/index.hpp"
#include "catalogue/match/documents.hpp"
#include "catalogue/match/match.hpp"
#include "catalogue/store/store.hpp"

namespace kzcat {

/// What merge() did.
struct Merged {
    uint64_t tracks_new = 0;
    uint64_t tracks_known = 0;
    uint64_t tracks_damaged = 0; ///< left out
};

/// What was recognised, and from how many of the servers that have tracks.
struct Recognised : MatchAnswer {
    ShardCoverage shards;
};

/// Called with tracks done and in all; stops the work by returning false.
using Progress = std::function<bool(uint64_t, uint64_t)>;

/// Calls from several threads are allowed. Recognising runs in parallel; whatever uses the store
/// takes turns. Throws StoreError.
class Catalogue {
public:
    /// The index is opened by the first call that recognises.
    Catalogue(std::unique_ptr<Store> store, IndexOptions options);

    /// Gives `use` the store, to which the calling thread has sole access meanwhile.
    template <class Use>
    auto with_store(Use use)
    {
        const std::lock_guard lock(store_mutex_);
        return use(*store_);
    }

    /// Gives `use` the index, which has taken in all that had changed before the call. Others may
    /// use it at the same time.
    template <class Use>
    auto with_index(Use use)
    {
        bring_index_up_to_date();
        const std::shared_lock lock(index_mutex_);
        return use(*index_);
    }

    std::vector<Added> add(std::span<const NewTrack> tracks);

    Recognised recognise(const QueryBands& query, const MatchOptions& options);
    Recognised recognise(const Trail& query, const MatchOptions& options);

    /// By the tracks that were stored with what answers documents.
    DocumentAnswer recognise(const DocumentValues& query, size_t candidates);

    /// What is known of the index; that of an index which is not open yet when there is none.
    IndexFacts index_facts(bool open);
    bool index_is_open();

    /// Tracks that could not be looked through by the last call that recognised, because what is
    /// stored of them is damaged.
    uint64_t left_out(bool documents);

    /// Adds all whole tracks of another catalogue, in batches, each of which is kept or not as a
    /// whole.
    /// `merged` is up to date whenever a batch ends, also when the call throws. Returns false when
    /// `progress` stopped it.
    bool merge(Catalogue& other, const Progress& progress, Merged& merged);

private:
    int64_t last_change();
    void bring_index_up_to_date();
    void bring_documents_up_to_date();
    bool take_in_document(Store& store, int64_t track);
    void take_in_documents();

    std::mutex store_mutex_; ///< may be taken while another is held, never the other way round
    std::unique_ptr<Store> store_;
    IndexOptions options_;
    std::shared_mutex index_mutex_;
    std::unique_ptr<Index> index_;
    int64_t index_change_ = -1; ///< the store's last change that the index has taken in
    std::shared_mutex documents_mutex_;
    DocumentTable documents_;
    uint64_t damaged_documents_ = 0; ///< tracks whose document bands are damaged
    int64_t documents_change_ = -1;  ///< the last change that it has taken in; -1: empty yet
};

} // namespace kzcat
