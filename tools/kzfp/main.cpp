// kzfp: the process around a command. Whatever goes wrong, memory for a message included, ends in
// one line on standard error and a status, never in a signal.

#include <csignal>
#include <cstdio>
#include <exception>
#include <new>
#include <string_view>
#include <typeinfo>

#include <cxxabi.h>
#include <fcntl.h>
#include <unistd.h>

#include "audio/decoder_messages.hpp"
#include "kzfp/catalogue/addresses.hpp"
#include "kzfp/commands/table.hpp"
#include "kzfp/output/write.hpp"

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

/// Before the first object of the program is constructed, whose exceptions nothing catches.
[[gnu::constructor(101)]] void watch_for_uncaught()
{
    usual_end = std::set_terminate(end_uncaught);
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
    std::signal(SIGPIPE, SIG_IGN); // a closed pipe shows as an error of write()
    std::signal(SIGXFSZ, SIG_IGN); // so does a limit on the size of files
    audio::silence_decoders();
    try {
        hide_passwords(argc, argv);
        return run_command(argc, argv);
    } catch (const OutputError& error) {
        if (!error.reader_left) { // a closed pipe needs no message: its reader has seen enough
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
