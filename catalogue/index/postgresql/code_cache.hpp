/// @file
/// Codes of tracks that were fetched from a server, kept while they are likely to be used again.
#pragma once

#include <cstdint>
#include <memory>
#include <mutex>
#include <span>
#include <unordered_map>
#include <vector>

#include "catalogue/match/corpus.hpp"

namespace kzcat::postgresql {

using SharedCodes = std::shared_ptr<const std::vector<Code>>;

/// Several threads may use it at once.
class CodeCache {
public:
    /// Null when they are not here.
    SharedCodes find(int64_t track);
    void put(int64_t track, const SharedCodes& codes);
    void clear();

private:
    std::mutex mutex_;
    std::unordered_map<int64_t, SharedCodes> codes_;
    uint64_t count_ = 0; ///< of all codes
};

/// Codes that stay where they are until the calling thread has held so many others.
constexpr size_t kHeldCodes = 64;
std::span<const Code> hold(SharedCodes codes);

} // namespace kzcat::postgresql
