#include "recordings.hpp"

#include <cstring>
#include <sstream>

#include <gtest/gtest.h>

#include "kzcat.h"
#include "kzfp.hpp"
#include "support/signals.hpp"

namespace kz::test {

std::vector<int16_t> piece(uint64_t seed, double seconds)
{
    return tune(kPieceRate, 1, seconds, 0.5, seed);
}

std::vector<int16_t> part(const std::vector<int16_t>& samples, double from, double seconds)
{
    const auto begin = samples.begin() + static_cast<std::ptrdiff_t>(from * kPieceRate);
    return {begin, begin + static_cast<std::ptrdiff_t>(seconds * kPieceRate)};
}

std::string wav(const std::vector<int16_t>& samples)
{
    std::string bytes(samples.size() * 2, '\0');
    std::memcpy(bytes.data(), samples.data(), bytes.size());
    return wav_header(kPieceRate, 1, static_cast<uint32_t>(bytes.size())) + bytes;
}

std::string trail_file(const std::vector<int16_t>& samples)
{
    const kzcat_format format = {KZ_STREAM_FORMAT_PCM16, kPieceRate, 1, 0};
    kzcat_builder* builder = nullptr;
    kzcat_trail* trail = nullptr;
    uint64_t size = 0;
    EXPECT_EQ(KZCAT_OK, kzcat_builder_create(&format, nullptr, &builder));
    EXPECT_EQ(KZCAT_OK, kzcat_builder_feed(builder, samples.data(), samples.size() * 2));
    EXPECT_EQ(KZCAT_OK, kzcat_builder_finish(builder, &trail));
    EXPECT_EQ(KZCAT_OK, kzcat_trail_write(trail, nullptr, 0, &size));
    std::string bytes(size, '\0');
    EXPECT_EQ(KZCAT_OK, kzcat_trail_write(trail, bytes.data(), size, &size));
    kzcat_trail_free(&trail);
    kzcat_builder_free(&builder);
    return bytes;
}

bool contains(const std::string& text, const std::string& part)
{
    return text.find(part) != std::string::npos;
}

std::vector<nlohmann::json> lines_of(const std::string& text)
{
    std::vector<nlohmann::json> lines;
    std::istringstream stream(text);
    for (std::string line; std::getline(stream, line);) {
        lines.push_back(nlohmann::json::parse(line));
    }
    return lines;
}

} // namespace kz::test
