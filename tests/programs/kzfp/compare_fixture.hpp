/// @file
/// What the tests of `kzfp compare` compare.
#pragma once

#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "kzfp.hpp"
#include "recordings.hpp"

namespace kz::test {

/// Every sound file is made once; tests only read them.
class Compare : public ::testing::Test {
protected:
    static void SetUpTestSuite()
    {
        scratch_ = new ScratchDirectory();
        song_ = scratch_->write("song.wav", wav(piece(1)));
        other_ = scratch_->write("other.wav", wav(piece(2)));
        inner_ = scratch_->write("inner.wav", wav(part(piece(1), 9, 12)));
    }
    static void TearDownTestSuite()
    {
        delete scratch_;
        scratch_ = nullptr;
    }

    static ProcessResult compared(std::vector<std::string> arguments)
    {
        arguments.insert(arguments.begin(), {"compare", "--format", "json"});
        return kzfp(arguments);
    }

    /// The object of one pair; `status` is what the program ends with.
    static nlohmann::json pair(const std::string& first, const std::string& second, int status)
    {
        const ProcessResult result = compared({first, second});
        EXPECT_EQ(status, result.status) << result.out << result.err;
        const std::vector<nlohmann::json> lines = lines_of(result.out);
        EXPECT_EQ(1u, lines.size()) << result.err;
        return lines.empty() ? nlohmann::json() : lines.front();
    }

    static std::string write(const std::string& name, const std::string& bytes)
    {
        return scratch_->write(name, bytes);
    }

    static inline ScratchDirectory* scratch_ = nullptr;
    static inline std::string song_;
    static inline std::string other_;
    static inline std::string inner_;
};

} // namespace kz::test
