/// @file
/// A service that runs, and the catalogue that it answers from.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "client.hpp"
#include "programs/kzfp/kzfp.hpp"
#include "programs/kzfp/recordings.hpp"
#include "programs/kzfp/running.hpp"

namespace kz::test {

/// `kzfp serve` with some options, on a port of its own. Killed at the end when it still runs.
class Service {
public:
    /// Returns when it listens; `folder` is for its outputs.
    Service(const ScratchDirectory& folder, std::vector<std::string> options,
            const RunningSetup& setup = {});

    int port() const { return port_; }

    Response ask(const std::string& method, const std::string& target, const Sent& sent = {}) const
    {
        return kz::test::ask(port_, method, target, sent);
    }
    Response get(const std::string& target) const { return ask("GET", target); }
    Response post(const std::string& target, const std::string& type, const std::string& body) const
    {
        return ask("POST", target, {.headers = {"Content-Type: " + type}, .body = body});
    }

    void send(int signal) const { program_->send(signal); }

    /// Ends it and gives its exit status.
    int stop();

    /// The exit status, once it has ended by itself.
    int wait() { return program_->wait(); }

    /// What it has written so far.
    std::string output() const { return contents(out_); }
    std::string messages() const { return contents(err_); }

private:
    std::string out_;
    std::string err_;
    std::unique_ptr<Running> program_;
    int port_ = 0;
};

/// Tests that share a catalogue of three pieces, and do not change it.
class ServiceTest : public ::testing::Test {
protected:
    static constexpr uint64_t kPieces = 3;

    static void SetUpTestSuite();
    static void TearDownTestSuite();

    static std::string catalogue() { return scratch_->path("music.kzc"); }
    static std::string path_of(uint64_t seed);

    /// A copy of the catalogue that may be changed.
    static std::string own_catalogue(const std::string& name);

    /// A file that holds a token.
    static std::string token_file(const std::string& name, const std::string& token);

    static Service start(std::vector<std::string> options);

    /// Twelve seconds of a piece, from the fifth on.
    static std::vector<int16_t> clip(uint64_t seed) { return part(piece(seed), 5, 12); }

    static ScratchDirectory* scratch_;
};

} // namespace kz::test
