/// @file
/// The databases that keep a catalogue's codes: its own, and its shards.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "catalogue/store/postgresql/connection.hpp"

namespace kzcat::postgresql {

class Shards {
public:
    /// `own` is the catalogue's session, `address` what it was made with.
    Shards(Connection& own, std::string address, std::string catalogue);

    /// The session with a shard, made when it is first wanted; shard 0 is the catalogue's own.
    /// Throws StoreError, with the shard's number in its text.
    Connection& at(int64_t shard);

    /// A second session with the catalogue's own database, for what must outlast a transaction of
    /// the first.
    Connection& aside();

    /// Where new tracks may go, in rising order, as it was first asked for; empty: the catalogue's
    /// own database.
    const std::vector<int64_t>& numbers();

    /// Where the codes of a new track go: the same for the same key as long as the shards are.
    int64_t place_of(const ContentKey& key);

private:
    Connection& own_;
    std::string address_;
    std::string catalogue_;
    std::map<int64_t, std::unique_ptr<Connection>> sessions_;
    std::unique_ptr<Connection> aside_;
    std::optional<std::vector<int64_t>> numbers_;
};

} // namespace kzcat::postgresql
