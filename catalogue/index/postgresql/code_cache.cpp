/// @file
/// Codes of tracks that were fetched from a server.

#include "catalogue/index/postgresql/code_cache.hpp"

#include <array>

namespace kzcat::postgresql {

namespace {

/// 64 MB: some 6000 tracks.
constexpr uint64_t kMostCodes = uint64_t{8} << 20;

} // namespace

SharedCodes CodeCache::find(int64_t track)
{
    const std::scoped_lock lock(mutex_);
    const auto found = codes_.find(track);
    return found == codes_.end() ? nullptr : found->second;
}

void CodeCache::put(int64_t track, const SharedCodes& codes)
{
    const std::scoped_lock lock(mutex_);
    if (count_ > kMostCodes) {
        codes_.clear();
        count_ = 0;
    }
    const uint64_t added = codes->size();
    count_ += codes_.try_emplace(track, codes).second ? added : 0;
}

void CodeCache::clear()
{
    const std::scoped_lock lock(mutex_);
    codes_.clear();
    count_ = 0;
}

std::span<const Code> hold(SharedCodes codes)
{
    thread_local std::array<SharedCodes, kHeldCodes> held;
    thread_local size_t next = 0;
    SharedCodes& place = held[next];
    next = (next + 1) % held.size();
    place = std::move(codes);
    return *place;
}

} // namespace kzcat::postgresql
