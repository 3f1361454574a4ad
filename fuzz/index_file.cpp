// Side files of catalogues: a whole one that is changed, cut, and given right checksums again.
// Either it is refused with a sentence's end, or it can be searched, by parts and by scan, and
// names no track but its own.

#include <algorithm>

#include "catalogue/index/corpora.hpp"
#include "catalogue/index/index_file.hpp"
#include "catalogue/index/measure.hpp"
#include "catalogue/index/parts_search.hpp"
#include "catalogue/index/scratch_folder.hpp"
#include "catalogue/index/sealing.hpp"
#include "catalogue/match/scan.hpp"
#include "fuzz.hpp"

namespace kz::fuzz {

namespace {

using kzcat::test::Bytes;

Bytes whole_file(size_t tracks)
{
    const kzcat::test::ScratchFolder folder;
    kzcat::FileReplacement file(folder.file("a"));
    kzcat::IndexHeader header;
    header.catalogue = "fuzzed";
    kzcat::write_index_file(file, header, kzcat::test::small_corpus(tracks).corpus());
    file.commit();
    return kzcat::test::read_file(folder.file("a"));
}

/// Where a change is worth most: in a header's field, anywhere in a section, or at a section's
/// ends.
size_t chosen_place(Choices& choices, const Bytes& bytes)
{
    constexpr size_t kFields =
        kzcat::test::kSectionsAt + kzcat::test::kSectionCount * kzcat::test::kSectionEntry;
    if (choices.ConsumeBool()) {
        return choices.ConsumeIntegralInRange<size_t>(0, kFields);
    }
    const auto section = choices.ConsumeIntegralInRange<size_t>(0, kzcat::test::kSectionCount - 1);
    const std::byte* entry =
        bytes.data() + kzcat::test::kSectionsAt + section * kzcat::test::kSectionEntry;
    const auto offset = kzcat::get_little_endian<uint64_t>(entry);
    const auto length = kzcat::get_little_endian<uint64_t>(entry + 8);
    const auto within = choices.ConsumeIntegralInRange<uint32_t>(0, 1 << 20);
    const uint64_t place = offset + (choices.ConsumeBool() ? length - within % 32 : within);
    return place < bytes.size() ? static_cast<size_t>(place) : bytes.size() - 1;
}

void change(Choices& choices, Bytes& bytes)
{
    for (auto count = choices.ConsumeIntegralInRange<uint32_t>(0, 8); count > 0; --count) {
        const size_t at = chosen_place(choices, bytes);
        const auto text = choices.ConsumeRandomLengthString(8);
        for (size_t i = 0; i < text.size() && at + i < bytes.size(); ++i) {
            bytes[at + i] = static_cast<std::byte>(text[i]);
        }
    }
    if (kz::fuzz::one_in(choices, 8)) {
        bytes.resize(choices.ConsumeIntegralInRange<size_t>(0, bytes.size()));
    }
    if (bytes.size() >= kzcat::kIndexHeaderBytes && !kz::fuzz::one_in(choices, 8)) {
        kzcat::test::seal(bytes);
    }
}

void search(const kzcat::IndexContents& contents)
{
    const kzcat::Segment segment{contents.codes, contents.tracks};
    const auto reading = kzcat::sample_reading({{segment}});
    const kzcat::Ranking ranking(reading);
    kzcat::SearchScratch scratch;
    const kzcat::PartsSearch parts(contents.codes, contents.tracks, *contents.tables, 4096);
    const auto is_known = [&](int64_t id) {
        return std::ranges::binary_search(contents.tracks, id, {}, &kzcat::TrackSpan::id);
    };
    for (const auto& found : parts.find(ranking, reading, scratch)) {
        EXPECT_TRUE(is_known(found.place.track));
    }
    kzcat::ScanSearcher scan({{segment}});
    for (const auto& found : scan.find(reading, 4)) {
        EXPECT_TRUE(is_known(found.track));
    }
}

} // namespace

void run(Choices& choices)
{
    static const Bytes kSmall = whole_file(4);
    static const Bytes kLarger = whole_file(40);
    Bytes bytes = choices.ConsumeBool() ? kLarger : kSmall;
    change(choices, bytes);
    const Copy copy(bytes.data(), bytes.size(), 8 * choices.ConsumeIntegralInRange<size_t>(0, 1));
    try {
        search(kzcat::read_index_file(std::as_bytes(std::span(copy.data(), bytes.size()))));
    } catch (const kzcat::IndexFileError& error) {
        EXPECT_FALSE(std::string(error.what()).empty());
    }
}

} // namespace kz::fuzz
