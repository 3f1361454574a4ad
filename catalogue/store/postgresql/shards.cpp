// Sessions with the databases that keep codes.

#include "catalogue/store/postgresql/shards.hpp"

#include <utility>

#include "catalogue/store/little_endian.hpp"
#include "catalogue/store/postgresql/opening.hpp"

namespace kzcat::postgresql {

Shards::Shards(Connection& own, std::string address, std::string catalogue)
    : own_(own), address_(std::move(address)), catalogue_(std::move(catalogue))
{
}

Connection& Shards::at(int64_t shard)
{
    if (shard == 0) {
        return own_;
    }
    auto& session = sessions_[shard];
    if (session == nullptr) {
        const std::string name = own_.name() + ", shard " + std::to_string(shard);
        const Rows rows = own_.query("SELECT address FROM shard WHERE number = $1", shard);
        if (rows.empty()) {
            throw StoreError(StoreError::Kind::damaged,
                             name + ": its address is missing; put it back into the table "
                                    "kzcat.shard");
        }
        ConnectionOptions options = own_.options();
        options.name = name;
        options.user = own_.user();
        options.password = own_.password();
        auto fresh = std::make_unique<Connection>(std::string(rows.text(0, 0)), options);
        check_shard(*fresh, catalogue_, shard);
        session = std::move(fresh);
    }
    return *session;
}

Connection& Shards::aside()
{
    if (aside_ == nullptr) {
        aside_ = std::make_unique<Connection>(address_, own_.options());
    }
    return *aside_;
}

const std::vector<int64_t>& Shards::numbers()
{
    if (!numbers_) {
        numbers_.emplace();
        const Rows rows = own_.query("SELECT number FROM shard ORDER BY number");
        for (int row = 0; row < rows.count(); ++row) {
            numbers_->push_back(rows.integer(row, 0));
        }
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
