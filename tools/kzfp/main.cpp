// kzfp: prints the fingerprints of sound files.

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <exception>
#include <iostream>
#include <new>
#include <string_view>
#include <typeinfo>
#include <utility>

#include <cxxabi.h>
#include <fcntl.h>
#include <unistd.h>

#include "audio_source.hpp"
#include "disc_command.hpp"
#include "fingerprint.hpp"
#include "input.hpp"
#include "options.hpp"
#include "output.hpp"

namespace {

using namespace kzfp;

[[noreturn]] void end_short_of_memory()
{
    constexpr std::string_view kMessage = "kzfp: not enough memory\n";
    static_cast<void>(!::write(STDERR_FILENO, kMessage.data(), kMessage.size()));
    ::_exit(some_file_failed);
}

std::terminate_handler usual_end;

/// Memory can be too short to make an exception, or to report one that was caught.
void end_uncaught()
{
    const std::type_info* const type = abi::__cxa_current_exception_type();
    if (type == nullptr || *type == typeid(std::bad_alloc)) {
        end_short_of_memory();
    }
    usual_end();
}

/// Before the first object of the program is made: what that throws is caught by nobody.
[[gnu::constructor(101)]] void watch_for_uncaught()
{
    usual_end = std::set_terminate(end_uncaught);
}

struct Result {
    InputFacts facts;
    Fingerprint fingerprint;
};

/// Tries with more and more of a pipe; a regular file is read once. A decoder that met the end of
/// what has arrived may have made up the last samples, so its complaint counts as "not enough" too.
Result process(const std::string& name, const Options& options)
{
    Input input(name, options);
    for (;;) {
        try {
            const OpenedInput opened = input.open();
            Fingerprint fingerprint = take_fingerprint(*opened.source, options.algorithm);
            if (opened.source->trouble().empty() || !input.extend()) {
                return {opened.facts, std::move(fingerprint)};
            }
        } catch (const FileError&) {
            if (!input.extend()) {
                throw;
            }
        }
    }
}

std::string shown_name(const std::string& name) { return name == "-" ? "standard input" : name; }

/// True when the file's fingerprint was written.
bool process_and_write(const std::string& name, const Options& options, Progress& progress)
{
    const auto report = [&](const std::string& what) {
        progress.clear();
        write_message(shown_name(name) + ": " + what);
        return false;
    };
    try {
        const Result result = process(name, options);
        if (!takes_rate(options.algorithm, result.facts.rate)) {
            report("the library does not take " + std::to_string(result.facts.rate) +
                   " Hz, converted to " + std::to_string(kConvertedRate) + " Hz");
        }
        progress.clear();
        write_output(to_text(options, name, result.facts, result.fingerprint));
        return true;
    } catch (const FileError& error) {
        return report(error.what());
    } catch (const std::bad_alloc&) {
        return report("not enough memory");
    }
}

ExitStatus process_all(const Options& options)
{
    const Library library;
    Progress progress(options.files.size());
    ExitStatus status = all_done;
    for (size_t i = 0; i < options.files.size(); ++i) {
        progress.show(i + 1, options.files[i]);
        if (!process_and_write(options.files[i], options, progress)) {
            status = some_file_failed;
        }
    }
    return status;
}

/// A standard descriptor that is closed would be given to the first file that is opened.
bool prepare_standard_descriptors()
{
    const bool has_output = ::fcntl(STDOUT_FILENO, F_GETFD) >= 0;
    for (const int number : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
        if (::fcntl(number, F_GETFD) < 0) {
            static_cast<void>(::open("/dev/null", O_RDWR)); // the lowest number that is free
        }
    }
    return has_output;
}

} // namespace

int main(int argc, char** argv)
{
    if (!prepare_standard_descriptors()) {
        write_message("kzfp: standard output is closed, a place to write to is needed");
        return some_file_failed;
    }
    std::signal(SIGPIPE, SIG_IGN); // a closed pipe is met as an error of write()
    try {
        if (is_disc_command(argc, argv)) {
            return run_disc_command(argc, argv);
        }
        const auto parsed = parse_command_line(argc, argv);
        if (const auto* status = std::get_if<ExitStatus>(&parsed)) {
            return *status == all_done && !std::cout.flush() ? some_file_failed : *status;
        }
        return process_all(std::get<Options>(parsed));
    } catch (const OutputError& error) {
        if (!error.reader_left) { // who closes a pipe has seen enough, and wants no message
            write_message(std::string("kzfp: ") + error.what());
        }
        return some_file_failed;
    } catch (const std::bad_alloc&) {
        end_short_of_memory();
    } catch (const std::exception& error) {
        write_message(std::string("kzfp: ") + error.what());
        return some_file_failed;
    }
}
