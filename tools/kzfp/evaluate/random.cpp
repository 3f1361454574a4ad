// Normal numbers are made in pairs by the transform of Box and Muller (1958).

#include "kzfp/evaluate/random.hpp"

#include <cmath>
#include <numbers>

namespace kzfp::evaluate {

/// FNV-1a of the name, begun with the seed.
Random::Random(uint64_t seed, std::string_view name) : state_(0xcbf29ce484222325U ^ seed)
{
    for (const char c : name) {
        state_ = (state_ ^ static_cast<unsigned char>(c)) * 0x100000001b3U;
    }
}

uint64_t Random::next()
{
    state_ += 0x9e3779b97f4a7c15U;
    uint64_t mixed = state_;
    mixed = (mixed ^ (mixed >> 30U)) * 0xbf58476d1ce4e5b9U;
    mixed = (mixed ^ (mixed >> 27U)) * 0x94d049bb133111ebU;
    return mixed ^ (mixed >> 31U);
}

uint64_t Random::below(uint64_t bound)
{
    const uint64_t uneven = (UINT64_MAX - bound + 1) % bound;
    for (;;) {
        const uint64_t drawn = next();
        if (drawn >= uneven) {
            return drawn % bound;
        }
    }
}

double Random::unit() { return (static_cast<double>(next() >> 11U) + 1) * 0x1p-53; }

double Random::normal()
{
    if (has_spare_) {
        has_spare_ = false;
        return spare_;
    }
    const double radius = std::sqrt(-2 * std::log(unit()));
    const double angle = 2 * std::numbers::pi * unit();
    spare_ = radius * std::sin(angle);
    has_spare_ = true;
    return radius * std::cos(angle);
}

} // namespace kzfp::evaluate
