// Clips are made and looked up by several threads; what came of them is counted by one, in the
// order of the plan, so that the table does not depend on the threads.

#include "kzfp/evaluate/run.hpp"

#include <cerrno>
#include <filesystem>
#include <optional>
#include <set>
#include <utility>

#include "audio/source.hpp"
#include "kzfp/catalogue/files.hpp"
#include "kzfp/catalogue/in_order.hpp"
#include "kzfp/evaluate/examiner.hpp"
#include "kzfp/evaluate/keeper.hpp"
#include "kzfp/evaluate/scratch.hpp"
#include "kzfp/output/interruption.hpp"
#include "kzfp/output/progress.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp::evaluate {

namespace {

namespace fs = std::filesystem;

struct Opening {
    uint32_t plan;
    bool fall_back;
    uint32_t index_from = 0;
};

Catalogue open_with(const std::string& path, const Opening& opening)
{
    kzcat_settings settings;
    check(kzcat_initialize_settings(&settings));
    settings.plan = opening.plan;
    settings.fall_back = opening.fall_back ? 1 : 0;
    settings.index_from = opening.index_from;
    return open_catalogue(path, KZCAT_ACCESS_READ, &settings);
}

uint32_t usual_plan(Plan plan)
{
    if (plan == Plan::scan) {
        return KZCAT_PLAN_SCAN;
    }
    return plan == Plan::parts ? KZCAT_PLAN_PARTS : KZCAT_PLAN_MEASURED;
}

/// The catalogue, opened as often as is needed.
class OpenCatalogue {
public:
    /// A catalogue that is `ours` gets an index whatever its size when the plan needs one; beside
    /// one that was there already, no file is left that would not be there otherwise.
    OpenCatalogue(const std::string& path, Plan plan, bool ours)
        : usual_(open_with(path, {.plan = usual_plan(plan),
                                  .fall_back = true,
                                  .index_from = ours && plan == Plan::parts ? 1U : 0U})),
          facts_(facts_of(usual_))
    {
        // Where the index is in use, what it misses is worth a line.
        if (plan == Plan::both || (plan == Plan::measured && has_index(facts_))) {
            scan_ = open_with(path, {.plan = KZCAT_PLAN_SCAN, .fall_back = false});
            parts_ = open_with(
                path, {.plan = KZCAT_PLAN_PARTS, .fall_back = false, .index_from = ours ? 1U : 0U});
            both_ = has_index(facts_of(parts_));
        }
    }
    const kzcat_facts& facts() const { return facts_; }
    bool both() const { return both_; }
    bool lacks_index() const { return parts_ && !both_; }
    Catalogues handles() const
    {
        return both_ ? Catalogues{usual_.get(), scan_.get(), parts_.get()}
                     : Catalogues{.usual = usual_.get()};
    }

private:
    static kzcat_facts facts_of(const Catalogue& catalogue)
    {
        kzcat_facts facts;
        check(kzcat_get_facts(catalogue.get(), 1, &facts));
        return facts;
    }
    static bool has_index(const kzcat_facts& facts)
    {
        return facts.plan == uint32_t{KZCAT_PLAN_PARTS};
    }

    Catalogue usual_;
    Catalogue scan_;
    Catalogue parts_;
    kzcat_facts facts_;
    bool both_ = false;
};

std::vector<std::string> paths_of(const Settings& settings, bool& complete)
{
    std::vector<std::string> paths;
    for (const ListedFile& file : list_files(settings.files).files) {
        if (file.trouble.empty()) {
            paths.push_back(file.path);
        } else {
            write_message(file.path + ": " + file.trouble);
            complete = false;
        }
    }
    return paths;
}

Music read_music(const Settings& settings, const std::vector<std::string>& paths,
                 const std::string& catalogue)
{
    Progress progress(paths.size(), settings.progress);
    const FileDone done = [&progress](size_t count, const std::string& path) {
        progress.show(count, path);
    };
    return settings.catalogue.empty()
               ? make_catalogue(paths, catalogue, settings.seed, settings.jobs, done)
               : look_up_files(paths, catalogue, settings.jobs, done);
}

class Run {
public:
    explicit Run(const Settings& settings) : settings_(settings)
    {
        if (!settings.keep.empty()) {
            keeper_.emplace(settings.keep);
        }
        list_series();
    }

    Evaluation run()
    {
        const std::string path =
            settings_.catalogue.empty() ? scratch_.path("music.kzc") : settings_.catalogue;
        read(path);
        if (!interrupted()) {
            const OpenCatalogue catalogue(path, settings_.plan, settings_.catalogue.empty());
            table().catalogue_tracks = catalogue.facts().tracks;
            table().both_plans = catalogue.both();
            table().without_index = catalogue.lacks_index();
            examine_all(catalogue);
        }
        table().partial = interrupted();
        return std::move(evaluation_);
    }

private:
    Table& table() { return evaluation_.table; }

