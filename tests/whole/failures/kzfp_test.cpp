// The whole of kzfp, from before its first line on, with the n-th allocation or read failing, alone
// or with all later ones, for n = 1, 2, 3 ... until none fails: it writes a result, or one line
// that says why not and nothing else, and is never ended by a signal.

#include <algorithm>
#include <array>
#include <cstring>
#include <fstream>
#include <optional>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "support/process.hpp"
#include "support/scratch_directory.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

constexpr uint32_t kRate = 8000;

std::string bytes_of(const std::vector<int16_t>& samples)
{
    std::string bytes(samples.size() * 2, '\0');
    std::memcpy(bytes.data(), samples.data(), bytes.size());
    return bytes;
}

/// A 16-bit WAV header for one channel.
std::string wav_header(uint32_t data_bytes)
{
    const std::array<uint32_t, 11> words = {0x46464952, data_bytes + 36, 0x45564157, 0x20746d66,
                                            16,         0x00010001,      kRate,      2 * kRate,
                                            0x00100002, 0x61746164,      data_bytes};
    std::string bytes(sizeof words, '\0');
    std::memcpy(bytes.data(), words.data(), bytes.size());
    return bytes;
}

std::ptrdiff_t lines_in(const std::string& text) { return std::ranges::count(text, '\n'); }

class FailingSystem : public ::testing::Test {
protected:
    ProcessResult run_without_failure(const std::vector<std::string>& arguments) const
    {
        return run(with_program(arguments), setup_);
    }

    /// Nothing when no failure struck.
    std::optional<ProcessResult> run_with_failure(const std::vector<std::string>& arguments,
                                                  const std::string& setting,
                                                  bool from_then_on) const
    {
        const std::string report = scratch_.write("report", "");
        ProcessSetup setup = setup_;
        setup.environment = {"LD_PRELOAD=" KZ_FAILING_SYSTEM, setting, "KZ_FAIL_REPORT=" + report};
        if (from_then_on) {
            setup.environment.emplace_back("KZ_FAIL_ON=1");
        }
        ProcessResult result = run(with_program(arguments), setup);
        const bool struck = std::filesystem::file_size(report) > 0;
        return struck ? std::optional(std::move(result)) : std::nullopt;
    }

    /// `expect(result)` judges each run.
    template <class Expect>
    void for_every_failure(const std::string& kind, const std::vector<std::string>& arguments,
                           Expect expect) const
    {
        const ProcessResult whole = run_without_failure(arguments);
        ASSERT_EQ(0, whole.status) << whole.err;
        for (const bool from_then_on : {false, true}) {
            int nth = 1;
            for (;; ++nth) {
                const std::string setting = "KZ_FAIL_" + kind + "=" + std::to_string(nth);
                const auto result = run_with_failure(arguments, setting, from_then_on);
                if (!result) {
                    break;
                }
                const testing::ScopedTrace trace(__FILE__, __LINE__,
                                                 setting + (from_then_on ? " and on" : ""));
                expect(whole, *result);
            }
            EXPECT_GT(nth, 2) << "no failure struck";
        }
    }

    /// A database takes thousands of allocations: each third of the first ones fails, then one of
    /// every `step`. `prepare()` is called before each run.
    template <class Prepare>
    void for_some_failures(const std::vector<std::string>& arguments, int step,
                           Prepare prepare) const
    {
        const ProcessResult whole = run_without_failure(arguments);
        ASSERT_EQ(0, whole.status) << whole.err;
        for (int nth = 1;; nth += nth < 40 ? 3 : step) {
            prepare();
            const std::string setting = "KZ_FAIL_ALLOCATION=" + std::to_string(nth);
            const auto result = run_with_failure(arguments, setting, nth % 2 == 0);
            if (!result) {
                EXPECT_GT(nth, 200);
                break;
            }
            if (result->status == 0) {
                EXPECT_EQ(whole.out, result->out) << setting;
            } else {
                EXPECT_EQ(1, result->status) << setting;
                EXPECT_NE("", result->err) << setting;
            }
        }
    }

    std::string write_music(double seconds) const
    {
        const std::string samples = bytes_of(tune(kRate, 1, seconds));
        return scratch_.write("music.wav",
                              wav_header(static_cast<uint32_t>(samples.size())) + samples);
    }

