/// @file
/// The music and the clips of evaluation/, and pseudo catalogues made of its trails.

#include "music.hpp"

#include <algorithm>
#include <bit>
#include <cstring>
#include <fstream>
#include <iterator>
#include <map>
#include <span>
#include <stdexcept>

#include <nlohmann/json.hpp>
#include <sndfile.hh>

#include "catalogue/model/extractor.hpp"
#include "catalogue/model/trail_file.hpp"
#include "kzsdk/stream/stream.h"

namespace kz::scale {

namespace {

namespace fs = std::filesystem;
using nlohmann::json;

std::vector<json> lines_of(const fs::path& path)
{
    std::ifstream in(path);
    if (!in) {
        throw std::runtime_error("cannot read " + path.string());
    }
    std::vector<json> lines;
    for (std::string line; std::getline(in, line);) {
        lines.push_back(json::parse(line));
    }
    return lines;
}

/// Feeds a sound file to an extractor of trails or of queries.
template <class Extractor>
auto extracted(const fs::path& path)
{
    SndfileHandle file(path.c_str());
    if (file.error() != SF_ERR_NO_ERROR) {
        throw std::runtime_error("cannot read " + path.string() + ": " + file.strError());
    }
    Extractor extractor({KZ_STREAM_FORMAT_PCM16, static_cast<uint32_t>(file.samplerate()),
                         static_cast<uint32_t>(file.channels())});
    std::vector<int16_t> block(size_t{65536} * static_cast<size_t>(file.channels()));
    for (;;) {
        const sf_count_t count = file.read(block.data(), static_cast<sf_count_t>(block.size()));
        if (count <= 0) {
            return extractor.finish();
        }
        extractor.feed(std::as_bytes(std::span(block).first(static_cast<size_t>(count))));
    }
}

std::vector<std::byte> bytes_of(const fs::path& path)
{
    std::ifstream in(path, std::ios::binary);
    const std::string text{std::istreambuf_iterator<char>(in), {}};
    std::vector<std::byte> bytes(text.size());
    std::memcpy(bytes.data(), text.data(), text.size());
    return bytes;
}

kzcat::Trail kept_trail(const fs::path& sound, const fs::path& kept)
{
    if (fs::exists(kept)) {
        return kzcat::read_trail(bytes_of(kept));
    }
    kzcat::Trail trail = extracted<kzcat::TrailExtractor>(sound);
    const auto bytes = kzcat::write_trail(trail);
    std::ofstream out(kept, std::ios::binary);
    out.write(reinterpret_cast<const char*>(bytes.data()),
              static_cast<std::streamsize>(bytes.size()));
    return trail;
}

/// The codes of all trails in a row; each turn through them they are changed in another way.
class Permuted {
public:
    explicit Permuted(const std::vector<NamedTrail>& real)
    {
        for (const auto& trail : real) {
            codes_.insert(codes_.end(), trail.codes.begin(), trail.codes.end());
        }
    }

    kzcat::Code next()
    {
        constexpr size_t kRotations = kzcat::kPairs / 2;
        const size_t turn = 1 + at_ / codes_.size();
        const size_t place = at_++ % codes_.size();
        const bool reversed = turn / kRotations % 2 == 1;
        const kzcat::Code code = codes_[reversed ? codes_.size() - 1 - place : place];
        return std::rotl(code, static_cast<int>(2 * (turn % kRotations)));
    }

private:
    std::vector<kzcat::Code> codes_;
    size_t at_ = 0;
};

} // namespace

std::vector<NamedTrail> known_tracks(const fs::path& manifest, const fs::path& media,
                                     const std::string& half)
{
    fs::create_directories(media / "trails");
    std::vector<NamedTrail> trails;
    for (const json& track : lines_of(manifest)) {
        if (track.at("half") == half && track.at("role") == "known") {
            const std::string id = track.at("id");
            auto trail =
                kept_trail(media / "tracks" / (id + ".wav"), media / "trails" / (id + ".kzt"));
            trails.push_back({id, std::move(trail.codes)});
        }
    }
    return trails;
}

std::vector<Clip> clips_of(const fs::path& folder, size_t limit)
{
    std::vector<Clip> clips;
    std::map<bool, size_t> count;
    for (const json& line : lines_of(folder / "truth.jsonl")) {
        const bool known = line.at("role") == "known";
        if (count[known]++ < limit) {
            clips.push_back({.file = folder.parent_path() / line.at("file").get<std::string>(),
                             .kind = line.at("kind"),
                             .track = line.at("track"),
                             .known = known,
                             .speed = line.at("speed"),
                             .tempo = line.at("tempo"),
                             .pitch = line.at("pitch")});
        }
    }
    return clips;
}

kzcat::QueryBands query_of(const fs::path& file) { return extracted<kzcat::QueryExtractor>(file); }

PseudoCatalogue pseudo_catalogue(const std::vector<NamedTrail>& real, size_t tracks, size_t codes)
{
    PseudoCatalogue catalogue;
    const auto open_track = [&] {
        const auto id = static_cast<int64_t>(catalogue.tracks.size()) + 1;
        catalogue.tracks.push_back({.id = id, .first = catalogue.codes.size(), .count = 0});
    };
    for (const auto& trail : real) {
        open_track();
        catalogue.tracks.back().count = trail.codes.size();
        catalogue.codes.insert(catalogue.codes.end(), trail.codes.begin(), trail.codes.end());
    }
    Permuted permuted(real);
    while (catalogue.tracks.size() < tracks) {
        open_track();
        auto& track = catalogue.tracks.back();
        track.count = codes != 0 ? codes : real[catalogue.tracks.size() % real.size()].codes.size();
        for (uint64_t i = 0; i < track.count; ++i) {
            catalogue.codes.push_back(permuted.next());
        }
    }
    return catalogue;
}

} // namespace kz::scale
