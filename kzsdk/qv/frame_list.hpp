/// @file
/// The frame manager's list of feature records, and the rules by which frames are skipped and
/// limited. A twin brings its manager and record, whose fields have the same names.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <new>
#include <type_traits>

#include "kzsdk/abs/owned.hpp"

namespace kz::qv {

/// Whether the fingerprint is complete; never without a limit.
template <class Manager>
bool reached_limit(const Manager& manager) noexcept
{
    return manager.frame_limit != 0 && manager.frame_count >= manager.frame_limit;
}

/// Whether the next frame is to be analysed. Counts down the frames to skip.
template <class Manager>
bool admits_frame(Manager& manager) noexcept
{
    if (manager.skip_remaining != 0) {
        --manager.skip_remaining;
        return false;
    }
    return !reached_limit(manager);
}

/// Allocates a record with room for `bands` values of each kind, in one block.
template <class Record>
owned<Record> make_frame_record(uint32_t bands) noexcept
{
    using Energy = std::remove_pointer_t<decltype(Record::energy)>;
    using Amplitude = std::remove_pointer_t<decltype(Record::amplitude)>;
    static_assert(sizeof(Record) % alignof(Energy) == 0 &&
                  sizeof(Energy) % alignof(Amplitude) == 0);
    const uint64_t energies = uint64_t{bands} * sizeof(Energy);
    auto block =
        make_array<std::byte>(sizeof(Record) + energies + uint64_t{bands} * sizeof(Amplitude));
    if (!block) {
        return nullptr;
    }
    std::byte* const first = block.get();
    auto* const record = new (block.release()) Record{};
    record->energy = reinterpret_cast<Energy*>(first + sizeof(Record));
    record->amplitude = reinterpret_cast<Amplitude*>(first + sizeof(Record) + energies);
    return owned<Record>(record);
}

/// Links a record at the end, through the last link of the list; the manager owns it from then on.
template <class Manager, class Record>
void append_record(Manager& manager, owned<Record> record) noexcept
{
    record->next = nullptr;
    *manager.records_tail = record.get();
    manager.records_tail = &record->next;
    static_cast<void>(record.release());
    ++manager.frame_count;
    manager.fingerprint_ready = 0;
}

/// Moves all records of `more` to the end of the manager's list. The fingerprint is made anew
/// afterwards, also when there were none to move.
template <class Manager, class List>
void append_records(Manager& manager, List& more) noexcept
{
    manager.fingerprint_ready = 0;
    if (more.records == nullptr) {
        return;
    }
    *manager.records_tail = more.records;
    manager.records_tail = more.records_tail;
    manager.frame_count += more.frame_count;
    more.records = nullptr;
}

/// Empties the list.
template <class Manager>
void drop_records(Manager& manager) noexcept
{
    for (auto* record = manager.records; record != nullptr;) {
        auto* const next = record->next;
        static_cast<void>(_kzmem_free(record));
        record = next;
    }
    manager.records = nullptr;
    manager.records_tail = &manager.records;
    manager.frame_count = 0;
    manager.fingerprint_ready = 0;
}

/// Back to the state after creation.
template <class Manager>
void reset_frames(Manager& manager) noexcept
{
    drop_records(manager);
    manager.skip_remaining = manager.skip_frames;
}

/// Takes the limits of a configuration into a new, cleared manager.
template <class Manager, class Config>
void adopt_limits(Manager& manager, const Config& config) noexcept
{
    manager.skip_frames = config.skip_frames;
    manager.frame_limit = config.frame_limit;
    manager.fingerprint_scale = config.fingerprint_scale;
    reset_frames(manager);
}

/// Frames kept in percent of the limit; 0 without one.
template <class Manager>
uint32_t percent_progress(const Manager& manager) noexcept
{
    if (manager.frame_limit == 0) {
        return 0;
    }
    return std::min(manager.frame_count * 100 / manager.frame_limit, 100U);
}

/// Bytes of the fingerprint: two 16-bit values per band.
template <class Manager>
uint32_t fingerprint_size(const Manager& manager) noexcept
{
    return manager.band_count * 4;
}

/// Copies the fingerprint out; `compute(manager)` makes it first when frames came since the last
/// time.
///
/// @return Bytes written: 0 when it cannot be made or does not fit.
template <class Manager, class Compute>
uint32_t read_fingerprint(Manager& manager, void* destination, uint32_t capacity,
                          Compute compute) noexcept
{
    if (manager.fingerprint_ready == 0) {
        compute(manager);
    }
    const uint32_t size = fingerprint_size(manager);
    if (manager.fingerprint_ready == 0 || capacity < size) {
        return 0;
    }
    std::memcpy(destination, manager.fingerprint, size);
    return size;
}

} // namespace kz::qv
