// Files of all kinds through the whole of kzfp: a header of a sound file with anything behind it,
// and headerless samples, at any start and length. Images and directories go to the disc command.

#include <algorithm>

#include <fcntl.h>
#include <unistd.h>

#include "fuzz.hpp"
#include "kzfp_program.hpp"
#include "support/scratch_directory.hpp"
#include "support/signals.hpp"

namespace kz::fuzz {

namespace {

void put(std::string& bytes, uint64_t value, int count)
{
    for (int i = 0; i < count; ++i) {
        bytes += static_cast<char>(value >> (8 * i));
    }
}

/// A WAV header whose fields are right, or nearly.
std::string wav_header(Choices& choices, uint32_t data_bytes)
{
    static constexpr uint32_t kRates[] = {1000, 8000, 11025, 12345, 44100, 768000, 0, 1};
    static constexpr uint16_t kCodes[] = {1, 3, 6, 7, 0xfffe, 2, 0x11};
    static constexpr uint16_t kBits[] = {8, 16, 24, 32, 64, 4, 0};
    const auto code = choices.PickValueInArray(kCodes);
    const uint32_t rate =
        one_in(choices, 8) ? choices.ConsumeIntegral<uint32_t>() : choices.PickValueInArray(kRates);
    const uint32_t channels = choices.ConsumeIntegralInRange<uint16_t>(0, 9);
    const uint32_t bits = choices.PickValueInArray(kBits);
    std::string bytes = "RIFF";
    put(bytes, one_in(choices, 4) ? choices.ConsumeIntegral<uint32_t>() : data_bytes + 36, 4);
    bytes += "WAVEfmt ";
    put(bytes, 16, 4);
    put(bytes, code, 2);
    put(bytes, channels, 2);
    put(bytes, rate, 4);
    put(bytes, uint64_t{rate} * channels * bits / 8, 4);
    put(bytes, channels * bits / 8, 2);
    put(bytes, bits, 2);
    bytes += "data";
    put(bytes, one_in(choices, 4) ? choices.ConsumeIntegral<uint32_t>() : data_bytes, 4);
    return bytes;
}

std::string choose_content(Choices& choices)
{
    std::string content;
    const auto noise = choices.ConsumeIntegral<uint16_t>();
    if (choices.ConsumeBool()) {
        content = wav_header(choices, noise);
    }
    content += choices.ConsumeRandomLengthString(1000);
    test::Random random(noise);
    std::generate_n(std::back_inserter(content), noise,
                    [&] { return static_cast<char>(random.next()); });
    return content;
}

std::vector<std::string> choose_arguments(Choices& choices)
{
    static constexpr const char* kRaw[] = {"8000,1,u8", "44100,2,s16", "11025,1,alaw",
                                           "8000,2,ulaw"};
    static constexpr const char* kFormats[] = {"document", "json", "values"};
    static constexpr const char* kSeconds[] = {"0", "0.5", "3", "20", "1e9"};
    std::vector<std::string> arguments = {"--format", choices.PickValueInArray(kFormats)};
    const bool is_float = choices.ConsumeBool();
    if (is_float) {
        arguments.insert(arguments.end(), {"--algorithm", "float"});
    }
    if (choices.ConsumeBool()) {
        const bool is_slow = is_float && choices.ConsumeBool(); // so that little is enough
        arguments.insert(arguments.end(),
                         {"--raw", is_slow ? "1000,1,u8" : choices.PickValueInArray(kRaw)});
    }
    if (one_in(choices, 4)) {
        arguments.insert(arguments.end(), {"--start", choices.PickValueInArray(kSeconds)});
    }
    if (one_in(choices, 4)) {
        arguments.insert(arguments.end(), {"--length", choices.PickValueInArray(kSeconds)});
    }
    return arguments;
}

/// Standard input is the file for as long as it lives. (A pipe of more than it holds would wait.)
class StandardInput {
public:
    explicit StandardInput(const std::string& path) : before_(::dup(STDIN_FILENO))
    {
        const int file = ::open(path.c_str(), O_RDONLY);
        ::dup2(file, STDIN_FILENO);
        ::close(file);
    }
    ~StandardInput()
    {
        ::dup2(before_, STDIN_FILENO);
        ::close(before_);
    }
    StandardInput(const StandardInput&) = delete;
    StandardInput& operator=(const StandardInput&) = delete;

private:
    int before_;
};

} // namespace

void run(Choices& choices)
{
    static const test::ScratchDirectory scratch;
    std::vector<std::string> arguments = choose_arguments(choices);
    const bool is_disc = one_in(choices, 8);
    const bool from_standard_input = one_in(choices, 8);
    const std::string path = scratch.write("file", choose_content(choices));
    if (is_disc) {
        arguments = {"disc", path, "--format", "json"};
    } else {
        arguments.push_back(from_standard_input ? "-" : path);
        if (one_in(choices, 8)) {
            arguments.insert(arguments.begin(), "fingerprint");
        }
    }
    const StandardInput input(path);
    const int status = kzfp(arguments);
    ASSERT_GE(status, 0);
    ASSERT_LE(status, 1);
}

} // namespace kz::fuzz
