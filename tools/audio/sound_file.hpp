/// @file
/// Sound files of all kinds, through libsndfile.
#pragma once

#include <memory>
#include <optional>
#include <vector>

#include <sndfile.h>

#include "audio/file_source.hpp"

namespace audio {

/// Gives the samples of a sound file in one of these forms:
/// - A-law and mu-law with one or two channels, at a rate that is accepted: as they are in the
///   file;
/// - what is decoded to floats, where these are wanted and the rate is accepted: floats of all
///   channels;
/// - everything else: 16-bit PCM, in which more than two channels are mixed down to one.
class SoundFile final : public FileSource {
public:
    /// `file` is a regular file that outlives the object; `accepts_rate` decides whether companded
    /// samples, and floats, are given as they are. Throws FileError; NotRecognised when it is of
    /// no kind that libsndfile reads.
    SoundFile(int file, const AcceptsRate& accepts_rate, bool floats);

    void select(const Section& section) override;
    uint32_t file_rate() const override { return static_cast<uint32_t>(info_.samplerate); }
    uint32_t file_channels() const override { return static_cast<uint32_t>(info_.channels); }
    std::optional<double> duration() const override;
    std::vector<Tag> tags() const override;
    StreamFormat format() const override;
    size_t read(std::span<std::byte> bytes) override;
    std::string trouble() const override;

    /// libsndfile 1.2 reads such files wrongly where packets change their length.
    bool is_opus() const;

private:
    struct Close {
        void operator()(SNDFILE* file) const { sf_close(file); }
    };

    void check() const;
    bool is_too_short() const;
    bool is_companded() const;
    bool is_decoded_to_float() const;
    void go_to(sf_count_t start);
    size_t read_pcm16(std::span<std::byte> bytes);
    size_t read_floats(std::span<std::byte> bytes);
    sf_count_t read_samples(sf_count_t frames);

    std::unique_ptr<SNDFILE, Close> file_;
    SF_INFO info_ = {};
    Encoding encoding_ = Encoding::s16;
    bool states_length_ = false; ///< in a tag that is not corrected to what is there
    std::string cut_off_;        ///< why the file is not whole; empty when nothing is known of that
    uint64_t frames_left_ = UINT64_MAX;
    uint64_t position_ = 0;        ///< frames from the start of the file
    bool ended_ = false;           ///< before the section did
    std::vector<int16_t> samples_; ///< of all channels
    std::vector<float> floats_;
};

} // namespace audio
