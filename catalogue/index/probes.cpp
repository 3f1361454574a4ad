/// @file
/// Which lists of the part tables a reading looks into.

#include "catalogue/index/probes.hpp"

#include <algorithm>
#include <array>
#include <bit>

namespace kzcat {

namespace {

/// Costs are logarithms of probabilities, in sixteenths of a bit.
constexpr uint32_t kBit = 16;
constexpr uint32_t kMaxCost = 64 * kBit;
constexpr uint32_t kFlippedBits = 5;
constexpr uint32_t kFlips = 1U << kFlippedBits;

/// Lists of average length that one look-up reads when nothing else is asked.
constexpr uint32_t kUsualLists = 4096;

/// The cost of a bit of this strength being wrong rather than right.
constexpr uint32_t flip_cost(uint32_t strength) { return 3 * strength / 4; }

/// The cost of a bit being right: log2(1 + 2^-x) where it is wrong with odds of 1 to 2^x, read
/// between whole x.
constexpr uint32_t right_cost(uint32_t strength)
{
    constexpr std::array<uint32_t, 10> kTable{256, 150, 82, 43, 22, 11, 6, 3, 1, 0};
    const uint32_t odds = flip_cost(strength);
    const uint32_t whole = odds / kBit;
    if (whole + 1 >= kTable.size()) {
        return 0;
    }
    const uint32_t part = odds % kBit;
    return (kTable[whole] * (kBit - part) + kTable[whole + 1] * part) / (kBit * kBit);
}

/// The logarithm of a length, in sixteenths, from its highest five bits.
uint32_t length_cost(uint64_t length)
{
    const auto width = static_cast<uint32_t>(std::bit_width(length));
    if (width <= 5) {
        return kBit * width;
    }
    return kBit * width + (static_cast<uint32_t>(length >> (width - 5)) & 15U);
}

struct WeakBit {
    uint32_t cost = 0;
    uint32_t bit = 0;
    bool operator<(const WeakBit& other) const { return cost < other.cost; }
};

/// A part of a query's code, and what it costs to turn each of its weakest bits.
struct QueryPart {
    uint32_t value = 0;
    uint32_t right_cost = 0;
    std::array<WeakBit, kFlippedBits> weakest;
};

QueryPart query_part(Code code, const BitStrengths& strengths, uint32_t part)
{
    QueryPart query;
    query.value = part_of(code, part);
    std::array<WeakBit, kPartBits> bits;
    for (uint32_t bit = 0; bit < kPartBits; ++bit) {
        const uint32_t strength = strengths[part_bit(part, bit)];
        bits[bit] = {flip_cost(strength), bit};
        query.right_cost += right_cost(strength);
    }
    std::partial_sort(bits.begin(), bits.begin() + kFlippedBits, bits.end(),
                      [](const WeakBit& left, const WeakBit& right) {
                          return left.cost * kPartBits + left.bit <
                                 right.cost * kPartBits + right.bit;
                      });
    std::copy_n(bits.begin(), kFlippedBits, query.weakest.begin());
    return query;
}

/// Probes with their costs, before the budget is spent.
struct Offer {
    PartProbe probe;
    uint32_t cost = 0;
};

class Offers {
public:
    explicit Offers(const ListLengths& lengths) : lengths_(lengths) {}

    void add(const QueryPart& query, uint32_t part, uint32_t code)
    {
        for (uint32_t flips = 0; flips < kFlips; ++flips) {
            uint32_t value = query.value;
            uint32_t cost = query.right_cost;
            for (uint32_t i = 0; i < kFlippedBits; ++i) {
                if ((flips >> i & 1U) != 0) {
                    value ^= 1U << query.weakest[i].bit;
                    cost += query.weakest[i].cost;
                }
            }
            add({part, value, code}, cost);
        }
    }

    /// Those of least cost; of equal cost all or none.
    std::vector<PartProbe> within(uint64_t budget) const
    {
        uint32_t limit = 0;
        uint64_t words = 0;
        while (limit < kMaxCost && words + words_[limit] <= budget) {
            words += words_[limit++];
        }
        std::vector<PartProbe> chosen;
        for (const auto& offer : offers_) {
            if (offer.cost < limit) {
                chosen.push_back(offer.probe);
            }
        }
        return chosen;
    }

private:
    void add(const PartProbe& probe, uint32_t cost)
    {
        const uint64_t words = lengths_.words(probe.part, probe.value);
        cost += length_cost(words);
        if (words > 0 && cost < kMaxCost) {
            offers_.push_back({probe, cost});
            words_[cost] += words;
        }
    }

    const ListLengths& lengths_;
    std::vector<Offer> offers_;
    std::array<uint64_t, kMaxCost> words_{};
};

/// Bits whose strength is not known are taken for strong ones.
BitStrengths strengths_of(const Sequence& sequence, size_t code)
{
    BitStrengths unknown;
    unknown.fill(UINT8_MAX);
    return sequence.strengths.empty() ? unknown : sequence.strengths[code];
}

class TableLengths final : public ListLengths {
public:
    explicit TableLengths(const PartTables& tables) : tables_(tables) {}
    uint64_t words(uint32_t part, uint32_t value) const override
    {
        return tables_[part].list(value).size() / 2;
    }

private:
    const PartTables& tables_;
};

} // namespace

uint64_t probe_budget(uint64_t words, uint32_t lists)
{
    return (words / (kParts * kPartValues) + 1) * (lists == 0 ? kUsualLists : lists);
}

std::vector<PartProbe> choose_probes(const Reading& reading, const PartTables& tables,
                                     uint64_t budget)
{
    return choose_probes(reading, TableLengths(tables), budget);
}

std::vector<PartProbe> choose_probes(const Reading& reading, const ListLengths& lengths,
                                     uint64_t budget)
{
    Offers offers(lengths);
    for (const auto& sequence : reading.sequences) {
        for (size_t code = 0; code < sequence.codes.size(); ++code) {
            const BitStrengths strengths = strengths_of(sequence, code);
            for (uint32_t part = 0; sequence.masks[code] != 0 && part < kParts; ++part) {
                offers.add(query_part(sequence.codes[code], strengths, part), part,
                           static_cast<uint32_t>(code));
            }
        }
    }
    return offers.within(budget);
}

} // namespace kzcat
