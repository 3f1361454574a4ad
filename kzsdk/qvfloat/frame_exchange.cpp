/// @file
/// Frame data: the features of a manager's frames as bytes that another manager can append.
///
///     word 0   format version, 1
///     word 1   B, the number of bands
///     word 2   F, the number of frames
///     then for each band, and within it for each frame from the oldest on, two words:
///              its energy and its amplitude, as the bits of a float
///
/// Words have 32 bits, lowest byte first, at any address. The data may come from anywhere: sizes
/// are compared in 64 bits, and nothing is read until they are exactly right. Features are taken
/// as they are, whether they are numbers or not.
#include <algorithm>
#include <bit>
#include <cstddef>
#include <cstring>
#include <limits>
#include <span>
#include <utility>

#include "kzsdk/abs/owned.hpp"
#include "kzsdk/qv/frame_list.hpp"
#include "kzsdk/qvfloat/qvfloat.h"

namespace {

constexpr uint32_t kFormatVersion = 1;
constexpr uint32_t kHeaderBytes = 12;
constexpr uint32_t kPairBytes = 8; // an energy and an amplitude

// Words are little-endian at any address, on every machine.
uint32_t read_word(const std::byte* at) noexcept
{
    uint32_t word = 0;
    for (uint32_t i = 0; i < 4; ++i) {
        word |= std::to_integer<uint32_t>(at[i]) << (8 * i);
    }
    return word;
}

// Returns the place behind the word.
std::byte* write_word(std::byte* at, uint32_t word) noexcept
{
    for (uint32_t i = 0; i < 4; ++i) {
        at[i] = static_cast<std::byte>(word >> (8 * i));
    }
    return at + 4;
}

float read_float(const std::byte* at) noexcept { return std::bit_cast<float>(read_word(at)); }

std::byte* write_float(std::byte* at, float value) noexcept
{
    return write_word(at, std::bit_cast<uint32_t>(value));
}

// In 64 bits, so that no product of bands and frames is mistaken for a smaller one.
uint64_t data_size(uint32_t bands, uint32_t frames) noexcept
{
    return uint64_t{bands} * frames * kPairBytes + kHeaderBytes;
}

// The three words before the features.
struct Header {
    uint32_t version;
    uint32_t bands;
    uint32_t frames;
};

Header read_header(const std::byte* data) noexcept
{
    return {read_word(data), read_word(data + 4), read_word(data + 8)};
}

// Frames without bands hold nothing and could be any number.
bool is_acceptable(const QVFM& m, const Header& header, uint32_t size) noexcept
{
    return header.version == kFormatVersion && header.bands == m.band_count &&
           size == data_size(header.bands, header.frames) &&
           (header.bands != 0 || header.frames == 0);
}

// One frame's features, which lie a whole band's frames apart. Null when memory is short.
kz::owned<QVFrameRecord> read_record(const std::byte* pairs, const Header& header,
                                     uint32_t frame) noexcept
{
    auto record = kz::qv::make_frame_record<QVFrameRecord>(header.bands);
    for (uint32_t band = 0; record && band < header.bands; ++band) {
        const std::byte* pair = pairs + (size_t{band} * header.frames + frame) * kPairBytes;
        record->energy[band] = read_float(pair);
        record->amplitude[band] = read_float(pair + 4);
    }
    return record;
}

// The frames that are neither skipped nor beyond the limit, as a range of the data's.
struct Range {
    uint32_t first;
    uint32_t end;
};

// Frames to skip are taken from the front first, then the limit cuts the end.
Range admitted_frames(const QVFM& m, uint32_t frames) noexcept
{
    const uint32_t first = std::min(m.skip_remaining, frames);
    uint32_t end = frames;
    if (m.frame_limit != 0) {
        const uint32_t room = m.frame_limit - std::min(m.frame_limit, m.frame_count);
        end = first + std::min(frames - first, room);
    }
    return {first, end};
}

// A list of new records that is freed unless it is passed on.
struct NewRecords {
    QVFrameRecord* records = nullptr;
    QVFrameRecord** records_tail = &records;
    uint32_t frame_count = 0;
    uint32_t fingerprint_ready = 0;

    NewRecords() = default;
    NewRecords(const NewRecords&) = delete;
    NewRecords& operator=(const NewRecords&) = delete;
    ~NewRecords() { kz::qv::drop_records(*this); }
};

// Makes the records of a range of frames. False when memory is short.
bool read_records(const std::byte* data, const Header& header, Range range,
                  NewRecords& made) noexcept
{
    for (uint32_t frame = range.first; frame < range.end; ++frame) {
        auto record = read_record(data + kHeaderBytes, header, frame);
        if (!record) {
            return false;
        }
        kz::qv::append_record(made, std::move(record));
    }
    return true;
}

} // namespace

// ---- writing

uint32_t QVFM_GetFrameDataSize(const QVFM* manager) noexcept
{
    if (manager == nullptr) {
        return 0;
    }
    // A size that does not fit is 0, which no caller can take for one: the header has 12 bytes.
    const uint64_t size = data_size(manager->band_count, manager->frame_count);
    return size <= std::numeric_limits<uint32_t>::max() ? static_cast<uint32_t>(size) : 0;
}

uint32_t QVFM_GetFrameData(const QVFM* manager, void* destination, uint32_t capacity) noexcept
{
    const uint32_t size = QVFM_GetFrameDataSize(manager);
    if (size == 0 || destination == nullptr || capacity < size) {
        return 0;
    }
    std::byte* at = static_cast<std::byte*>(destination);
    at = write_word(at, kFormatVersion);
    at = write_word(at, manager->band_count);
    at = write_word(at, manager->frame_count);
    for (uint32_t band = 0; band < manager->band_count; ++band) {
        for (const auto* r = manager->records; r != nullptr; r = r->next) {
            at = write_float(at, r->energy[band]);
            at = write_float(at, r->amplitude[band]);
        }
    }
    return size;
}

// ---- reading

// All or nothing: a record that cannot be made leaves the manager as it was.
uint32_t QVFM_AppendFrameData(QVFM* manager, const void* data, uint32_t size) noexcept
{
    if (manager == nullptr || data == nullptr || size < kHeaderBytes) {
        return 0;
    }
    const auto* bytes = static_cast<const std::byte*>(data);
    const Header header = read_header(bytes);
    if (!is_acceptable(*manager, header, size)) {
        return 0;
    }
    // Records are made before anything changes, and only those that are kept.
    const Range range = admitted_frames(*manager, header.frames);
    NewRecords made;
    if (!read_records(bytes, header, range, made)) {
        return 0;
    }
    manager->skip_remaining -= range.first;
    kz::qv::append_records(*manager, made);
    return 1;
}
