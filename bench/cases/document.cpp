// The query document of a fingerprint that is complete: tag tree, text, and freeing both.

#include "cases/cases.hpp"
#include "cases/sound.hpp"
#include "peers/peers.hpp"
#include "support/digest.hpp"

namespace kz::bench {

namespace {

/// The data of the document's block.
std::string values_of(const std::string& document)
{
    const size_t end = document.find("</FP_BLOCK>");
    const size_t begin = document.rfind('>', end) + 1;
    return document.substr(begin, end - begin);
}

Prepared document()
{
    const auto fingerprint = std::make_shared<Fingerprint>(
        Job{KZ_FPX_ALGORITHM_FIXED, KZ_FPX_FORMAT_PCM16, kWorkingHertz, 1});
    const auto sound = kz::test::melody(kWorkingHertz, 1, kOffered);
    require(fingerprint->feed(sound.data(), sound.size() * sizeof(int16_t)), "not complete");
    const std::string values = values_of(fingerprint->document());
    return {[fingerprint] { fingerprint->render([](const char* text) { keep(text); }); },
            [fingerprint] { return kz::test::digest_of(fingerprint->document()); },
            [values] {
                return Peers{document_by_libxml2(values), document_by_tinyxml2(values),
                             document_by_pugixml(values)};
            }};
}

} // namespace

std::vector<Case> document_cases()
{
    return {{"serialize", "a document built, rendered and freed", microseconds(),
             share_of(kLibxml2, 1.0), share_of(kTinyxml2, 1.0), document}};
}

} // namespace kz::bench
