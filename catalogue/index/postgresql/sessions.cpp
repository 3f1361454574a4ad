/// @file
/// Sessions for several threads, and the lengths of lists.

#include "catalogue/index/postgresql/sessions.hpp"

#include "catalogue/index/shard_bytes.hpp"

namespace kzcat::postgresql {

const char* const kSearchSession = "SET enable_partitionwise_aggregate = on; "
                                   "SET plan_cache_mode = force_generic_plan; SET jit = off";

std::vector<int64_t> numbers_in(const Rows& rows)
{
    std::vector<int64_t> numbers;
    for (int row = 0; row < rows.count(); ++row) {
        numbers.push_back(rows.integer(row, 0));
    }
    return numbers;
}

std::unique_ptr<Connection> Sessions::take()
{
    {
        const std::scoped_lock lock(mutex_);
        if (!free_.empty()) {
            auto session = std::move(free_.back());
            free_.pop_back();
            return session;
        }
    }
    return std::make_unique<Connection>(
        address_, ConnectionOptions{.session = kSearchSession, .any_server = any_server_});
}

void Sessions::give_back(std::unique_ptr<Connection> session)
{
    const std::scoped_lock lock(mutex_);
    free_.push_back(std::move(session));
}

void SummedLengths::add(uint32_t part, Bytes lengths)
{
    const std::vector<uint64_t> added = to_lengths(lengths);
    for (uint32_t value = 0; value < kPartValues; ++value) {
        lengths_[size_t{part} * kPartValues + value] += added[value];
        total_ += added[value];
    }
}

} // namespace kzcat::postgresql
