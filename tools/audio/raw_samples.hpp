/// @file
/// Headerless audio, given as it comes.
#pragma once

#include "audio/source.hpp"
#include "audio/waiting.hpp"

namespace audio {

/// What is wrong with a stream whose last frame has only `odd_bytes` bytes.
std::string odd_bytes_text(uint64_t odd_bytes, const StreamFormat& format);

/// From little endian, as samples lie in a stream, to the order of the processor.
void to_native_order(std::span<std::byte> samples, Encoding encoding);

/// Reads a descriptor to its end, or to the end of the section, without looking ahead.
class RawSamples : public Source {
public:
    /// Starts where the descriptor stands; it and `patience` must outlive the object.
    RawSamples(int file, bool seekable, const StreamFormat& format, const Section& section,
               const Patience& patience);

    StreamFormat format() const override { return format_; }
    size_t read(std::span<std::byte> bytes) override;

private:
    size_t read_bytes(std::span<std::byte> bytes);
    void skip(uint64_t count);

    int file_;
    const Patience& patience_;
    StreamFormat format_;
    uint64_t frames_left_;
};

} // namespace audio
