/// @file
/// Sessions for several threads, and the lengths of lists.

#include "catalogue/index/postgresql/sessions.hpp"

#include "catalogue/index/shard_bytes.hpp"

namespace kzcat::postgresql {

const char* const kSearchSession = "SET enable_partitionwise_aggregate = on; "
                                   "SET plan_cache_mode = force_generic_plan; SET jit = off";

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
    auto session = std::make_unique<Connection>(address_);
    session->execute(kSearchSession);
    return session;
}

void Sessions::give_back(std::unique_ptr<Connection> session)
{
    const std::scoped_lock lock(mutex_);
    free_.push_back(std::move(session));
}

void SummedLengths::add(uint32_t part, Bytes starts)
{
    if (starts.size() != 4 * (size_t{kPartValues} + 1)) {
        throw ShardBytesError("the starts of lists have another size than they must have");
    }
    for (uint32_t value = 0; value < kPartValues; ++value) {
        const auto begin = get_little_endian<uint32_t>(starts.data() + size_t{4} * value);
        const auto end = get_little_endian<uint32_t>(starts.data() + size_t{4} * value + 4);
        const uint64_t length = end > begin ? end - begin : 0;
        lengths_[size_t{part} * kPartValues + value] += length;
        total_ += length;
    }
}

} // namespace kzcat::postgresql
