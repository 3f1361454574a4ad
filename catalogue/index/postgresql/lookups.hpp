/// @file
/// The statements of look-ups. Each travels once, carries everything that is asked, and brings back
/// one row from each server that has tracks.
#pragma once

#include <functional>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "catalogue/index/index.hpp"
#include "catalogue/index/postgresql/sessions.hpp"
#include "catalogue/index/shard_bytes.hpp"

namespace kzcat::postgresql {

/// Grouping by the shard is what lets a coordinator have each server do its share: the tables are
/// partitioned by it.
extern const char* const kCountStatement; ///< of the lists $1, by the query $2
extern const char* const kRankStatement;  ///< of the tracks $1, by the query $2
extern const char* const kLengthsStatement;

/// Several threads may look up at once.
class Lookups {
public:
    /// Looking up at a standby, which may lag behind, is for `any_server`.
    Lookups(std::string address, bool any_server, bool partial);

    /// Looks which servers have tracks, and whether look-ups reach them and no others. Throws
    /// StoreError, which names a cure.
    void refresh();

    /// The servers that have tracks, and those of them that gave no answer.
    struct Shards {
        std::vector<int64_t> all; ///< empty: all is in one database
        std::vector<int64_t> missing;
    };
    Shards shards() const;
    /// As they were before a refresh() that came to nothing.
    void set_shards(Shards shards);

    /// Servers that have tracks, and those of them that answered: fewer only where a partial answer
    /// is wanted.
    ShardCoverage coverage() const;

    std::vector<RankedPlace> scan(const ShardBytes& query);
    std::vector<RankedPlace> scan_tail(const ShardBytes& query);
    std::vector<Look> count(const CountQuery& query);
    std::vector<RankedPlace> rank(const std::vector<int64_t>& tracks, const ShardBytes& query);

    /// Those that are there, in any order.
    void fetch_codes(const std::vector<int64_t>& tracks,
                     const std::function<void(int64_t, std::vector<Code>)>& take);

    SummedLengths lengths();
    uint64_t tail_tracks();
    /// Has tails of so many codes posted, where the user may ask for it. Look-ups scan what is not
    /// posted: so failures are left for the next time.
    void request_posting(uint64_t least);

    Sessions& sessions() { return sessions_; }

private:
    static constexpr const char* kEverywhere = " true";
    using Ask = std::function<Rows(Connection&, const std::string& where)>;
    Rows ask(const Ask& ask);
    Rows ask(const char* statement, std::span<const int64_t> numbers, Bytes query);
    std::vector<int64_t> known(const std::vector<int64_t>& tracks);
    std::string where() const;
    std::optional<std::string> refusal_of(int64_t shard);
    void check_tables();
    void check_places();
    bool post_segment(int64_t shard, uint64_t least);
    uint64_t tail_tracks(const std::string& condition);
    void look_for_servers(const StoreError& error);
    std::vector<RankedPlace> places(const char* function, const char* table,
                                    const ShardBytes& query);

    Sessions sessions_;
    bool partial_;
    mutable std::mutex mutex_; ///< of what is missing
    Shards shards_;
};

} // namespace kzcat::postgresql
