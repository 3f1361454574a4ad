// `kzfp jobs`: what workers are to do, how far they are, and what failed.

#include <filesystem>
#include <functional>
#include <string>
#include <vector>

#include "kzfp/catalogue/guarded.hpp"
#include "kzfp/command_line/choice.hpp"
#include "kzfp/command_line/file_options.hpp"
#include "kzfp/jobs/counts.hpp"
#include "kzfp/output/json_object.hpp"

namespace kzfp {

namespace {

constexpr const char* kDescription =
    "Manages the files that workers (kzfp worker) make tracks of, in the catalogue on a server at\n"
    "URL. Their paths are kept as the workers are to find them: in full.";

constexpr const char* kFooter = "Exit: 0 done; 1 something failed; 2 wrong usage.";

constexpr FormatChoice kFormats[] = {kHumanFormat, kJsonFormat};

struct JobsSettings {
    std::string action;
    std::string url;
    FileArguments files;
    OutputOptions output;
    bool again = false;
    bool failed = false;
};

Jobs open(const JobsSettings& settings, uint32_t access) { return open_jobs(settings.url, access); }

void write_count(const JobsSettings& settings, const char* member, uint64_t count,
                 const std::string& text)
{
    if (settings.output.format == Format::json) {
        JsonObject object = make_object();
        object[member] = count;
        write_output(to_line(object));
    } else {
        write_output(std::to_string(count) + (count == 1 ? " file " : " files ") + text + '\n');
    }
}

/// Files in portions, each of which is kept as a whole: an interrupted run is simply repeated.
class Adding {
public:
    Adding(kzcat_jobs& jobs, bool again) : jobs_(jobs), again_(again) {}

    void add(const std::string& path)
    {
        constexpr size_t kPortion = 1000;
        paths_.push_back(std::filesystem::absolute(path).lexically_normal().string());
        if (paths_.size() == kPortion) {
            flush();
        }
    }

    void flush()
    {
        std::vector<const char*> uris;
        for (const std::string& path : paths_) {
            uris.push_back(path.c_str());
        }
        uint64_t added = 0;
        check(kzcat_jobs_add(&jobs_, uris.data(), uris.size(), again_ ? 1 : 0, &added));
        added_ += added;
        named_ += paths_.size();
        paths_.clear();
    }

    uint64_t added() const { return added_; }
    uint64_t passed_over() const { return named_ - added_; }

private:
    kzcat_jobs& jobs_;
    bool again_;
    std::vector<std::string> paths_;
    uint64_t added_ = 0;
    uint64_t named_ = 0;
};

/// The files to queue; those that were named and are not there are reported and left out. Those
/// of a list need not be on this machine.
std::vector<std::string> files_to_add(const JobsSettings& settings, ExitStatus& status)
{
    const std::vector<std::string> all = all_files(settings.files);
    std::vector<std::string> kept;
    for (size_t i = 0; i < all.size(); ++i) {
        try {
            if (i < settings.files.named.size()) {
                state_of(all[i]);
            }
            kept.push_back(all[i]);
        } catch (const audio::FileError& error) {
            write_message(all[i] + ": " + error.what());
            status = some_file_failed;
        }
    }
    return kept;
}

ExitStatus add(const JobsSettings& settings)
{
    ExitStatus status = all_done;
    const std::vector<std::string> named = files_to_add(settings, status);
    const Jobs jobs = open(settings, KZCAT_ACCESS_CREATE);
    Adding adding(*jobs, settings.again);
    for (const ListedFile& file : list_files(named).files) {
        if (file.trouble.empty()) {
            adding.add(file.path);
        } else {
            write_message(file.path + ": " + file.trouble);
            status = some_file_failed;
        }
    }
    adding.flush();
    const std::string before =
        adding.passed_over() == 0
            ? ""
            : "; " + std::to_string(adding.passed_over()) + " were there before";
    write_count(settings, "added", adding.added(), "to fingerprint" + before);
    return status;
}

void write_failed(const JobsSettings& settings, kzcat_jobs& jobs)
{
    kzcat_failed_job job;
    for (int64_t after = 0; was_found(kzcat_jobs_get_next_failed(&jobs, after, &job));
         after = job.job) {
        write_output(line_of(job, settings.output.format));
    }
}

ExitStatus status(const JobsSettings& settings)
{
    const Jobs jobs = open(settings, KZCAT_ACCESS_READ);
    if (settings.failed) {
        write_failed(settings, *jobs);
    } else {
        write_output(line_of(counts_of(*jobs), settings.output.format));
    }
    return all_done;
}

ExitStatus retry(const JobsSettings& settings)
{
    const Jobs jobs = open(settings, KZCAT_ACCESS_WRITE);
    uint64_t count = 0;
    check(kzcat_jobs_retry(jobs.get(), &count));
    write_count(settings, "retried", count, "to be tried again");
    return all_done;
}

using Action = ExitStatus (*)(const JobsSettings&);

constexpr Choice<Action> kActions[] = {
    {"add", add, "queues files, and the sound files below folders, for workers"},
    {"status", status, "how many wait, run, are done and have failed"},
    {"retry", retry, "has those that failed for good tried again"},
};

void check_together(const JobsSettings& settings)
{
    if (settings.action == "add") {
        check_files_are_given(settings.files);
    } else if (!inputs_of(settings.files).empty()) {
        refuse_value("FILE", "goes with 'kzfp jobs add'");
    }
    if (settings.again && settings.action != "add") {
        refuse_value("--again", "goes with 'kzfp jobs add'");
    }
    if (settings.failed && settings.action != "status") {
        refuse_value("--failed", "goes with 'kzfp jobs status'");
    }
}

} // namespace

ExitStatus run_jobs(const Arguments& arguments)
{
    Parser parser(kDescription, program_name(arguments));
    parser.footer(kFooter);
    JobsSettings settings;
    parser.add_option("ACTION", settings.action, explanations_in(kActions))
        ->required()
        ->type_name("")
        ->check([](const std::string& name) {
            return value_of(kActions, name) ? std::string()
                                            : not_a_choice(kActions, "an action", name);
        });
    parser
        .add_option("URL", settings.url,
                    "The catalogue on a server that has the jobs: postgresql://HOST/DATABASE")
        ->required()
        ->type_name("");
    add_file_options(parser, settings.files, "Sound files and folders, for 'add'");
    parser.add_flag("--again", settings.again,
                    "Add files too that are done or have failed: those that have changed since\n"
                    "are read again");
    parser.add_flag("--failed", settings.failed,
                    "Instead of numbers, the files that failed for good, and why");
    add_output_options(parser, kFormats, settings.output);
    parser.when_read([&settings] { check_together(settings); });
    if (const auto outcome = parse(parser, arguments)) {
        return *outcome;
    }
    return guarded(settings.url, settings.output, inputs_of(settings.files),
                   OutputFile::Mode::whole,
                   [&settings] { return (*value_of(kActions, settings.action))(settings); });
}

} // namespace kzfp
