// The command line of kzfp: any words, on files that are missing, empty or not sound. It ends with
// one of its statuses, and with "wrong usage" without having opened a file.

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
                                  "--",
                                  "-",
                                  "/dev/null",
                                  "/nonexistent",
                                  "/",
                                  "--raw=",
                                  "--format=json",
                                  "12,1,u8"};

} // namespace

void run(Choices& choices)
{
    std::vector<std::string> arguments;
    for (auto words = choices.ConsumeIntegralInRange<int>(0, 8); words > 0; --words) {
        std::string word = one_in(choices, 4) ? choices.ConsumeRandomLengthString(16).c_str()
                                              : choices.PickValueInArray(kWords);
        if (one_in(choices, 16)) {
            word += choices.PickValueInArray(kWords);
        }
        arguments.push_back(word);
    }
    const int status = kzfp(arguments);
    ASSERT_GE(status, 0);
    ASSERT_LE(status, 2);
    if (arguments.empty()) {
        ASSERT_EQ(2, status);
    }
}

} // namespace kz::fuzz
