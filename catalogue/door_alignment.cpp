// The C interface: parts of trails, and trails beside each other.

#include "catalogue/handles.hpp"
#include "catalogue/match/alignment.hpp"

namespace {

using namespace kzcat;

void check_comparable(const kzcat_trail* first, const kzcat_trail* second)
{
    require(first != nullptr && second != nullptr, "one of the trails is null; pass two");
    if (first->trail.profile != second->trail.profile) {
        throw Failure(KZCAT_ERROR_OTHER_PROFILE,
                      "the trails are of different profiles; make both from the sound with the "
                      "same version");
    }
}

double seconds_of(uint64_t codes) { return static_cast<double>(codes) * kCodeSeconds; }

/// What the blocks that agree, or all of them, come to.
struct Sum {
    uint64_t compared = 0;
    uint64_t errors = 0;

    void take(const AlignedBlock& block)
    {
        compared += block.compared;
        errors += block.errors;
    }
    double error_rate() const
    {
        return compared == 0 ? 0
                             : static_cast<double>(errors) / static_cast<double>(kPairs * compared);
    }
};

void fill(const Alignment& alignment, kzcat_alignment& record)
{
    Sum all;
    Sum agreeing;
    for (const AlignedBlock& block : alignment.blocks) {
        all.take(block);
        if (block.agrees()) {
            record.begin = agreeing.compared == 0 ? seconds_of(block.begin) : record.begin;
            record.end = seconds_of(block.end);
            agreeing.take(block);
        }
    }
    record.found = 1;
    record.lag = alignment.lag;
    record.offset = alignment.offset * kCodeSeconds;
    record.compared = seconds_of(all.compared);
    record.agreeing = seconds_of(agreeing.compared);
    record.error_rate = all.error_rate();
    record.agreeing_rate = agreeing.error_rate();
}

} // namespace

kzcat_status kzcat_trail_cut(const kzcat_trail* trail, uint64_t first, uint64_t count,
                             kzcat_trail** out_trail) noexcept
{
    return guarded([=] {
        clear_place(out_trail);
        require(trail != nullptr, "the trail is null; pass one");
        const std::vector<Code>& codes = trail->trail.codes;
        require(
            first < codes.size() && count > 0,
            "the part of the trail has no codes; begin before its end and ask for one at least");
        const uint64_t taken = std::min<uint64_t>(count, codes.size() - first);
        auto part = std::make_unique<kzcat_trail>();
        const auto begin = codes.begin() + static_cast<std::ptrdiff_t>(first);
        part->trail.profile = trail->trail.profile;
        part->trail.samples = (taken - 1) * kCodeHop + kFrameLength;
        part->trail.codes.assign(begin, begin + static_cast<std::ptrdiff_t>(taken));
        *out_trail = part.release();
    });
}

kzcat_status kzcat_trail_align(const kzcat_trail* first, const kzcat_trail* second,
                               kzcat_alignment* out_alignment) noexcept
{
    return guarded([=] {
        require(out_alignment != nullptr, "the record for the alignment is null; pass one");
        *out_alignment = {};
        check_comparable(first, second);
        const std::vector<Code>& one = first->trail.codes;
        const std::vector<Code>& other = second->trail.codes;
        kzcat_alignment record = {};
        record.first_sounding = seconds_of(sounding_codes(one));
        record.second_sounding = seconds_of(sounding_codes(other));
        if (const auto alignment = align(one, other)) {
            fill(*alignment, record);
        }
        *out_alignment = record;
    });
}

kzcat_status kzcat_trail_get_bit_errors(const kzcat_trail* first, const kzcat_trail* second,
                                        uint8_t* errors, uint64_t capacity,
                                        uint64_t* out_count) noexcept
{
    return guarded([=] {
        require(out_count != nullptr, "the place for the count is null; pass one");
        *out_count = 0;
        require(errors != nullptr || capacity == 0,
                "the errors are null; pass room, or a capacity of 0 to learn the count");
        check_comparable(first, second);
        const std::vector<Code>& one = first->trail.codes;
        const std::vector<Code>& other = second->trail.codes;
        std::vector<uint8_t> list(other.size(), KZCAT_NOT_COMPARED);
        if (const auto alignment = align(one, other)) {
            std::ranges::transform(bit_errors(one, other, *alignment), list.begin(),
                                   [](const std::optional<uint8_t>& error) {
                                       return error.value_or(KZCAT_NOT_COMPARED);
                                   });
        }
        copy_out(std::span(std::as_const(list)), errors, capacity, out_count);
    });
}
