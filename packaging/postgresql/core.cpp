// The work of the extension's functions, without the server: the library's own search, behind C.

#include "core.h"

#include <cstdio>
#include <exception>
#include <new>
#include <optional>
#include <variant>

#include "catalogue/index/shard_search.hpp"

using namespace kzcat;

namespace {

std::span<const std::byte> span_of(const void* bytes, size_t count)
{
    return {static_cast<const std::byte*>(bytes), count};
}

/// Runs a call; false when it throws, and then `error` has the reason.
template <class Call>
bool guarded(char* error, Call call) noexcept
{
    const char* text = "the reason is unknown";
    try {
        call();
        return true;
    } catch (const std::bad_alloc&) {
        text = "memory is short";
    } catch (const std::exception& exception) {
        std::snprintf(error, KZM_ERROR_BYTES, "%s", exception.what());
        return false;
    } catch (...) {
    }
    std::snprintf(error, KZM_ERROR_BYTES, "%s", text);
    return false;
}

uint32_t part_in(std::span<const std::byte> query)
{
    if (query.size() != 1 || std::to_integer<uint32_t>(query[0]) >= kParts) {
        throw ShardBytesError("there is no such part of codes");
    }
    return std::to_integer<uint32_t>(query[0]);
}

using Work = std::variant<HitCounter, Ranker, Scanner, PostingBuilder, LengthSum>;

} // namespace

struct kzm_state {
    kzm_kind kind;
    ShardBytes query;
    Work work;
    std::vector<Ranker::Range> ranges;
    std::vector<Code> codes;
    ShardBytes result;

    static Work make(kzm_kind kind, std::span<const std::byte> query)
    {
        switch (kind) {
        case KZM_COUNT:
            return HitCounter(query);
        case KZM_RANK:
            return Ranker(query);
        case KZM_SCAN:
            return Scanner(query);
        case KZM_LENGTHS:
            return LengthSum();
        default:
            return PostingBuilder(part_in(query));
        }
    }
    kzm_state(kzm_kind of, std::span<const std::byte> bytes)
        : kind(of), query(bytes.begin(), bytes.end()), work(make(of, bytes))
    {
    }

    /// What the aggregate has found so far, in the form in which another can take it in.
    ShardBytes found() const
    {
        if (const auto* sum = std::get_if<LengthSum>(&work)) {
            return sum->lengths();
        }
        if (const auto* ranker = std::get_if<Ranker>(&work)) {
            return to_bytes(std::span<const RankedPlace>(ranker->places()));
        }
        return to_bytes(std::span<const RankedPlace>(std::get<Scanner>(work).places()));
    }
    void add(std::span<const std::byte> found)
    {
        if (auto* sum = std::get_if<LengthSum>(&work)) {
            sum->add(found);
        } else if (auto* ranker = std::get_if<Ranker>(&work)) {
            ranker->add(to_places(found));
        } else {
            std::get<Scanner>(work).add(to_places(found));
        }
    }
};

kzm_state* kzm_create(kzm_kind kind, const void* query, size_t bytes, char* error)
{
    kzm_state* state = nullptr;
    guarded(error, [&] { state = new kzm_state(kind, span_of(query, bytes)); });
    return state;
}

void kzm_free(kzm_state* state) { delete state; }

bool kzm_count(kzm_state* state, int32_t segment, int32_t list, const void* words, size_t bytes,
               char* error)
{
    return guarded(error, [&] {
        std::get<HitCounter>(state->work).add(segment, list, span_of(words, bytes));
    });
}

bool kzm_ranges(kzm_state* state, int64_t track, uint64_t codes, size_t* ranges, char* error)
{
    return guarded(error, [&] {
        state->ranges = std::get<Ranker>(state->work).ranges(track, codes);
        *ranges = state->ranges.size();
    });
}

void kzm_range(const kzm_state* state, size_t number, uint64_t* begin, uint64_t* end)
{
    *begin = state->ranges[number].begin;
    *end = state->ranges[number].end;
}

