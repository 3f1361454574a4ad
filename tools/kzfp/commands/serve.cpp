// `kzfp serve`: a recognition service, and a page that listens.

#include <algorithm>
#include <string>
#include <thread>

#include "audio/source.hpp"
#include "kzfp/catalogue/handles.hpp"
#include "kzfp/command_line/common_options.hpp"
#include "kzfp/output/write.hpp"
#include "kzfp/serve/run.hpp"

namespace kzfp {

namespace {

using serve::RunSettings;

constexpr const char* kDescription =
    "Answers over HTTP which track of CATALOGUE a clip is from, and serves a page on which a\n"
    "browser listens and asks. What is sent, and what comes back, is documented with the library.";

constexpr const char* kFooter =
    "SIGTERM and Ctrl-C end it in order: what was accepted is answered first; a second one ends\n"
    "it at once. A socket that systemd hands over is used instead of --listen.\n"
    "Exit: 0 it was ended; 1 it could not start, or cut off requests at its end; 2 wrong usage.";

void add_access_options(Parser& parser, RunSettings& settings)
{
    parser
        .add_option("--listen", settings.listen,
                    "Where to listen (default: 127.0.0.1:8080; port 0: one that is free)")
        ->type_name("HOST:PORT");
    parser
        .add_option("--token-file", settings.token_file,
                    "Looking up takes the token that this file has in its first line")
        ->type_name("FILE");
    parser
        .add_option("--write-token-file", settings.write_token_file,
                    "Tracks can be added and removed, with the token of this file")
        ->type_name("FILE");
    Option* const certificate = parser
                                    .add_option("--tls-cert", settings.certificate_file,
                                                "Serve over TLS, with this certificate (PEM)")
                                    ->type_name("FILE");
    Option* const key =
        parser.add_option("--tls-key", settings.key_file, "The certificate's key (PEM)")
            ->type_name("FILE");
    certificate->needs(key);
    key->needs(certificate);
    parser.add_flag("--insecure", settings.insecure,
                    "Let other machines in without a token or TLS");
    parser
        .add_option("--allow-origin", settings.origins,
                    "Pages of this origin may use the service too, as https://a.example; * for any")
        ->type_name("ORIGIN");
    parser
        .add_option("--host", settings.hosts,
                    "A name of the service, besides localhost and addresses in numbers")
        ->type_name("NAME");
}

void add_content_options(Parser& parser, RunSettings& settings)
{
    parser.add_flag(
        "--no-audio", [&settings] { settings.service.rules.audio = false; },
        "Take no sound, only trails, query documents and values");
    parser.add_flag("--hide-sources", settings.service.hide_sources,
                    "Tell only the file names of sources, not their paths");
    Option* const page =
        parser.add_option("--page", settings.page, "Serve the files of this folder as the page")
            ->type_name("FOLDER");
    parser.add_flag("--no-page", settings.no_page, "Serve no page")->excludes(page);
}

void add_limit_options(Parser& parser, RunSettings& settings)
{
    serve::HttpSettings& http = settings.service.http;
    const unsigned cores = std::max(1U, std::thread::hardware_concurrency());
    http.threads = cores;
    settings.service.lookups = cores;
    parser
        .add_option("--threads", http.threads,
                    "Threads that receive and send (default: one for each processor)")
        ->type_name("NUMBER")
        ->range(1, 256);
    parser
        .add_option("--lookups", settings.service.lookups,
                    "Requests to work on at once (default: one for each processor)")
        ->type_name("NUMBER")
        ->range(1, 256);
    parser
        .add_option("--queue", settings.service.places,
                    "Requests that may wait for that; further ones are refused (default: 64)")
        ->type_name("NUMBER")
        ->range(1, 100000);
    parser
        .add_option("--max-body", settings.service.rules.largest_body,
                    "Bytes that sound may have (default: 33554432)")
        ->type_name("BYTES")
        ->range(1024.0, 1073741824.0);
    parser
        .add_option("--longest-clip", settings.service.longest_clip,
                    "Seconds of sound, or of a trail, that are looked up at once (default: 600)")
        ->type_name("SECONDS")
        ->range(1, 86400);
    parser
        .add_option("--max-connections", http.connections,
                    "Connections at once (default: 1024); further ones wait")
        ->type_name("NUMBER")
        ->range(1, 100000);
    parser
        .add_option("--per-address", settings.per_address,
                    "Connections at once from one address (default: 32 where other machines\n"
                    "come, else any number); 0 for any number")
        ->type_name("NUMBER")
        ->range(0, 100000);
    parser
        .add_option("--timeout", http.idle_seconds,
                    "Seconds without a byte after which a connection is closed (default: 15)")
        ->type_name("SECONDS")
        ->range(1, 3600);
    parser
        .add_option("--deadline", http.receive_seconds,
                    "Seconds within which a whole request has to arrive (default: 120)")
        ->type_name("SECONDS")
        ->range(1, 86400);
    parser
        .add_option("--drain", settings.drain_seconds,
                    "Seconds that answers may take after SIGTERM (default: 30)")
        ->type_name("SECONDS")
        ->range(0, 86400);
}

void add_options(Parser& parser, RunSettings& settings)
{
    add_catalogue_option(parser, settings.catalogue);
    add_access_options(parser, settings);
    add_content_options(parser, settings);
    add_limit_options(parser, settings);
    add_choice(parser, "--log", "FORMAT", "a format of the log", serve::kLogFormats,
               settings.service.log);
    parser.add_flag("--log-addresses", settings.service.log_addresses,
                    "Also log the addresses of clients");
}

} // namespace

ExitStatus run_serve(const Arguments& arguments)
{
    Parser parser(kDescription, program_name(arguments));
    parser.footer(kFooter);
    RunSettings settings;
    add_options(parser, settings);
    if (const auto status = parse(parser, arguments)) {
        return *status;
    }
    try {
        serve::run(settings);
        return all_done;
    } catch (const CatalogueError& error) {
        write_message(message_about(settings.catalogue, error));
    } catch (const audio::FileError& error) {
        write_message(error.what());
    }
    return some_file_failed;
}

} // namespace kzfp
