#include "cases/cases.hpp"

namespace kz::bench {

std::vector<Case> all_cases()
{
    std::vector<Case> all;
    for (const auto cases :
         {fingerprint_cases, transform_cases, resampler_cases, frame_cases, detector_cases,
          document_cases, converter_cases, trail_cases, lookup_document_cases}) {
        for (auto& one : cases()) {
            all.push_back(std::move(one));
        }
    }
    return all;
}

} // namespace kz::bench
