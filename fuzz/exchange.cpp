// Frame data from anywhere: accepted only when it is exactly one block for this number of bands,
// and then returned again together with what was there before, skipped and limited as documented.

#include <algorithm>

#include "fuzz.hpp"
#include "support/float_twin.hpp"

namespace kz::fuzz {

namespace {

using test::Float;
using Bytes = std::vector<uint8_t>;

struct Model {
    uint32_t bands;
    uint32_t skip;
    uint32_t limit;
    std::vector<Bytes> frames; ///< eight bytes for each band
};

uint32_t word_at(const Bytes& bytes, size_t at)
{
    uint32_t word = 0;
    for (size_t i = 4; i > 0; --i) {
        word = word << 8 | bytes[at + i - 1];
    }
    return word;
}

void put_word(Bytes& bytes, uint32_t word)
{
    for (const int shift : {0, 8, 16, 24}) {
        bytes.push_back(static_cast<uint8_t>(word >> shift));
    }
}

bool is_block(const Bytes& bytes, uint32_t bands)
{
    if (bytes.size() < 12 || word_at(bytes, 0) != 1 || word_at(bytes, 4) != bands) {
        return false;
    }
    const uint64_t frames = word_at(bytes, 8);
    return uint64_t{bands} * frames * 8 + 12 == bytes.size() && (bands != 0 || frames == 0);
}

void append(Model& model, const Bytes& bytes)
{
    const uint32_t frames = word_at(bytes, 8);
    for (size_t frame = 0; frame < frames; ++frame) {
        if (model.skip > 0) {
            --model.skip;
            continue;
        }
        if (model.limit != 0 && model.frames.size() >= model.limit) {
            continue;
        }
        Bytes record;
        for (size_t band = 0; band < model.bands; ++band) {
            const auto at =
                bytes.begin() + static_cast<ptrdiff_t>(12 + (band * frames + frame) * 8);
            record.insert(record.end(), at, at + 8);
        }
        model.frames.push_back(record);
    }
}

Bytes exported(const Model& model)
{
    Bytes bytes;
    put_word(bytes, 1);
    put_word(bytes, model.bands);
    put_word(bytes, static_cast<uint32_t>(model.frames.size()));
    for (size_t band = 0; band < model.bands; ++band) {
        for (const Bytes& frame : model.frames) {
            const auto at = frame.begin() + static_cast<ptrdiff_t>(band * 8);
            bytes.insert(bytes.end(), at, at + 8);
        }
    }
    return bytes;
}

/// A block with a header that is right, or nearly.
Bytes choose_block(Choices& choices, uint32_t bands)
{
    if (one_in(choices, 8)) {
        return choices.ConsumeBytes<uint8_t>(choices.ConsumeIntegralInRange<size_t>(0, 64));
    }
    const auto frames = choices.ConsumeIntegralInRange<uint32_t>(0, 20);
    Bytes bytes;
    put_word(bytes, one_in(choices, 16) ? choices.ConsumeIntegral<uint32_t>() : 1);
    put_word(bytes, one_in(choices, 16) ? choices.ConsumeIntegral<uint32_t>() : bands);
    put_word(bytes, one_in(choices, 16) ? choices.ConsumeIntegral<uint32_t>() : frames);
    const auto given = choices.ConsumeBytes<uint8_t>(size_t{8} * bands * frames);
    bytes.insert(bytes.end(), given.begin(), given.end());
    const size_t size = 12 + size_t{8} * bands * frames;
    bytes.resize(one_in(choices, 16) ? choices.ConsumeIntegralInRange<size_t>(0, size + 8) : size,
                 0x3f);
    return bytes;
}

void expect_export(Choices& choices, QVFM* manager, const Model& model)
{
    const Bytes expected = exported(model);
    const auto size = static_cast<uint32_t>(expected.size());
    ASSERT_EQ(model.frames.size(), QVFM_GetFrameCount(manager));
    ASSERT_EQ(size, QVFM_GetFrameDataSize(manager));
    const auto less = choices.ConsumeIntegralInRange<uint32_t>(1, size);
    const size_t offset = choices.ConsumeIntegralInRange<size_t>(0, 3);
    const std::unique_ptr<uint8_t[]> room(new uint8_t[offset + size]);
    ASSERT_EQ(0U, QVFM_GetFrameData(manager, room.get() + offset, size - less));
    ASSERT_EQ(size, QVFM_GetFrameData(manager, room.get() + offset, size));
    ASSERT_EQ(0, std::memcmp(expected.data(), room.get() + offset, size));
}

void expect_fingerprint(QVFM* manager, const Model& model)
{
    const uint32_t size = QVFM_GetFingerprintSize(manager);
    ASSERT_EQ(4 * model.bands, size);
    Bytes room(size);
    ASSERT_EQ(size, QVFM_GetFingerprint(manager, room.data(), size));
}

} // namespace

void run(Choices& choices)
{
    const auto bands = choices.ConsumeIntegralInRange<uint32_t>(1, 15);
    Model model{bands,
                choices.ConsumeIntegralInRange<uint32_t>(0, 3),
                choices.ConsumeIntegralInRange<uint32_t>(0, 14),
                {}};
    const auto skip = model.skip;
    const auto manager = test::make_manager<Float>([&](QVConfig& config) {
        config.freq_table_count = 2 * bands;
        config.skip_frames = model.skip;
        config.frame_limit = model.limit;
        config.frame_length_log2 = 4; // frames are not analysed here
    });
    ASSERT_NE(nullptr, manager);
    for (int calls = 0; calls < 20 && choices.remaining_bytes() > 0; ++calls) {
        const Bytes block = choose_block(choices, bands);
        const Copy copy(block.data(), block.size(), choices.ConsumeIntegralInRange<size_t>(0, 3));
        const bool accepted = is_block(block, bands);
        ASSERT_EQ(accepted ? 1U : 0U, QVFM_AppendFrameData(manager.get(), copy.data(),
                                                           static_cast<uint32_t>(block.size())));
        if (accepted) {
            append(model, block);
        }
        if (one_in(choices, 16)) {
            ASSERT_EQ(KZ_OK, QVFM_Reset(manager.get()));
            model.frames.clear();
            model.skip = skip;
        }
        expect_export(choices, manager.get(), model);
        if (one_in(choices, 4)) {
            expect_fingerprint(manager.get(), model);
        }
    }
}

} // namespace kz::fuzz
