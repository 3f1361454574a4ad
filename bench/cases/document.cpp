// The query document of a fingerprint that is complete: tag tree, text, and freeing both.

#include "cases/cases.hpp"
#include "cases/sound.hpp"
#include "peers/peers.hpp"
#include "support/digest.hpp"

namespace kz::bench {

namespace {

/// As the document has them: without a sign, a space between two.
std::string text_of(const std::vector<int16_t>& values)
{
    std::string text;
    for (const int16_t value : values) {
        text += text.empty() ? "" : " ";
        text += std::to_string(static_cast<uint16_t>(value));
    }
    return text;
}

Prepared document()
{
    const auto fingerprint = std::make_shared<Fingerprint>(Job{fixed, pcm16, kWorkingHertz, mono});
    const auto sound = kz::test::melody(kWorkingHertz, 1, kOffered);
    require(fingerprint->feed(sound.data(), sound.size() * sizeof(int16_t)), "not complete");
    const std::string values = text_of(fingerprint->values());
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
