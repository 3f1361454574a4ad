// Sessions with the databases that keep codes.

#include "catalogue/store/postgresql/shards.hpp"

#include <utility>

#include "catalogue/store/little_endian.hpp"
#include "catalogue/store/postgresql/address.hpp"
#include "catalogue/store/postgresql/opening.hpp"

namespace kzcat::postgresql {

namespace {

/// What is known of the own session goes for a shard whose address is silent about it. A password
/// goes with its user, and to other servers only where it was written into the address: what libpq
/// finds in ~/.pgpass it finds for each server by itself.
ConnectionOptions options_for(const Connection& own, const std::string& address,
                              const std::string& name)
{
    ConnectionOptions options = own.options();
    options.name = name;
    options.user.clear();
    options.password.clear();
    if (!names_user(address)) {
        options.user = own.user();
        options.password = password_in(own.address());
    }
    return options;
}

} // namespace

Shards::Shards(Connection& own, std::string catalogue) : own_(own), catalogue_(std::move(catalogue))
{
}

Connection& Shards::at(int64_t shard)
{
    if (shard == 0) {
        return own_;
    }
    note_silence(shard, [this, shard] {
        auto& session = sessions_[shard];
        if (session == nullptr) {
            session = connect(shard);
        }
        session->ensure_connected();
        silent_.erase(shard); // a session that was lost is a new one
    });
    return *sessions_[shard];
}

/// Of what fails late only what was lost was silent: others report that a disk is full, or that
/// another writer is at it.
void Shards::note(int64_t shard, const StoreError& error)
{
    const auto& session = sessions_[shard];
    if (session == nullptr || session->is_lost()) {
        silent_.insert_or_assign(shard, Silence{.until = Clock::now() + kPause, .error = error});
    }
}

Connection& Shards::promptly(int64_t shard)
{
    const auto silence = silent_.find(shard);
    if (silence != silent_.end() && Clock::now() < silence->second.until) {
        throw StoreError(silence->second.error);
    }
    return at(shard);
}

void Shards::reach(int64_t shard)
{
    try {
        note_silence(shard, [this, shard] { promptly(shard).query("SELECT 1"); });
    } catch (const StoreError&) {
        return; // what needs it meets the same
    }
}

void Shards::reach_new()
{
    for (const int64_t shard : numbers()) {
        const auto session = sessions_.find(shard);
        if (session == sessions_.end() || session->second == nullptr) {
            reach(shard);
        }
    }
}

std::unique_ptr<Connection> Shards::connect(int64_t shard)
{
    const std::string name = own_.name() + ", shard " + std::to_string(shard);
    const Rows rows = own_.query("SELECT address FROM shard WHERE number = $1", shard);
    if (rows.empty()) {
        throw StoreError(StoreError::Kind::damaged,
                         name + ": its address is missing; put it back into the table kzcat.shard");
    }
    const std::string address(rows.text(0, 0));
    auto session = std::make_unique<Connection>(address, options_for(own_, address, name));
    check_shard(*session, catalogue_, shard);
    return session;
}

Connection& Shards::aside()
{
    if (aside_ == nullptr) {
        aside_ = std::make_unique<Connection>(own_.address(), own_.options());
    }
    return *aside_;
}

const std::vector<int64_t>& Shards::numbers()
{
    if (!numbers_) {
        const Rows rows = own_.query("SELECT number FROM shard ORDER BY number");
        std::vector<int64_t> numbers;
        for (int row = 0; row < rows.count(); ++row) {
            numbers.push_back(rows.integer(row, 0));
        }
        numbers_ = std::move(numbers);
    }
    return *numbers_;
}

int64_t Shards::place_of(const ContentKey& key)
{
    const std::vector<int64_t>& all = numbers();
    if (all.empty()) {
        return 0;
    }
    const auto hash = get_little_endian<uint64_t>(std::as_bytes(std::span(key)).data());
    return all[static_cast<size_t>(hash % all.size())];
}

} // namespace kzcat::postgresql
