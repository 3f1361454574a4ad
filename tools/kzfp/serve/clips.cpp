// Sound lies in memory only, and goes as soon as it is decoded.

#include "kzfp/serve/clips.hpp"

#include <chrono>
#include <cmath>
#include <limits>

#include <sys/mman.h>
#include <unistd.h>

#include "audio/source.hpp"
#include "kzfp/catalogue/answer_object.hpp"
#include "kzfp/catalogue/sound.hpp"

namespace kzfp::serve {

namespace {

constexpr size_t kValueCount = 30;

/// What an answer by 30 values is worth: docs/documents_in_catalogues.md has the measurements.
constexpr const char* kWorth =
    "30 values name copies of a recording, of other coding and loudness too, from 14.22 s of "
    "sound. They seldom name what came over a telephone or through a room, and know only tracks "
    "that were added with --documents. The place is that of the clip's first sound, within half a "
    "second for nine of ten clean clips. A trail, or the sound, says more.";

[[noreturn]] void refuse_values(const std::string& what)
{
    refuse(400, "bad_values",
           what + "; send {\"values\": [...]} with the 30 whole numbers from -32768 to 32767 that "
                  "kzfp --format values prints");
}

constexpr int64_t kNone = std::numeric_limits<int64_t>::max();

int16_t value_of(const nlohmann::json& number)
{
    using Limits = std::numeric_limits<int16_t>;
    const bool is_large = number.is_number_unsigned() && number.get<uint64_t>() > Limits::max();
    const int64_t value = number.is_number_integer() && !is_large ? number.get<int64_t>() : kNone;
    if (value < Limits::min() || value > Limits::max()) {
        refuse_values("a value is no whole number of 16 bits");
    }
    return static_cast<int16_t>(value);
}

/// The library's refusal of a body is the client's to mend.
template <class Make>
auto made_from_body(const char* code, const char* cure, Make make)
{
    try {
        return make();
    } catch (const CatalogueError& error) {
        std::string text = error.what();
        if (text.ends_with('.')) {
            text.pop_back();
        }
        refuse(400, code, text + "; " + cure);
    }
}

[[noreturn]] void refuse_long_clip(uint32_t longest)
{
    refuse(413, "clip_too_long",
           "the clip is longer than the " + std::to_string(longest) +
               " s that this service looks up at once; send it in parts, or start the service "
               "with --longest-clip SECONDS");
}

Query query_of_trail(const std::string& body, uint32_t longest)
{
    const Trail trail = trail_of(body);
    kzcat_trail_facts facts;
    check(kzcat_trail_get_facts(trail.get(), &facts));
    if (facts.samples / facts.sample_rate > longest) {
        refuse_long_clip(longest);
    }
    return made<Query>(kzcat_query_create_from_trail, static_cast<const kzcat_trail*>(trail.get()));
}

Query query_of_sound(std::string& body, uint32_t longest, std::string& warning)
{
    try {
        const MemoryFile file(body);
        std::string().swap(body);
        SoundOptions options;
        options.section.length = longest + 1.0;
        Clip clip = read_sound_clip(file.path(), options);
        if (clip.seconds > longest) {
            refuse_long_clip(longest);
        }
        warning = clip.warning;
        return std::move(clip.query);
    } catch (const audio::FileError& error) {
        refuse_sound(error.what());
    }
}

Query query_of(BodyKind kind, std::string& body, uint32_t longest, std::string& warning)
{
    switch (kind) {
    case BodyKind::trail:
        return query_of_trail(body, longest);
    case BodyKind::document:
        return made_from_body("bad_document", "send one as kzfp prints it", [&body] {
            return made<Query>(kzcat_query_create_from_document, body.data(),
                               uint64_t{body.size()});
        });
    case BodyKind::values: {
        const std::vector<int16_t> values = values_of(body);
        return made_from_body("bad_values", "send those that kzfp --format values prints",
                              [&values] {
                                  return made<Query>(kzcat_query_create_from_values, values.data(),
                                                     static_cast<uint32_t>(values.size()));
                              });
    }
    default:
        return query_of_sound(body, longest, warning);
    }
}

void hide_paths(Answer& answer)
{
    for (auto* const tracks : {&answer.matches, &answer.candidates}) {
        for (FoundTrack& track : *tracks) {
            track.source = file_name_of(track.source);
        }
    }
}

std::string to_json(const Answer& answer, const Lookup& lookup, double took)
{
    JsonObject object = make_object();
    object["by"] = answer.by_document ? "document" : "trail";
    set_answer(object, answer, lookup);
    if (answer.by_document) {
        object["worth"] = kWorth;
    }
    object["clip_seconds"] = std::round(answer.seconds * 1e4) / 1e4;
    object["took"] = std::round(took * 1e6) / 1e6;
    return to_line(object);
}

} // namespace

std::vector<int16_t> values_of(std::string_view json)
{
    const auto object = nlohmann::json::parse(json, nullptr, false);
    if (!object.is_object() || object.size() != 1 || !object.contains("values") ||
        !object["values"].is_array()) {
        refuse_values("the body is no JSON object with values alone");
    }
    const nlohmann::json& list = object["values"];
    if (list.size() != kValueCount) {
        refuse_values("there are " + std::to_string(list.size()) + " values");
    }
    std::vector<int16_t> values;
    for (const nlohmann::json& number : list) {
        values.push_back(value_of(number));
    }
    return values;
}

MemoryFile::MemoryFile(std::string_view bytes)
    : file_(::memfd_create("kzfp", MFD_CLOEXEC), audio::Descriptor::owned)
{
    while (!bytes.empty() && file_.number() >= 0) {
        const ssize_t count = ::write(file_.number(), bytes.data(), bytes.size());
        if (count < 0) {
            break;
        }
        bytes.remove_prefix(static_cast<size_t>(count));
    }
    if (file_.number() < 0 || !bytes.empty()) {
        throw audio::FileError("there is no room for it in memory");
    }
}

std::string MemoryFile::path() const { return "/proc/self/fd/" + std::to_string(file_.number()); }

Found find_clip(kzcat_catalogue& catalogue, const Plan& plan, std::string& body,
                const ClipRules& rules)
{
    std::string warning;
    const Query query = query_of(plan.body, body, rules.longest, warning);
    const auto begin = std::chrono::steady_clock::now();
    Answer answer = look_up(catalogue, *query, {}, plan.lookup);
    const std::chrono::duration<double> took = std::chrono::steady_clock::now() - begin;
    answer.warning = warning;
    if (rules.hide_sources) {
        hide_paths(answer);
    }
    return {.reply = json_reply(200, to_json(answer, plan.lookup, took.count())),
            .verdict = kzcat_verdict_text(answer.verdict)};
}

const char* word_of(BodyKind kind)
{
    switch (kind) {
    case BodyKind::trail:
        return "trail";
    case BodyKind::document:
        return "document";
    case BodyKind::values:
        return "values";
    case BodyKind::sound:
        return "sound";
    case BodyKind::none:
        break;
    }
    return "none";
}

void refuse_sound(const std::string& why)
{
    // What only a command line has is no cure here.
    refuse(422, "unreadable_audio",
           "the sound cannot be used: it " + why.substr(0, why.find("; headerless audio needs")) +
               "; send a whole file in a usual format, such "
               "as WAV or FLAC");
}

Trail trail_of(std::string_view bytes)
{
    return made_from_body("bad_trail", "send all bytes of a .kzt file", [bytes] {
        return made<Trail>(kzcat_trail_read, static_cast<const void*>(bytes.data()),
                           uint64_t{bytes.size()});
    });
}

std::string file_name_of(const std::string& source)
{
    const size_t slash = source.find_last_of('/');
    return slash == std::string::npos ? source : source.substr(slash + 1);
}

} // namespace kzfp::serve
