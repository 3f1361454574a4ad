/// @file
/// What the tests of `kzfp monitor` listen to.
#pragma once

#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "kzfp.hpp"
#include "recordings.hpp"

namespace kz::test {

inline const std::vector<std::string> kRaw = {"--raw", "16000,1,s16"};

using Samples = std::vector<int16_t>;

inline Samples joined(const std::vector<Samples>& parts)
{
    Samples sound;
    for (const Samples& one : parts) {
        sound.insert(sound.end(), one.begin(), one.end());
    }
    return sound;
}

inline std::string bytes_of(const Samples& samples)
{
    return {reinterpret_cast<const char*>(samples.data()), samples.size() * 2};
}

/// A minute and a half: piece 1, a stranger, silence, and piece 2.
inline Samples mix()
{
    return joined({piece(1), piece(50, 20), Samples(6 * kPieceRate), part(piece(2), 4, 26)});
}

class MonitorCommand : public ::testing::Test {
protected:
    static void SetUpTestSuite()
    {
        scratch_ = new ScratchDirectory();
        std::vector<std::string> arguments = {"add", catalogue()};
        for (uint64_t seed = 1; seed <= 2; ++seed) {
            arguments.push_back(
                scratch_->write("piece" + std::to_string(seed) + ".wav", wav(piece(seed))));
        }
        ASSERT_EQ(0, kzfp(arguments).status);
        scratch_->write("mix.raw", bytes_of(mix()));
    }
    static void TearDownTestSuite()
    {
        delete scratch_;
        scratch_ = nullptr;
    }

    static std::string catalogue() { return scratch_->path("music.kzc"); }

    static ProcessResult monitor(std::vector<std::string> arguments, const std::string& stream,
                                 const ProcessSetup& setup = {})
    {
        arguments.insert(arguments.begin(), "monitor");
        arguments.insert(arguments.end(), {catalogue(), stream});
        return kzfp(arguments, setup);
    }

    static ProcessResult monitor_mix(std::vector<std::string> arguments,
                                     const ProcessSetup& setup = {})
    {
        arguments.insert(arguments.end(), kRaw.begin(), kRaw.end());
        return monitor(std::move(arguments), scratch_->path("mix.raw"), setup);
    }

    static inline ScratchDirectory* scratch_ = nullptr;
};

} // namespace kz::test
