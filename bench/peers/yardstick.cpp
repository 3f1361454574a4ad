// What the machine itself can do: copying and reading memory.

#include <cstring>
#include <memory>
#include <numeric>

#include "measure/aligned.hpp"
#include "peers/peers.hpp"

namespace kz::bench {

// Between what is copied and the copy. Half a page: a store does not look like the loads behind it.
constexpr size_t kApart = 2048;

Peer copying(size_t bytes, size_t times)
{
    struct Buffers {
        explicit Buffers(size_t half) : size(half), room(half * 2 + kApart, 1) {}
        void copy() { std::memcpy(room.data() + size + kApart, room.data(), size); }
        size_t size;
        Aligned<uint8_t> room;
    };
    const auto buffers = std::make_shared<Buffers>(bytes / 2);
    return {kCopying, [buffers, times] {
                for (size_t i = 0; i < 2 * times; ++i) {
                    buffers->copy();
                    keep(buffers->room.data());
                }
            }};
}

Peer reading(size_t bytes, size_t times)
{
    const auto words = std::make_shared<const Aligned<uint32_t>>(bytes / sizeof(uint32_t), 1U);
    return {kReading, [words, times] {
                for (size_t i = 0; i < times; ++i) {
                    const uint32_t sum = std::accumulate(words->begin(), words->end(), 0U);
                    keep(&sum);
                }
            }};
}

} // namespace kz::bench
