// `kzfp worker`: the files that a server has jobs for become tracks. Each thread has a connection
// of its own, which holds its job: when the program ends in whatever way, others take that.

#include <algorithm>
#include <exception>
#include <thread>
#include <vector>

#include "kzfp/catalogue/guarded.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/command_line/sound_options.hpp"
#include "kzfp/jobs/counts.hpp"
#include "kzfp/jobs/worker.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription =
    "Fingerprints the files that 'kzfp jobs add' queued, beside any number of other workers on\n"
    "this machine and others: each file becomes a track once, whichever worker ends without\n"
    "warning. Ends when no job is left.";

constexpr const char* kFooter =
    "Exit: 0 no job is left, and this worker failed at none; 1 a file failed for good, or the\n"
    "      server did not answer for a minute; 2 wrong usage; 130 interrupted: the files at hand\n"
    "      were finished.";

constexpr FormatChoice kFormats[] = {kHumanFormat, kJsonFormat, kCsvFormat};

/// Runs the workers, and throws on what one of them has thrown, once all have ended.
void run_workers(const WorkerSettings& settings, kzcat_catalogue& catalogue, Reporter& reporter)
{
    std::vector<std::exception_ptr> troubles(settings.threads);
    std::vector<std::thread> threads;
    const auto run = [&](size_t i) {
        try {
            Worker(settings, catalogue, reporter).run();
        } catch (...) {
            troubles[i] = std::current_exception();
        }
    };
    for (size_t i = 1; i < settings.threads; ++i) {
        try {
            threads.emplace_back(run, i);
        } catch (const std::system_error&) { // as many as the system allows
            break;
        }
    }
    run(0);
    std::ranges::for_each(threads, &std::thread::join);
    for (const std::exception_ptr& trouble : troubles) {
        if (trouble) {
            std::rethrow_exception(trouble);
        }
    }
}

ExitStatus work(const WorkerSettings& settings)
{
    // Whatever is wrong with the addresses is reported at once.
    const Jobs jobs = open_jobs(settings.jobs, KZCAT_ACCESS_WRITE);
    const Catalogue catalogue = open_catalogue(settings.catalogue, KZCAT_ACCESS_CREATE);
    const kzcat_job_counts counts = counts_of(*jobs);
    Reporter reporter(settings.output, static_cast<size_t>(counts.waiting + counts.running));
    run_workers(settings, *catalogue, reporter);
    if (settings.output.format == Format::human) {
        write_output(reporter.summary() + '\n');
    }
    if (interrupted()) {
        write_message("interrupted: what was at hand is done; the rest is left to others");
        return interrupted_by_user;
    }
    return reporter.count(Outcome::failed) == 0 && reporter.threads_ended() == 0 ? all_done
                                                                                 : some_file_failed;
}

} // namespace

ExitStatus run_worker(const Arguments& arguments)
{
    Parser parser(kDescription, program_name(arguments));
    parser.footer(kFooter);
    WorkerSettings settings;
    parser
        .add_option("--jobs", settings.jobs,
                    "The catalogue on a server that has the jobs: postgresql://HOST/DATABASE")
        ->required()
        ->type_name("URL");
    parser
        .add_option("--catalogue", settings.catalogue,
                    "Where the tracks go (default: to the catalogue that has the jobs)")
        ->type_name("CATALOGUE");
    parser
        .add_option("-j,--threads", settings.threads,
                    "Files to work on at once (default: one for each processor)")
        ->type_name("NUMBER")
        ->range(1, 256);
    settings.threads = std::max(1U, std::thread::hardware_concurrency());
    parser
        .add_option("--attempts", settings.attempts,
                    "Times that a file is tried before it has failed for good (default: 3)")
        ->type_name("NUMBER")
        ->range(1, 1000);
    parser.add_flag("--wait", settings.wait, "Wait for new jobs when none is left");
    parser.add_flag("--documents", settings.documents, "Also keep what answers query documents");
    add_output_options(parser, kFormats, settings.output);
    add_strict_option(parser, settings.sound.strict);
    add_timeout_option(parser, settings.sound.timeout);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    if (settings.catalogue.empty()) {
        settings.catalogue = settings.jobs;
    }
    watch_for_interruption();
    return guarded(settings.catalogue, settings.output, {}, OutputFile::Mode::live,
                   [&settings] { return work(settings); });
}

} // namespace kzfp