bool kzm_track(kzm_state* state, int64_t track, const void* codes, uint64_t count, char* error)
{
    return guarded(error, [&] {
        get_little_endian(span_of(codes, static_cast<size_t>(count) * sizeof(Code)), state->codes);
        if (auto* ranker = std::get_if<Ranker>(&state->work)) {
            ranker->add(track, state->codes);
        } else if (auto* scanner = std::get_if<Scanner>(&state->work)) {
            scanner->add(track, state->codes);
        } else {
            std::get<PostingBuilder>(state->work).add(state->codes);
        }
    });
}

bool kzm_starts(kzm_state* state, const void* starts, size_t bytes, char* error)
{
    return guarded(error,
                   [&] { std::get<LengthSum>(state->work).add_starts(span_of(starts, bytes)); });
}

bool kzm_save(kzm_state* state, const void** bytes, size_t* count, char* error)
{
    return guarded(error, [&] {
        state->result.resize(8);
        put_little_endian(uint64_t{state->query.size()}, state->result.data());
        state->result.insert(state->result.end(), state->query.begin(), state->query.end());
        const ShardBytes found = state->found();
        state->result.insert(state->result.end(), found.begin(), found.end());
        *bytes = state->result.data();
        *count = state->result.size();
    });
}

kzm_state* kzm_load(kzm_kind kind, const void* bytes, size_t count, char* error)
{
    kzm_state* loaded = nullptr;
    guarded(error, [&] {
        const auto saved = span_of(bytes, count);
        if (count < 8 || get_little_endian<uint64_t>(saved.data()) > count - 8) {
            throw ShardBytesError("a saved state is damaged");
        }
        const auto length = static_cast<size_t>(get_little_endian<uint64_t>(saved.data()));
        auto state = std::make_unique<kzm_state>(kind, saved.subspan(8, length));
        state->add(saved.subspan(8 + length));
        loaded = state.release();
    });
    return loaded;
}

kzm_state* kzm_copy(kzm_state* state, char* error)
{
    const void* bytes = nullptr;
    size_t count = 0;
    return kzm_save(state, &bytes, &count, error) ? kzm_load(state->kind, bytes, count, error)
                                                  : nullptr;
}

bool kzm_join(kzm_state* state, kzm_state* other, char* error)
{
    return guarded(error, [&] { state->add(other->found()); });
}

bool kzm_result(kzm_state* state, const void** bytes, size_t* count, char* error)
{
    return guarded(error, [&] {
        if (const auto* counter = std::get_if<HitCounter>(&state->work)) {
            state->result = to_bytes(std::span<const Look>(counter->looks()));
        } else if (const auto* builder = std::get_if<PostingBuilder>(&state->work)) {
            BuiltTable table = builder->build();
            state->result = std::move(table.starts);
            state->result.insert(state->result.end(), table.words.begin(), table.words.end());
        } else {
            state->result = state->found();
        }
        *bytes = state->result.data();
        *count = state->result.size();
    });
}

size_t kzm_starts_bytes(void) { return size_t{4} * (kPartValues + 1); }

bool kzm_is_table(const void* table, size_t bytes)
{
    const auto all = span_of(table, bytes);
    return bytes >= kzm_starts_bytes() &&
           fault_of({.starts = all.first(kzm_starts_bytes()),
                     .words = all.subspan(kzm_starts_bytes())}) == nullptr;
}

bool kzm_list(const void* table, size_t bytes, uint32_t value, size_t* begin, size_t* end)
{
    const auto all = span_of(table, bytes);
    if (value >= kPartValues || bytes < kzm_starts_bytes()) {
        return false;
    }
    *begin = kzm_starts_bytes() +
             size_t{2} * get_little_endian<uint32_t>(all.data() + size_t{4} * value);
    *end = kzm_starts_bytes() +
           size_t{2} * get_little_endian<uint32_t>(all.data() + size_t{4} * value + 4);
    return *begin <= *end && *end <= bytes;
}
