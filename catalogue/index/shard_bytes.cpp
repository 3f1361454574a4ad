/// @file
/// What travels between a client and the servers that have the tracks, as bytes.

#include "catalogue/index/shard_bytes.hpp"

#include <algorithm>
#include <cmath>

#include "catalogue/index/byte_streams.hpp"

namespace kzcat {

namespace {

using Writer = ByteWriter;
using Reader = ByteReader;

void put_looks(Writer& writer, std::span<const Look> looks)
{
    writer.put(static_cast<uint32_t>(looks.size()));
    for (const Look& look : looks) {
        writer.put(look.track);
        writer.put(look.position);
    }
}

std::vector<Look> get_looks(Reader& reader)
{
    std::vector<Look> looks(reader.count(16));
    for (Look& look : looks) {
        look.track = reader.get<int64_t>();
        look.position = reader.get<int64_t>();
    }
    return looks;
}

void put_reading(Writer& writer, const Reading& reading, uint32_t limit)
{
    writer.put(limit);
    writer.put(static_cast<uint32_t>(reading.sequences.size()));
    for (const Sequence& sequence : reading.sequences) {
        writer.put(static_cast<uint32_t>(sequence.codes.size()));
        writer.put_all(std::span(sequence.codes));
        writer.put_all(std::span(sequence.masks));
    }
}

Reading get_reading(Reader& reader)
{
    Reading reading;
    reading.sequences.resize(reader.count(4));
    for (Sequence& sequence : reading.sequences) {
        const uint32_t length = reader.count(16);
        // Scores are counted in 16 bits.
        if (length > kMostProbes) {
            throw ShardBytesError("a sequence is longer than any clip's");
        }
        sequence.codes = reader.get_all<uint64_t>(length);
        sequence.masks = reader.get_all<uint64_t>(length);
    }
    return reading;
}

void put_plan(Writer& writer, const PassPlan& plan)
{
    writer.put(static_cast<uint32_t>(plan.codes));
    writer.put(plan.spread.mean);
    writer.put(plan.spread.deviation);
    writer.put(uint32_t{plan.limit.has_value()});
    writer.put(plan.limit.value_or(0));
}

PassPlan get_plan(Reader& reader)
{
    PassPlan plan;
    plan.codes = reader.get<uint32_t>();
    plan.spread.mean = reader.get<double>();
    plan.spread.deviation = reader.get<double>();
    // A population's deviation is never smaller. Others would make agreements that have no order.
    if (!std::isfinite(plan.spread.mean) || !(plan.spread.deviation >= 1) ||
        std::isinf(plan.spread.deviation)) {
        throw ShardBytesError("the spread of a plan is none that a population has");
    }
    const bool has_limit = reader.get<uint32_t>() != 0;
    const auto limit = reader.get<uint32_t>();
    if (has_limit) {
        plan.limit = limit;
    }
    return plan;
}

uint64_t big_endian(std::span<const std::byte> bytes)
{
    uint64_t number = 0;
    for (const std::byte byte : bytes) {
        number = number << 8 | std::to_integer<uint64_t>(byte);
    }
    return number;
}

} // namespace

CountQuery count_query(const Reading& reading, std::span<const PartProbe> probes)
{
    CountQuery query;
    for (const Sequence& sequence : reading.sequences) {
        query.length = std::max(query.length, static_cast<uint32_t>(sequence.codes.size()));
    }
    std::vector<PartProbe> sorted(probes.begin(), probes.end());
    std::ranges::stable_sort(
        sorted, {}, [](const PartProbe& probe) { return list_number(probe.part, probe.value); });
    for (const PartProbe& probe : sorted) {
        const int32_t list = list_number(probe.part, probe.value);
        const auto at = static_cast<uint32_t>(query.codes.size());
        if (query.lists.empty() || query.lists.back().list != list) {
            query.lists.push_back({.list = list, .begin = at, .end = at});
        }
        query.codes.push_back(static_cast<uint16_t>(probe.code));
        ++query.lists.back().end;
    }
    return query;
}

ShardBytes to_bytes(const CountQuery& query)
{
    Writer writer;
    writer.put(query.length);
    writer.put(static_cast<uint32_t>(query.lists.size()));
    for (const auto& list : query.lists) {
        writer.put(list.list);
        writer.put(list.end - list.begin);
    }
    writer.put_all(std::span<const uint16_t>(query.codes));
    return writer.take();
}

CountQuery to_count_query(std::span<const std::byte> bytes)
{
    Reader reader(bytes);
    CountQuery query;
    query.length = reader.get<uint32_t>();
    query.lists.resize(reader.count(8));
    uint32_t codes = 0;
    for (auto& list : query.lists) {
        list.list = reader.get<int32_t>();
        list.begin = codes;
        const uint64_t end = uint64_t{codes} + reader.get<uint32_t>();
        if (end > bytes.size()) {
            throw ShardBytesError("a list has more codes than there are");
        }
        codes = static_cast<uint32_t>(end);
        list.end = codes;
    }
    query.codes = reader.get_all<uint16_t>(codes);
    reader.expect_end();
    const bool fits =
        query.length <= kMostProbes &&
        std::ranges::all_of(query.codes, [&](uint16_t code) { return code < query.length; });
    if (!fits || !std::ranges::is_sorted(query.lists, {}, &CountQuery::List::list)) {
        throw ShardBytesError("codes lie beyond the sequence, or lists are out of order");
    }
    return query;
}

ShardBytes to_bytes(std::span<const Look> looks)
{
    Writer writer;
    put_looks(writer, looks);
    return writer.take();
}

std::vector<Look> to_looks(std::span<const std::byte> bytes)
{
    Reader reader(bytes);
    auto looks = get_looks(reader);
    reader.expect_end();
    return looks;
}

ShardBytes to_bytes(const Reading& reading, uint32_t limit, std::span<const CoarsePhase> phases)
{
    Writer writer;
    put_reading(writer, reading, limit);
    writer.put(static_cast<uint32_t>(phases.size()));
    for (const CoarsePhase& phase : phases) {
        put_plan(writer, phase.plan);
    }
    put_looks(writer, {});
    return writer.take();
}

ShardBytes to_bytes(const Reading& reading, uint32_t limit, std::span<const Look> looks)
{
    Writer writer;
    put_reading(writer, reading, limit);
    writer.put(uint32_t{0});
    put_looks(writer, looks);
    return writer.take();
}

ShardReading to_shard_reading(std::span<const std::byte> bytes)
{
    Reader reader(bytes);
    ShardReading read;
    read.limit = reader.get<uint32_t>();
    read.reading = get_reading(reader);
    const uint32_t plans = reader.count(28);
    if (2 * uint64_t{plans} > read.reading.sequences.size() + 1) {
        throw ShardBytesError("there are more plans than phases");
    }
    for (uint32_t i = 0; i < plans; ++i) {
        read.plans.push_back(get_plan(reader));
    }
    read.looks = get_looks(reader);
    reader.expect_end();
    if (!std::ranges::is_sorted(read.looks, {}, &Look::track)) {
        throw ShardBytesError("looks are out of order");
    }
    return read;
}

ShardBytes to_bytes(std::span<const RankedPlace> places)
{
    Writer writer;
    writer.put(static_cast<uint32_t>(places.size()));
    for (const RankedPlace& place : places) {
        writer.put(place.place.track);
        writer.put(place.place.phase);
        writer.put(place.place.position);
        writer.put(place.agreement);
    }
    return writer.take();
}

std::vector<RankedPlace> to_places(std::span<const std::byte> bytes)
{
    Reader reader(bytes);
    std::vector<RankedPlace> places(reader.count(28));
    for (RankedPlace& place : places) {
        place.place.track = reader.get<int64_t>();
        place.place.phase = reader.get<uint32_t>();
        place.place.position = reader.get<int64_t>();
        place.agreement = reader.get<double>();
        if (std::isnan(place.agreement)) {
            throw ShardBytesError("an agreement is not a number");
        }
    }
    reader.expect_end();
    return places;
}

std::vector<uint64_t> to_lengths(std::span<const std::byte> bytes)
{
    Reader reader(bytes);
    auto lengths = reader.get_all<uint64_t>(kPartValues);
    reader.expect_end();
    // No sum of these wraps, over any number of servers.
    if (std::ranges::any_of(lengths, [](uint64_t words) { return words >> 40U != 0; })) {
        throw ShardBytesError("a list is longer than servers have room for");
    }
    return lengths;
}

std::vector<TrackSpan> to_track_spans(std::span<const std::byte> bytes)
{
    if (bytes.size() % 16 != 0) {
        throw ShardBytesError("the tracks of a segment do not take 16 bytes each");
    }
    std::vector<TrackSpan> tracks;
    uint64_t codes = 0;
    for (; !bytes.empty(); bytes = bytes.subspan(16)) {
        const uint64_t count = big_endian(bytes.subspan(8, 8));
        tracks.push_back({.id = static_cast<int64_t>(big_endian(bytes.first(8))),
                          .first = codes,
                          .count = count});
        codes += count;
        if (count > kMaxIndexedCodes || codes > kMaxIndexedCodes) {
            throw ShardBytesError("a segment has more codes than lists can count");
        }
    }
    return tracks;
}

} // namespace kzcat