    void list_series()
    {
        std::vector<Series> wanted;
        for (const double seconds : settings_.lengths) {
            for (const Kind* const kind : settings_.kinds) {
                wanted.push_back({.kind = kind, .seconds = seconds});
            }
        }
        for (size_t i = 0; i < wanted.size(); ++i) {
            const Kind& kind = *wanted[i].kind;
            table().rows.push_back({.name = series_name(wanted, i),
                                    .explanation = kind.explanation,
                                    .seconds = wanted[i].seconds,
                                    .not_made = kind.missing(toolbox_),
                                    .curve = kind.curve,
                                    .tally = {}});
            if (table().rows.back().not_made.empty()) {
                series_.push_back(wanted[i]);
                rows_.push_back(i);
            }
        }
    }

    void read(const std::string& catalogue)
    {
        const std::vector<std::string> paths = paths_of(settings_, evaluation_.complete);
        music_ = read_music(settings_, paths, catalogue);
        for (const std::string& complaint : music_.complaints) {
            write_message(complaint);
        }
        evaluation_.complete = evaluation_.complete && music_.failed == 0;
        if (music_.tracks.empty() && !interrupted()) {
            throw audio::FileError("there is no music to evaluate with; name sound files or "
                                   "folders that have some");
        }
        table().tracks = music_.known();
        table().strangers = music_.tracks.size() - music_.known();
        table().hours = music_.seconds() / 3600;
        table().seed = settings_.seed;
        table().identical = music_.identical;
        if (!settings_.catalogue.empty() && music_.known() == 0) {
            write_message(settings_.catalogue +
                          ": has none of these files, so that only false matches can be "
                          "measured; kzfp add puts files into a catalogue");
        }
    }

    void examine_all(const OpenCatalogue& catalogue)
    {
        const std::vector<PlannedClip> plan =
            plan_clips(music_, series_, settings_.clips, settings_.seed);
        say_what_is_too_short(plan);
        const Context context = {.music = music_,
                                 .series = series_,
                                 .toolbox = toolbox_,
                                 .catalogues = catalogue.handles(),
                                 .folder = folder(),
                                 .seed = settings_.seed,
                                 .keep = keeper_.has_value()};
        for (size_t i = 0; i < series_.size(); ++i) {
            fs::create_directories(folder() + "/" + series_name(series_, i));
        }
        Progress progress(plan.size(), settings_.progress);
        in_order(
            plan.size(), settings_.jobs, [&](size_t i) { return examine(context, plan[i]); },
            [&](size_t i, const Examined& examined) {
                progress.clear();
                take(plan[i], examined);
                progress.show(i + 1, plan[i].name);
            });
    }

    std::string folder() const { return keeper_ ? settings_.keep : scratch_.path("clips"); }

    void say_what_is_too_short(const std::vector<PlannedClip>& plan)
    {
        std::set<size_t> planned;
        for (const PlannedClip& clip : plan) {
            planned.insert(clip.series);
        }
        for (size_t i = 0; i < series_.size(); ++i) {
            if (!planned.contains(i)) {
                write_message(series_name(series_, i) +
                              ": no track is long enough; --length makes shorter clips");
                evaluation_.complete = false;
            }
        }
    }

    void take(const PlannedClip& planned, const Examined& examined)
    {
        const Outcome& outcome = examined.outcome;
        table().rows[rows_[planned.series]].tally.add(outcome);
        for (const SameRecording& pair : outcome.same) {
            ++table().same_sound[pair];
        }
        const MusicTrack& track = music_.tracks[planned.track];
        if (outcome.state == Outcome::State::failed) {
            evaluation_.complete = false;
            write_message(planned.name + " of " + track.path + ": " + outcome.trouble);
        }
        if (keeper_ && outcome.state == Outcome::State::looked_up) {
            keeper_->note(series_[planned.series], track, examined);
        }
    }

    const Settings& settings_;
    const Toolbox toolbox_;
    const ScratchFolder scratch_;
    std::optional<Keeper> keeper_;
    Music music_;
    std::vector<Series> series_; ///< those that can be made
    std::vector<size_t> rows_;   ///< of the table, one for each of them
    Evaluation evaluation_;
};

} // namespace

Evaluation evaluate(const Settings& settings) { return Run(settings).run(); }

} // namespace kzfp::evaluate
