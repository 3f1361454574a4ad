// When another track than the right one is named, the clip is looked up once more as it was before
// it was degraded: a track that is named then too has the same sound in it, which is no mistake.

#include "kzfp/evaluate/examiner.hpp"

#include <cmath>
#include <ctime>
#include <filesystem>
#include <new>

#include "audio/source.hpp"
#include "kzfp/catalogue/answer.hpp"
#include "kzfp/evaluate/program.hpp"
#include "kzfp/output/interruption.hpp"

namespace kzfp::evaluate {

namespace {

constexpr int kTries = 30; ///< places of a track that may turn out to be silent

double processor_milliseconds()
{
    timespec now = {};
    ::clock_gettime(CLOCK_THREAD_CPUTIME_ID, &now);
    return 1e3 * static_cast<double>(now.tv_sec) + 1e-6 * static_cast<double>(now.tv_nsec);
}

Query query_of(const Pcm& pcm)
{
    kzcat_format format = {};
    format.format = KZ_STREAM_FORMAT_PCM16;
    format.sample_rate = pcm.rate;
    format.channels = pcm.channels;
    auto query = made<Query>(kzcat_query_create, &format);
    check(kzcat_query_feed(query.get(), pcm.samples.data(), pcm.samples.size() * sizeof(int16_t)));
    check(kzcat_query_finish(query.get()));
    return query;
}

Answer answer_to(kzcat_catalogue& catalogue, const Query& query)
{
    Lookup lookup;
    lookup.candidates = 1;
    return look_up(catalogue, *query, {}, lookup);
}

bool names(const Answer& answer, int64_t track)
{
    return answer.verdict == KZCAT_VERDICT_MATCH && !answer.matches.empty() &&
           answer.matches.front().track == track;
}

class Examination {
public:
    Examination(const Context& context, const PlannedClip& planned)
        : context_(context), planned_(planned), series_(context.series[planned.series]),
          track_(context.music.tracks[planned.track]), random_(context.seed, planned.name)
    {
        examined_.outcome.known = track_.is_known();
    }

    Examined run()
    {
        Outcome& outcome = examined_.outcome;
        try {
            outcome.state = cut() ? Outcome::State::looked_up : Outcome::State::silent;
            if (outcome.state == Outcome::State::looked_up) {
                look_up_clip(make());
            }
            return std::move(examined_);
        } catch (const std::bad_alloc&) {
            outcome.trouble = "not enough memory";
        } catch (const std::runtime_error& error) { // of a file, the catalogue or a program
            outcome.trouble = error.what();
        }
        outcome.state = Outcome::State::failed;
        return std::move(examined_);
    }

private:
    /// False when the track is silent wherever it was tried.
    bool cut()
    {
        const double seconds = series_.kind->source_seconds(series_.seconds);
        const double last = std::max(track_.seconds - seconds, 0.0);
        for (int i = 0; i < kTries; ++i) {
            // Whole milliseconds, so that the section begins where the truth has it.
            examined_.outcome.seconds = std::floor(random_.unit() * last * 1000) / 1000;
            clip_ = read_section(track_.path, examined_.outcome.seconds, seconds);
            if (is_audible(clip_)) {
                return true;
            }
        }
        return false;
    }

    Pcm make()
    {
        const std::string target = context_.folder + "/" + planned_.name;
        Product product = series_.kind->make(
            clip_, {.toolbox = context_.toolbox, .random = random_, .target = target});
        const auto most = static_cast<size_t>(std::llround(series_.seconds * product.pcm.rate)) *
                          product.pcm.channels;
        if (product.file.empty() && product.pcm.samples.size() > most) {
            product.pcm.samples.resize(most);
        }
        keep(product, target);
        return std::move(product.pcm);
    }

    void keep(const Product& product, const std::string& target)
    {
        std::error_code ignored;
        if (!context_.keep) {
            std::filesystem::remove(product.file, ignored);
            return;
        }
        const std::string file = product.file.empty() ? target + ".wav" : product.file;
        if (product.file.empty()) {
            write_wav(file, product.pcm);
        }
        examined_.file = std::filesystem::path(file).lexically_relative(context_.folder);
    }

    void look_up_clip(const Pcm& pcm)
    {
        const double begin = processor_milliseconds();
        const Query query = query_of(pcm);
        const Answer answer = answer_to(*context_.catalogues.usual, query);
        Outcome& outcome = examined_.outcome;
        outcome.milliseconds = processor_milliseconds() - begin;
        judge(answer);
        if (context_.catalogues.scan != nullptr && track_.is_known()) {
            outcome.by_scan = names(answer_to(*context_.catalogues.scan, query), track_.id);
            outcome.by_parts = names(answer_to(*context_.catalogues.parts, query), track_.id);
        }
    }

    void judge(const Answer& answer)
    {
        Outcome& outcome = examined_.outcome;
        if (!answer.candidates.empty()) {
            outcome.score = answer.candidates.front().score;
            outcome.first = track_.is_known() && answer.candidates.front().track == track_.id;
        }
        outcome.accepted = answer.verdict == KZCAT_VERDICT_MATCH && !answer.matches.empty();
        if (!outcome.accepted) {
            return;
        }
        const FoundTrack& named = answer.matches.front();
        outcome.found = named.source;
        outcome.right = track_.is_known() && named.track == track_.id;
        if (outcome.right) {
            outcome.place_error = std::fabs(named.offset - outcome.seconds);
        } else {
            outcome.same_sound = has_same_sound(named);
        }
    }

    /// Whether a track is named for the undegraded clip too.
    bool has_same_sound(const FoundTrack& named)
    {
        const Answer answer =
            answer_to(*context_.catalogues.usual, query_of(to_pcm_within_scale(clip_)));
        for (const FoundTrack& match : answer.matches) {
            if (match.track == named.track) {
                examined_.outcome.same.push_back({.one = track_.path, .other = named.source});
                return true;
            }
        }
        return false;
    }

    const Context& context_;
    const PlannedClip& planned_;
    const Series& series_;
    const MusicTrack& track_;
    Random random_;
    Clip clip_;
    Examined examined_;
};

} // namespace

Examined examine(const Context& context, const PlannedClip& planned)
{
    return interrupted() ? Examined() : Examination(context, planned).run();
}

} // namespace kzfp::evaluate
