// Sound has a trail and, when it is long enough, values; other files have one of the two.

#include "kzfp/compare/side.hpp"

#include <sstream>
#include <string_view>
#include <utility>

#include "audio/input.hpp"
#include "kzfp/catalogue/files.hpp"
#include "kzfp/fingerprinter.hpp"

namespace kzfp {

namespace {

constexpr size_t kValueCount = 30;
constexpr size_t kLongestDocument = size_t{1} << 24;

/// The values of the beginning of a sound file; none when it is too short for them.
std::vector<int16_t> values_of_sound(const std::string& path, const SoundOptions& options)
{
    const audio::Request request = {
        .raw = options.raw,
        .section = options.section,
        .accepts_rate = [](uint32_t rate) { return takes_rate(Algorithm::fixed, rate); },
        .floats = false,
        .patience = {}};
    try {
        audio::Input input(path, request);
        return take_fingerprint(*input.open().source, Algorithm::fixed).values;
    } catch (const audio::FileError&) {
        return {};
    }
}

/// The text of the element that holds the values of a well-formed query document.
std::string text_of_values(const std::string& document)
{
    constexpr std::string_view kBlock = "<FP_BLOCK";
    size_t at = document.find(kBlock);
    while (at != std::string::npos && document.compare(at + kBlock.size(), 1, "S") == 0) {
        at = document.find(kBlock, at + 1); // that was the element around it
    }
    const size_t begin = at == std::string::npos ? at : document.find('>', at);
    return begin == std::string::npos
               ? std::string()
               : document.substr(begin + 1, document.find('<', begin) - begin - 1);
}

/// A document writes its values without a sign.
std::vector<int16_t> values_of_document(const std::string& path)
{
    const std::string document = contents_of(path, kLongestDocument);
    // Refuses what is no document.
    made<Query>(kzcat_query_create_from_document, document.data(), uint64_t{document.size()});
    std::istringstream text(text_of_values(document));
    std::vector<int16_t> values;
    for (uint16_t value = 0; text >> value;) {
        values.push_back(static_cast<int16_t>(value));
    }
    if (values.size() != kValueCount) {
        throw audio::FileError("does not write its 30 values as numbers with blanks between them; "
                               "make it anew with kzfp --format document");
    }
    return values;
}

std::vector<int16_t> values_of(const ClipInput& input)
{
    if (!input.trouble.empty()) {
        throw audio::FileError(input.trouble);
    }
    return input.kind == ClipKind::document ? values_of_document(input.path)
                                            : values_in(input.values);
}

void take_trail(Side& side, Trail trail)
{
    kzcat_trail_facts facts;
    check(kzcat_trail_get_facts(trail.get(), &facts));
    side.trail = std::move(trail);
    side.seconds = static_cast<double>(facts.samples) / facts.sample_rate;
}

} // namespace

Side read_side(const std::string& path, const SoundOptions& options)
{
    if (path == "-" || state_of(path).size < 0) {
        throw audio::FileError(
            "is read several times, so it must be a file; write the sound to one first");
    }
    const std::vector<ClipInput> inputs = clip_inputs({path}, ClipKind::by_content);
    if (inputs.size() > 1) {
        throw audio::FileError("has several lines of values; compare files of one line");
    }
    const ClipInput& input = inputs.front();
    Side side = {.path = path, .is_sound = input.kind == ClipKind::sound};
    if (input.kind == ClipKind::document || input.kind == ClipKind::values ||
        !input.trouble.empty()) {
        side.values = values_of(input);
        return side;
    }
    Recording recording = read_recording(path, options, false);
    side.warning = recording.warning;
    take_trail(side, std::move(recording.trail));
    if (side.is_sound) {
        side.values = values_of_sound(path, options);
    }
    return side;
}

} // namespace kzfp
