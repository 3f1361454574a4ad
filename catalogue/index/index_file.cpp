/// @file
/// The side file of a catalogue, from and to bytes: docs/index_file.md describes them.

#include "catalogue/index/index_file.hpp"

#include <algorithm>
#include <bit>
#include <cstring>

#include "catalogue/model/crc32c.hpp"
#include "catalogue/store/little_endian.hpp"

namespace kzcat {

namespace {

constexpr char kMagic[] = "KZCINDEX";
constexpr size_t kMagicBytes = sizeof kMagic - 1;
constexpr uint32_t kFormat = 1;

// Where the fields of the header lie.
constexpr size_t kFormatAt = 8;
constexpr size_t kProfileAt = 12;
constexpr size_t kFileBytesAt = 16;
constexpr size_t kCursorAt = 24;
constexpr size_t kTracksAt = 32;
constexpr size_t kCodesAt = 40;
constexpr size_t kPlanAt = 48;
constexpr size_t kScanTimeAt = 52;
constexpr size_t kPartsTimeAt = 56;
constexpr size_t kIdLengthAt = 60;
constexpr size_t kIdAt = 64;
constexpr size_t kSectionsAt = 128;
constexpr size_t kSectionBytes = 24;
constexpr size_t kChecksumAt = kIndexHeaderBytes - 4;

/// In the order in which they lie in the file.
enum : size_t { kTrackSection, kCodeSection, kFirstTableSection };
constexpr size_t kSections = kFirstTableSection + 2 * kParts;
constexpr uint64_t kAlignment = 64;
constexpr size_t kTrackBytes = 16;

struct Section {
    uint64_t offset = 0;
    uint64_t bytes = 0;
    uint32_t checksum = 0;
};
using Sections = std::array<Section, kSections>;

constexpr uint64_t aligned(uint64_t offset)
{
    return (offset + kAlignment - 1) / kAlignment * kAlignment;
}

// Reading.

Sections sections_of(std::span<const std::byte> header)
{
    Sections sections;
    for (size_t i = 0; i < kSections; ++i) {
        const size_t at = kSectionsAt + i * kSectionBytes;
        sections[i] = {get_little_endian<uint64_t>(header.data() + at),
                       get_little_endian<uint64_t>(header.data() + at + 8),
                       get_little_endian<uint32_t>(header.data() + at + 16)};
    }
    return sections;
}

void check_header(std::span<const std::byte> bytes)
{
    if (bytes.size() < kMagicBytes || std::memcmp(bytes.data(), kMagic, kMagicBytes) != 0) {
        throw IndexFileError("is not a side file of a catalogue");
    }
    if (bytes.size() < kIndexHeaderBytes) {
        throw IndexFileError("ends within its header");
    }
    const auto format = get_little_endian<uint32_t>(bytes.data() + kFormatAt);
    if (format != kFormat) {
        throw IndexFileError("has format " + std::to_string(format) + ", and this version reads " +
                             std::to_string(kFormat));
    }
    if (crc32c(bytes.first(kChecksumAt)) !=
        get_little_endian<uint32_t>(bytes.data() + kChecksumAt)) {
        throw IndexFileError("has a damaged header");
    }
    if (get_little_endian<uint64_t>(bytes.data() + kFileBytesAt) != bytes.size()) {
        throw IndexFileError("has another length than its header says");
    }
}

IndexHeader header_of(std::span<const std::byte> bytes)
{
    const auto id_length = get_little_endian<uint32_t>(bytes.data() + kIdLengthAt);
    const auto plan = get_little_endian<uint32_t>(bytes.data() + kPlanAt);
    if (id_length > kMaxCatalogueId || plan > static_cast<uint32_t>(Plan::parts)) {
        throw IndexFileError("has a header that makes no sense");
    }
    IndexHeader header;
    const auto id = bytes.subspan(kIdAt, id_length);
    std::ranges::transform(id, std::back_inserter(header.catalogue),
                           [](std::byte byte) { return static_cast<char>(byte); });
    header.profile = static_cast<Profile>(get_little_endian<uint32_t>(bytes.data() + kProfileAt));
    header.cursor = static_cast<int64_t>(get_little_endian<uint64_t>(bytes.data() + kCursorAt));
    header.tracks = get_little_endian<uint64_t>(bytes.data() + kTracksAt);
    header.codes = get_little_endian<uint64_t>(bytes.data() + kCodesAt);
    header.plan = static_cast<Plan>(plan);
    header.scan_us = get_little_endian<uint32_t>(bytes.data() + kScanTimeAt);
    header.parts_us = get_little_endian<uint32_t>(bytes.data() + kPartsTimeAt);
    return header;
}

/// Sections follow one another, so none overlaps another or leaves the file.
void check_places(const Sections& sections, uint64_t file_bytes)
{
    uint64_t end = kIndexHeaderBytes;
    for (const auto& section : sections) {
        if (section.offset != aligned(end) || section.offset > file_bytes ||
            section.bytes > file_bytes - section.offset) {
            throw IndexFileError("has sections that do not follow one another");
        }
        end = section.offset + section.bytes;
    }
    if (end != file_bytes) {
        throw IndexFileError("goes on behind its last section");
    }
}

using SectionBytes = std::array<std::span<const std::byte>, kSections>;

SectionBytes checked_bytes(std::span<const std::byte> bytes, const Sections& sections)
{
    SectionBytes all;
    for (size_t i = 0; i < kSections; ++i) {
        all[i] = bytes.subspan(static_cast<size_t>(sections[i].offset),
                               static_cast<size_t>(sections[i].bytes));
        if (crc32c(all[i]) != sections[i].checksum) {
            throw IndexFileError("has a damaged section");
        }
    }
    return all;
}

std::vector<TrackSpan> tracks_of(std::span<const std::byte> bytes, const IndexHeader& header)
{
    if (bytes.size() % kTrackBytes != 0 || bytes.size() / kTrackBytes != header.tracks) {
        throw IndexFileError("has another number of tracks than its header says");
    }
    std::vector<TrackSpan> tracks;
    tracks.reserve(bytes.size() / kTrackBytes);
    TrackSpan track;
    for (size_t at = 0; at < bytes.size(); at += kTrackBytes) {
        const auto id = static_cast<int64_t>(get_little_endian<uint64_t>(bytes.data() + at));
        const uint64_t first = track.first + track.count;
        const auto count = get_little_endian<uint64_t>(bytes.data() + at + 8);
        if (id <= track.id || count > header.codes - first) {
            throw IndexFileError("has tracks out of order, or with too many codes");
        }
        track = {.id = id, .first = first, .count = count};
        tracks.push_back(track);
    }
    if (track.first + track.count != header.codes) {
        throw IndexFileError("has codes that belong to no track");
    }
    return tracks;
}

void set_codes(IndexContents& contents, std::span<const std::byte> bytes)
{
    if (bytes.size() % sizeof(Code) != 0 || bytes.size() / sizeof(Code) != contents.header.codes) {
        throw IndexFileError("has another number of codes than its header says");
    }
    const bool readable_in_place = reinterpret_cast<uintptr_t>(bytes.data()) % alignof(Code) == 0;
    if (std::endian::native == std::endian::little && readable_in_place) {
        contents.codes = {reinterpret_cast<const Code*>(bytes.data()), bytes.size() / sizeof(Code)};
        return;
    }
    contents.swapped.reserve(bytes.size() / sizeof(Code));
    for (size_t at = 0; at < bytes.size(); at += sizeof(Code)) {
        contents.swapped.push_back(get_little_endian<Code>(bytes.data() + at));
    }
    contents.codes = contents.swapped;
}

std::optional<PartTables> tables_of(const SectionBytes& sections, uint64_t codes)
{
    if (codes > kMaxIndexedCodes) {
        return std::nullopt;
    }
    PartTables tables;
    for (size_t part = 0; part < kParts; ++part) {
        const size_t section = kFirstTableSection + 2 * part;
        tables[part] = {.starts = sections[section], .words = sections[section + 1]};
        if (const char* fault = fault_of(tables[part]); fault != nullptr) {
            throw IndexFileError(std::string("is damaged: ") + fault);
        }
    }
    return tables;
}

// Writing.

/// Writes sections one behind the other and notes where they lie.
class SectionWriter {
public:
    explicit SectionWriter(FileReplacement& file) : file_(file) { pad(kIndexHeaderBytes); }