    ScratchDirectory scratch_;
    ProcessSetup setup_;

private:
    static std::vector<std::string> with_program(std::vector<std::string> arguments)
    {
        arguments.insert(arguments.begin(), KZFP_PROGRAM);
        return arguments;
    }
};

void expect_one_complaint(const ProcessResult& result)
{
    EXPECT_EQ(1, result.status) << result.err;
    EXPECT_EQ("", result.out);
    EXPECT_GE(lines_in(result.err), 1) << result.err;
    EXPECT_LE(lines_in(result.err), 2) << result.err; // a library under it may add its own
}

// The streams of the library report every frame that memory was too short for, so a result is
// whole.
void expect_same_or_complaint(const ProcessResult& whole, const ProcessResult& result)
{
    if (result.status == 0) {
        EXPECT_EQ(whole.out, result.out);
    } else {
        expect_one_complaint(result);
    }
}

/// In JSON, a file that failed has its line, unless memory is too short for that as well.
void expect_same_or_error_line(const ProcessResult& whole, const ProcessResult& result)
{
    ProcessResult rest = result;
    if (result.status != 0 && result.out.find(",\"error\":\"") != std::string::npos) {
        rest.out.clear();
    }
    expect_same_or_complaint(whole, rest);
}

TEST_F(FailingSystem, AnyAllocationMayFailForHeaderlessSamples)
{
    const std::string file = scratch_.write("music.raw", bytes_of(tune(kRate, 1, 15)));
    for_every_failure("ALLOCATION", {"--raw", "8000,1,s16", file}, expect_same_or_complaint);
}

TEST_F(FailingSystem, AnyAllocationMayFailOnTheRoadOfASoundFile)
{
    const std::string file = write_music(15);
    for_every_failure("ALLOCATION", {"--algorithm", "float", "--format", "json", file},
                      expect_same_or_error_line);
}

TEST_F(FailingSystem, AnyAllocationMayFailInTheDiscCommand)
{
    scratch_.write("BDMV/index.bdmv", "");
    scratch_.write("BDMV/PLAYLIST/00001.mpls", "");
    for_every_failure("ALLOCATION", {"disc", scratch_.path()},
                      [](const ProcessResult& whole, const ProcessResult& result) {
                          if (result.status == 0) { // an entry of a directory is passed over
                              EXPECT_LE(result.out.size(), whole.out.size());
                          } else {
                              expect_one_complaint(result);
                          }
                      });
}

TEST_F(FailingSystem, AllocationsMayFailWhileMusicIsAdded)
{
    const std::string file = write_music(8);
    const std::string catalogue = scratch_.path("c.kzc");
    for_some_failures({"add", "-j", "1", catalogue, file}, 211,
                      [&catalogue] { std::filesystem::remove(catalogue); });
}

TEST_F(FailingSystem, AllocationsMayFailWhileMusicIsMatched)
{
    const std::string file = write_music(8);
    const std::string catalogue = scratch_.path("c.kzc");
    ASSERT_EQ(0, run_without_failure({"add", "-q", catalogue, file}).status);
    for_some_failures({"match", "-j", "1", "--no-speeds", catalogue, file}, 211, [] {});
}

TEST_F(FailingSystem, AllocationsMayFailWhileAStreamIsHeard)
{
    const std::string file = write_music(8);
    const std::string catalogue = scratch_.path("c.kzc");
    ASSERT_EQ(0, run_without_failure({"add", "-q", catalogue, file}).status);
    for_some_failures({"monitor", "-f", "json", "--no-speeds", catalogue, file}, 463, [] {});
}

TEST_F(FailingSystem, AnyReadMayFail)
{
    const std::string samples = bytes_of(tune(kRate, 1, 15));
    const std::string raw = scratch_.write("music.raw", samples);
    const std::string wav = write_music(15);
    for_every_failure("READ", {"--raw", "8000,1,s16", raw}, expect_same_or_complaint);
    for_every_failure("READ", {wav}, expect_same_or_complaint);
    setup_.input_file = wav;
    for_every_failure("READ", {"-"}, expect_same_or_complaint);
}

} // namespace

} // namespace kz::test
