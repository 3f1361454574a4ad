/// @file
/// What the tests of `kzfp duplicates` look through.
#pragma once

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <map>
#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>
#include <sndfile.hh>

#include "kzfp.hpp"
#include "recordings.hpp"

namespace kz::test {

using Samples = std::vector<int16_t>;

inline Samples scaled(Samples samples, double factor)
{
    std::ranges::transform(samples, samples.begin(), [factor](int16_t sample) {
        return static_cast<int16_t>(std::lrint(sample * factor));
    });
    return samples;
}

inline Samples operator+(Samples samples, const Samples& more)
{
    samples.insert(samples.end(), more.begin(), more.end());
    return samples;
}

inline Samples silence(double seconds)
{
    return Samples(static_cast<size_t>(seconds * kPieceRate));
}

/// Writes a file of a format of libsndfile.
inline std::string encode(const ScratchDirectory& scratch, const std::string& name, int format,
                          const Samples& samples)
{
    const std::string path = scratch.write(name, "");
    SndfileHandle file(path, SFM_WRITE, format, 1, static_cast<int>(kPieceRate));
    EXPECT_EQ(static_cast<sf_count_t>(samples.size()),
              file.write(samples.data(), static_cast<sf_count_t>(samples.size())));
    return path;
}

constexpr int kFlac = SF_FORMAT_FLAC | SF_FORMAT_PCM_16;
constexpr int kVorbis = SF_FORMAT_OGG | SF_FORMAT_VORBIS;

inline std::string name_in(const nlohmann::json& file)
{
    return std::filesystem::path(file["file"].get<std::string>()).filename();
}

/// The relation of each file of a group, by the file's name.
inline std::map<std::string, std::string> relations_in(const nlohmann::json& group)
{
    std::map<std::string, std::string> relations;
    for (const nlohmann::json& file : group["files"]) {
        relations[name_in(file)] = file["relation"];
    }
    return relations;
}

/// Folders of music, made once; tests only read them.
class Duplicates : public ::testing::Test {
protected:
    static void SetUpTestSuite()
    {
        scratch_ = new ScratchDirectory();
        const Samples one = piece(1);
        const std::string bytes = wav(one);
        scratch_->write("music/original.wav", bytes);
        scratch_->write("music/sub/copy.wav", bytes);
        scratch_->write("music/excerpt.wav", wav(part(one, 8, 12)));
        scratch_->write("music/quieter.wav", wav(scaled(one, 0.5)));
        scratch_->write("music/late.wav", wav(silence(3) + one));
        encode(*scratch_, "music/same.flac", kFlac, one);
        encode(*scratch_, "music/lossy.ogg", kVorbis, one);
        scratch_->write("music/other.wav", wav(piece(2)));
    }
    static void TearDownTestSuite()
    {
        delete scratch_;
        scratch_ = nullptr;
    }

    static std::string music() { return scratch_->path("music"); }

    /// The groups that are found.
    static std::vector<nlohmann::json> groups_in(const std::string& path)
    {
        return lines_of(output_of({"duplicates", "--format", "json", path}));
    }

    static inline ScratchDirectory* scratch_ = nullptr;
};

} // namespace kz::test