    void begin()
    {
        pad(aligned(end_));
        sections_[begun_++].offset = end_;
    }

    void put(std::span<const std::byte> bytes)
    {
        auto& section = sections_[begun_ - 1];
        section.checksum = crc32c(bytes, section.checksum);
        section.bytes += bytes.size();
        end_ += bytes.size();
        file_.write(bytes);
    }

    const Sections& sections() const { return sections_; }
    uint64_t end() const { return end_; }

private:
    void pad(uint64_t end)
    {
        const std::vector<std::byte> zeros(static_cast<size_t>(end - end_));
        file_.write(zeros);
        end_ = end;
    }

    FileReplacement& file_;
    Sections sections_;
    size_t begun_ = 0;
    uint64_t end_ = 0;
};

using HeaderBytes = std::array<std::byte, kIndexHeaderBytes>;

void seal(HeaderBytes& bytes)
{
    put_little_endian(crc32c(std::span(bytes).first(kChecksumAt)), bytes.data() + kChecksumAt);
}

/// Everything but the sections.
void put_fields(HeaderBytes& bytes, const IndexHeader& header)
{
    const std::span<std::byte> all(bytes);
    put_little_endian(static_cast<uint32_t>(header.profile), all.data() + kProfileAt);
    put_little_endian(static_cast<uint64_t>(header.cursor), all.data() + kCursorAt);
    put_little_endian(header.tracks, all.data() + kTracksAt);
    put_little_endian(header.codes, all.data() + kCodesAt);
    put_little_endian(static_cast<uint32_t>(header.plan), all.data() + kPlanAt);
    put_little_endian(header.scan_us, all.data() + kScanTimeAt);
    put_little_endian(header.parts_us, all.data() + kPartsTimeAt);
    put_little_endian(static_cast<uint32_t>(header.catalogue.size()), all.data() + kIdLengthAt);
    std::ranges::transform(header.catalogue, all.begin() + kIdAt,
                           [](char letter) { return static_cast<std::byte>(letter); });
}

HeaderBytes header_bytes(const IndexHeader& header, const SectionWriter& written)
{
    HeaderBytes bytes{};
    std::memcpy(bytes.data(), kMagic, kMagicBytes);
    const std::span<std::byte> all(bytes);
    put_little_endian(kFormat, all.data() + kFormatAt);
    put_little_endian(written.end(), all.data() + kFileBytesAt);
    for (size_t i = 0; i < kSections; ++i) {
        const size_t at = kSectionsAt + i * kSectionBytes;
        put_little_endian(written.sections()[i].offset, all.data() + at);
        put_little_endian(written.sections()[i].bytes, all.data() + at + 8);
        put_little_endian(written.sections()[i].checksum, all.data() + at + 16);
    }
    put_fields(bytes, header);
    seal(bytes);
    return bytes;
}

/// Calls `visit` with each track's id and codes.
template <class Visit>
void for_each_track(const Corpus& corpus, Visit visit)
{
    for (const auto& segment : corpus.segments) {
        for (const auto& track : segment.tracks) {
            visit(track.id, segment.of(track));
        }
    }
}

void put_tracks(SectionWriter& writer, IndexHeader& header, const Corpus& corpus)
{
    std::vector<std::byte> bytes;
    header.tracks = 0;
    header.codes = 0;
    for_each_track(corpus, [&](int64_t id, std::span<const Code> codes) {
        const size_t at = bytes.size();
        bytes.resize(at + kTrackBytes);
        put_little_endian(static_cast<uint64_t>(id), bytes.data() + at);
        put_little_endian(static_cast<uint64_t>(codes.size()), bytes.data() + at + 8);
        header.tracks += 1;
        header.codes += codes.size();
    });
    writer.begin();
    writer.put(bytes);
}

void put_codes(SectionWriter& writer, const Corpus& corpus)
{
    writer.begin();
    std::vector<std::byte> bytes;
    for_each_track(corpus, [&](int64_t, std::span<const Code> codes) {
        bytes.resize(codes.size_bytes());
        for (size_t i = 0; i < codes.size(); ++i) {
            put_little_endian(codes[i], bytes.data() + i * sizeof(Code));
        }
        writer.put(bytes);
    });
}

void put_tables(SectionWriter& writer, const IndexHeader& header, const Corpus& corpus)
{
    for (uint32_t part = 0; part < kParts; ++part) {
        const bool indexed = header.codes <= kMaxIndexedCodes;
        const BuiltTable table = indexed ? build_table(corpus, part) : BuiltTable{};
        writer.begin();
        writer.put(table.starts);
        writer.begin();
        writer.put(table.words);
    }
}

} // namespace

IndexContents read_index_file(std::span<const std::byte> bytes)
{
    check_header(bytes);
    IndexContents contents;
    contents.header = header_of(bytes);
    const Sections sections = sections_of(bytes);
    check_places(sections, bytes.size());
    const SectionBytes parts = checked_bytes(bytes, sections);
    contents.tracks = tracks_of(parts[kTrackSection], contents.header);
    set_codes(contents, parts[kCodeSection]);
    contents.tables = tables_of(parts, contents.header.codes);
    return contents;
}

void write_index_file(FileReplacement& file, IndexHeader& header, const Corpus& corpus)
{
    if (header.catalogue.size() > kMaxCatalogueId) {
        throw IndexFileError("cannot hold an id of a catalogue as long as this");
    }
    SectionWriter writer(file);
    put_tracks(writer, header, corpus);
    put_codes(writer, corpus);
    put_tables(writer, header, corpus);
    file.write_start(header_bytes(header, writer));
}

void rewrite_header(FileReplacement& file, std::span<const std::byte> written,
                    const IndexHeader& header)
{
    HeaderBytes bytes{};
    std::copy_n(written.begin(), bytes.size(), bytes.begin());
    put_fields(bytes, header);
    seal(bytes);
    file.write_start(bytes);
}

} // namespace kzcat
