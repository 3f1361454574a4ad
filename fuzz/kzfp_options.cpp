// The command line of kzfp: any words, on files that are missing, empty or not sound. It ends with
// one of its statuses, and with "wrong usage" without having opened a file. Catalogues that it
// makes lie in a folder of their own, out of which no word leads.

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <system_error>

#include "fuzz.hpp"
#include "kzfp_program.hpp"

namespace kz::fuzz {

namespace {

constexpr const char* kWords[] = {"--format",
                                  "-f",
                                  "json",
                                  "values",
                                  "document",
                                  "--raw",
                                  "8000,1,u8",
                                  "44100,2,s16",
                                  "11025,1,alaw",
                                  "8000,1,ulaw",
                                  "csv",
                                  "human",
                                  "xml",
                                  "--every",
                                  "--wrap",
                                  "--output-dir",
                                  "-o",
                                  "--files-from",
                                  "--strict",
                                  "--timeout",
                                  "--progress",
                                  "--start",
                                  "--length",
                                  "--algorithm",
                                  "fixed",
                                  "float",
                                  "1e9",
                                  "-1",
                                  "nan",
                                  "0",
                                  "--version",
                                  "--help",
                                  "disc",
                                  "fingerprint",
                                  "help",
                                  "add",
                                  "match",
                                  "compare",
                                  "list",
                                  "remove",
                                  "verify",
                                  "merge",
                                  "text",
                                  "--candidates",
                                  "--passages",
                                  "--no-speeds",
                                  "--documents",
                                  "--summary",
                                  "--paths",
                                  "-j",
                                  "2",
                                  "a.kzc",
                                  "b.kzc",
                                  "sub",
                                  "--",
                                  "-",
                                  "empty",
                                  "missing/file",
                                  ".",
                                  "--raw=",
                                  "--format=json",
                                  "12,1,u8"};

namespace fs = std::filesystem;

/// While it lives, the working folder is an empty one, which is removed with what lies in it.
class OwnFolder {
public:
    OwnFolder() : before_(fs::current_path())
    {
        std::string name = (fs::temp_directory_path() / "kz-fuzz-XXXXXX").string();
        if (::mkdtemp(name.data()) == nullptr) {
            throw std::system_error(errno, std::generic_category(), name);
        }
        folder_ = name;
        fs::create_directory(folder_ / "sub");
        std::ofstream(folder_ / "empty").flush();
        fs::current_path(folder_);
    }
    ~OwnFolder()
    {
        std::error_code ignored;
        fs::current_path(before_, ignored);
        fs::remove_all(folder_, ignored);
    }
    OwnFolder(const OwnFolder&) = delete;
    OwnFolder& operator=(const OwnFolder&) = delete;

private:
    fs::path before_;
    fs::path folder_;
};

std::string random_word(Choices& choices)
{
    std::string word = choices.ConsumeRandomLengthString(16).c_str();
    std::ranges::replace(word, '/', '_');
    return word;
}

/// One word, sometimes two joined; none that leads to a folder above.
std::string some_word(Choices& choices)
{
    std::string word = one_in(choices, 4) ? random_word(choices) : choices.PickValueInArray(kWords);
    if (one_in(choices, 16)) {
        word += choices.PickValueInArray(kWords);
    }
    return word.starts_with("..") ? "__" : word;
}

} // namespace

void run(Choices& choices)
{
    const OwnFolder folder;
    std::vector<std::string> arguments;
    for (auto words = choices.ConsumeIntegralInRange<int>(0, 8); words > 0; --words) {
        arguments.push_back(some_word(choices));
    }
    const int status = kzfp(arguments);
    ASSERT_GE(status, 0);
    ASSERT_LE(status, 2);
    if (arguments.empty()) {
        ASSERT_EQ(2, status);
    }
}

} // namespace kz::fuzz
