#include "kzfp.hpp"

#include <fstream>
#include <iterator>
#include <sstream>
#include <utility>

#include <gtest/gtest.h>

namespace kz::test {

namespace {

void append_little_endian(std::string& bytes, uint32_t word, int count)
{
    for (int i = 0; i < count; ++i) {
        bytes += static_cast<char>((word >> (8 * i)) & 0xff);
    }
}

} // namespace

std::string clip(const std::string& name) { return KZFP_CLIPS "/" + name; }

ProcessResult kzfp(std::vector<std::string> arguments, const ProcessSetup& setup)
{
    arguments.insert(arguments.begin(), KZFP_PROGRAM);
    return run(arguments, setup);
}

std::string output_of(const std::vector<std::string>& arguments)
{
    const ProcessResult result = kzfp(arguments);
    EXPECT_EQ(0, result.status);
    EXPECT_EQ("", result.err);
    return result.out;
}

std::vector<int> values_of(const std::vector<std::string>& arguments)
{
    std::vector<std::string> all = {"--format", "values"};
    all.insert(all.end(), arguments.begin(), arguments.end());
    const ProcessResult result = kzfp(all);
    EXPECT_EQ(0, result.status) << result.err;
    return numbers_in(result.out);
}

std::vector<int> numbers_in(const std::string& text)
{
    std::istringstream stream(text);
    return {std::istream_iterator<int>(stream), {}};
}

std::string contents(const std::string& path)
{
    std::ifstream file(path, std::ios::binary);
    EXPECT_TRUE(file) << path;
    return {std::istreambuf_iterator<char>(file), {}};
}

ProcessSetup fed_with(const std::string& text)
{
    ProcessSetup setup;
    setup.input = [text, done = false]() mutable {
        const bool again = std::exchange(done, true);
        return again ? std::string_view{} : std::string_view{text};
    };
    return setup;
}

std::string wav_header(uint32_t rate, uint32_t channels, uint32_t data_bytes)
{
    std::string bytes = "RIFF";
    append_little_endian(bytes, data_bytes + 36, 4);
    bytes += "WAVEfmt ";
    append_little_endian(bytes, 16, 4);
    append_little_endian(bytes, 1, 2);
    append_little_endian(bytes, channels, 2);
    append_little_endian(bytes, rate, 4);
    append_little_endian(bytes, rate * channels * 2, 4);
    append_little_endian(bytes, channels * 2, 2);
    append_little_endian(bytes, 16, 2);
    bytes += "data";
    append_little_endian(bytes, data_bytes, 4);
    return bytes;
}

} // namespace kz::test
