#include "service.hpp"

#include <atomic>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <thread>

namespace kz::test {

namespace {

std::string text_of(const std::string& path)
{
    std::ifstream file(path, std::ios::binary);
    std::ostringstream text;
    text << file.rdbuf();
    return text.str();
}

/// The port in "kzfp: listening on http://127.0.0.1:1234/"; 0 when it is not there yet.
int port_in(const std::string& text)
{
    const size_t end = text.find("/\n");
    const size_t colon = text.rfind(':', end);
    return end == std::string::npos ? 0 : std::atoi(text.c_str() + colon + 1);
}

} // namespace

Service::Service(const ScratchDirectory& folder, std::vector<std::string> options,
                 const RunningSetup& setup)
{
    static std::atomic<int> count = 0;
    const std::string name = "service" + std::to_string(++count);
    out_ = folder.path(name + ".out");
    err_ = folder.path(name + ".err");
    options.insert(options.begin(), "serve");
    program_ = std::make_unique<Running>(options, out_, err_, setup);
    for (int i = 0; i < 60'000 && port_ == 0; i += 5) {
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
        port_ = port_in(text_of(out_));
    }
    EXPECT_NE(0, port_) << text_of(err_);
}

int Service::stop()
{
    send(SIGTERM);
    return wait();
}

ScratchDirectory* ServiceTest::scratch_ = nullptr;

void ServiceTest::SetUpTestSuite()
{
    scratch_ = new ScratchDirectory();
    std::vector<std::string> arguments = {"add", "--documents", catalogue()};
    for (uint64_t seed = 1; seed <= kPieces; ++seed) {
        arguments.push_back(
            scratch_->write("music/piece" + std::to_string(seed) + ".wav", wav(piece(seed))));
    }
    const ProcessResult result = kzfp(arguments);
    ASSERT_EQ(0, result.status) << result.err;
}

void ServiceTest::TearDownTestSuite()
{
    delete scratch_;
    scratch_ = nullptr;
}

std::string ServiceTest::path_of(uint64_t seed)
{
    return scratch_->path("music/piece" + std::to_string(seed) + ".wav");
}

std::string ServiceTest::own_catalogue(const std::string& name)
{
    std::filesystem::copy_file(catalogue(), scratch_->path(name),
                               std::filesystem::copy_options::overwrite_existing);
    return scratch_->path(name);
}

std::string ServiceTest::token_file(const std::string& name, const std::string& token)
{
    std::string path = scratch_->write(name, token + "\n");
    std::filesystem::permissions(path, std::filesystem::perms::owner_read);
    return path;
}

Service ServiceTest::start(std::vector<std::string> options)
{
    options.insert(options.end(), {"--listen", "127.0.0.1:0"});
    return {*scratch_, options};
}

} // namespace kz::test
