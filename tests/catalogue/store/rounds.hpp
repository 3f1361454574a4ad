// How often tests repeat what they do at random.
#pragma once

#include <cstdint>
#include <cstdlib>

namespace kzcat::test {

/// `usual` rounds, or as many per cent of that as the environment's KZ_STORE_ROUNDS says.
inline uint64_t rounds(uint64_t usual)
{
    const char* percent = std::getenv("KZ_STORE_ROUNDS");
    return percent == nullptr ? usual : usual * std::strtoull(percent, nullptr, 10) / 100;
}

} // namespace kzcat::test
