/// @file
/// What the tests of `kzfp evaluate` run on.
#pragma once

#include <map>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "kzfp.hpp"
#include "recordings.hpp"

namespace kz::test {

/// A folder of pieces, each a track of its own.
class Evaluate : public testing::Test {
protected:
    static void SetUpTestSuite()
    {
        scratch_ = new ScratchDirectory;
        for (uint64_t seed = 1; seed <= 6; ++seed) {
            scratch_->write("music/" + std::to_string(seed) + ".wav", wav(piece(seed)));
        }
    }
    static void TearDownTestSuite() { delete scratch_; }

    static std::string path(const std::string& name) { return scratch_->path(name); }
    static std::string music() { return path("music"); }

    /// Runs the command on the music with more words.
    static ProcessResult evaluate(std::vector<std::string> words, const ProcessSetup& setup = {})
    {
        words.insert(words.begin(), {"evaluate", music(), "--length", "10"});
        return kz::test::kzfp(words, setup);
    }

    /// The lines by kind.
    static std::map<std::string, nlohmann::json> rows(const ProcessResult& result)
    {
        std::map<std::string, nlohmann::json> all;
        for (const nlohmann::json& line : lines_of(result.out)) {
            all[line.at("kind").get<std::string>()] = line;
        }
        return all;
    }

    static inline ScratchDirectory* scratch_ = nullptr;
};

} // namespace kz::test
