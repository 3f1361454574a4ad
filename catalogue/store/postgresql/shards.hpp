/// @file
/// The databases that keep a catalogue's codes: its own, and its shards.
#pragma once

#include <chrono>
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
    /// `own` is the catalogue's session.
    Shards(Connection& own, std::string catalogue);

    /// The session with a shard, made when it is first wanted; shard 0 is the catalogue's own.
    /// Throws StoreError, with the shard's number in its text.
    Connection& at(int64_t shard);

    /// The same for a caller that others wait for. A shard whose host is silent, so that to wait
    /// for it takes long, is not tried again for a minute: what was thrown then is thrown at once.
    Connection& promptly(int64_t shard);

    /// Asks the shard for an answer, so that one whose host is silent is waited for now, and not by
    /// promptly(). What fails is met again by what needs it.
    void reach(int64_t shard);

    /// The same for every shard that had no session yet, since connecting makes the tables of a new
    /// one.
    void reach_new();

    /// Runs `act`, which uses a shard; when it has waited in vain for that the shard is noted as
    /// silent.
    template <class Act>
    void note_silence(int64_t shard, Act act)
    {
        const auto begin = Clock::now();
        try {
            act();
        } catch (const StoreError& error) {
            if (Clock::now() - begin > kLongWait) {
                note(shard, error);
            }
            throw;
        }
    }

    /// A second session with the catalogue's own database, for what must outlast a transaction of
    /// the first.
    Connection& aside();

    /// Where new tracks may go, in rising order, as it was first asked for; empty: the catalogue's
    /// own database.
    const std::vector<int64_t>& numbers();

    /// Where the codes of a new track go: the same for the same key as long as the shards are.
    int64_t place_of(const ContentKey& key);

private:
    using Clock = std::chrono::steady_clock;
    static constexpr std::chrono::seconds kLongWait{1};
    static constexpr std::chrono::minutes kPause{1};
    struct Silence {
        Clock::time_point until;
        StoreError error;
    };

    std::unique_ptr<Connection> connect(int64_t shard);
    void note(int64_t shard, const StoreError& error);

    Connection& own_;
    std::string catalogue_;
    std::map<int64_t, std::unique_ptr<Connection>> sessions_;
    std::map<int64_t, Silence> silent_;
    std::unique_ptr<Connection> aside_;
    std::optional<std::vector<int64_t>> numbers_;
};

} // namespace kzcat::postgresql
