// Trail files: any bytes, and files whose fields are changed under checksums that are right. What
// is read is written as the very same bytes; everything else is refused with a sentence.

#include <algorithm>

#include "catalogue/model/crc32c.hpp"
#include "catalogue/model/trail_file.hpp"
#include "fuzz.hpp"

namespace kz::fuzz {

namespace {

using Bytes = std::vector<std::byte>;

constexpr size_t kCodesSumAt = 56;
constexpr size_t kHeaderSumAt = 60;
constexpr size_t kHeaderSize = 64;

void put(Bytes& bytes, size_t at, uint32_t number)
{
    for (size_t i = 0; i < sizeof number; ++i) {
        bytes[at + i] = static_cast<std::byte>(number >> (8 * i));
    }
}

void mend_checksums(Bytes& bytes, bool of_codes, bool of_header)
{
    const std::span<const std::byte> all(bytes);
    if (of_codes && bytes.size() >= kHeaderSize) {
        put(bytes, kCodesSumAt, kzcat::crc32c(all.subspan(kHeaderSize)));
    }
    if (of_header && bytes.size() >= kHeaderSize) {
        put(bytes, kHeaderSumAt, kzcat::crc32c(all.first(kHeaderSumAt)));
    }
}

} // namespace

void run(Choices& choices)
{
    const bool mend_codes = choices.ConsumeBool();
    const bool mend_header = choices.ConsumeBool();
    const auto chosen = choices.ConsumeRemainingBytes<uint8_t>();
    Bytes bytes(chosen.size());
    std::transform(chosen.begin(), chosen.end(), bytes.begin(),
                   [](uint8_t byte) { return static_cast<std::byte>(byte); });
    mend_checksums(bytes, mend_codes, mend_header);
    const Copy copy(bytes.data(), bytes.size(), bytes.size() % 8);
    try {
        const kzcat::Trail trail =
            kzcat::read_trail(std::as_bytes(std::span(copy.data(), bytes.size())));
        EXPECT_EQ(bytes, kzcat::write_trail(trail));
    } catch (const kzcat::TrailError& error) {
        EXPECT_EQ('.', std::string(error.what()).back());
    }
}

} // namespace kz::fuzz
