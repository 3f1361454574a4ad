#include "whole/soak/recordings.hpp"

#include <fstream>
#include <sstream>

#include "support/digest.hpp"
#include "support/melody.hpp"
#include "whole/soak/worker.hpp"

namespace kz::soak {
namespace {

constexpr uint32_t kSeconds = 15; // as the golden documents have it

std::string document_of(const Recording& recording, uint32_t way)
{
    Job job(recording, way);
    while (!job.step()) {
    }
    return job.document();
}

} // namespace

uint32_t Cutter::next()
{
    switch (way_) {
    case 0:
        return UINT32_MAX;
    case 1:
        return 1024;
    default:
        return 1 + random_.below(random_.below(8) == 0 ? 100000 : 9000);
    }
}

std::vector<Recording> make_recordings(std::string& problem)
{
    std::vector<Recording> recordings;
    std::ifstream file(KZ_GOLDEN);
    for (std::string line; std::getline(file, line);) {
        std::istringstream words(line);
        std::string algorithm;
        std::string format;
        std::string piece;
        std::string digest;
        Recording recording;
        words >> algorithm >> recording.rate >> recording.channels >> format >> piece >> digest;
        // A status is on record where an algorithm refuses the rate: it is shorter than a digest.
        if (format != "s16" || piece != "music" || digest.size() != 16) {
            continue;
        }
        recording.algorithm = algorithm == "fixed" ? test::fixed : test::floating;
        recording.name = line;
        recording.samples = test::melody(recording.rate, recording.channels, kSeconds);
        for (uint32_t way = 0; way < kCuts; ++way) {
            recording.documents.push_back(document_of(recording, way));
        }
        if (test::digest_of(std::string_view(recording.documents[0])) != digest) {
            problem += "not the document on record: " + line + '\n';
        }
        recordings.push_back(std::move(recording));
    }
    if (recordings.size() < 10) {
        problem += "nothing on record to compare with\n";
    }
    return recordings;
}

} // namespace kz::soak
