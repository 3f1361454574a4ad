/// @file
/// The statements of look-ups. Each travels once, carries everything that is asked, and brings back
/// one row from each server that has tracks.
#pragma once

#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "catalogue/index/index.hpp"
#include "catalogue/index/shard_bytes.hpp"
#include "catalogue/match/population.hpp"
#include "catalogue/store/postgresql/connection.hpp"

namespace kzcat::postgresql {

/// What a session begins with: without the first, whole tables would travel to a coordinator; with
/// the second, statements with thousands of values are not planned anew each time.
extern const char* const kSearchSession;

/// Grouping by the shard is what lets a coordinator have each server do its share: the tables are
/// partitioned by it.
extern const char* const kCountStatement; ///< of the lists $1, by the query $2
extern const char* const kRankStatement;  ///< of the tracks $1, by the query $2

/// Sessions with one server: as many as have ever been in use at once.
class Sessions {
public:
    explicit Sessions(std::string address) : address_(std::move(address)) {}

    /// Gives `use` a session to which it has sole access.
    template <class Use>
    auto with(Use use)
    {
        auto session = take();
        auto result = use(*session);
        give_back(std::move(session)); // one that has failed is closed instead
        return result;
    }

private:
    std::unique_ptr<Connection> take();
    void give_back(std::unique_ptr<Connection> session);

    std::string address_;
    std::mutex mutex_;
    std::vector<std::unique_ptr<Connection>> free_;
};

/// The lengths of all lists, of all segments and servers together.
class SummedLengths final : public ListLengths {
public:
    SummedLengths() : lengths_(size_t{kParts} * kPartValues) {}
    uint64_t words(uint32_t part, uint32_t value) const override
    {
        return lengths_[size_t{part} * kPartValues + value];
    }
    uint64_t total() const { return total_; }

    /// The starts of a part's lists in one segment.
    void add(uint32_t part, Bytes starts);

private:
    std::vector<uint64_t> lengths_;
    uint64_t total_ = 0;
};

/// Several threads may look up at once.
class Lookups {
public:
    Lookups(std::string address, bool partial);

    /// Looks which servers have tracks, and whether they can be searched. Throws StoreError, which
    /// names a cure.
    void refresh();

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
    /// Has tails of so many codes posted, where the user may ask for it.
    void request_posting(uint64_t least);

    Sessions& sessions() { return sessions_; }

private:
    using Ask = std::function<Rows(Connection&, const std::string& where)>;
    Rows ask(const Ask& ask);
    Rows ask(const char* statement, std::span<const int64_t> numbers, Bytes query);
    std::string where() const;
    std::optional<std::string> refusal_of(int64_t shard);
    void look_for_servers(const StoreError& error);
    std::vector<RankedPlace> places(const char* function, const char* table,
                                    const ShardBytes& query);

    Sessions sessions_;
    bool partial_;
    std::vector<int64_t> shards_; ///< empty: all is in one database
    mutable std::mutex mutex_;
    std::vector<int64_t> missing_;
};

} // namespace kzcat::postgresql
