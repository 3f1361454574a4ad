// kzbench: what the library costs, beside what others cost.
//
//   kzbench pairs [case...]     times cases beside their peers
//   kzbench grow [table...]     shows how the cost grows
//   kzbench digests [case...]   prints what the cases yield
//   kzbench count [case...]     runs each case once for callgrind to count; see bench/counts.py
//   kzbench list                prints the cases' names

#include <cstdio>
#include <fstream>
#include <iostream>

#include <CLI/CLI.hpp>

#include "case.hpp"
#include "choice.hpp"
#include "growth/growth.hpp"
#include "kzsdk/kzsdk.h"
#include "measure/bits.hpp"
#include "measure/contest.hpp"
#include "measure/counted.hpp"
#include "report.hpp"

namespace {

using namespace kz::bench;
using Json = nlohmann::ordered_json;

struct Options {
    std::vector<std::string> names;
    std::string output = "-";
    int rounds = 15;
    double slice_milliseconds = 15;
    bool thorough = false;
};

void start_library()
{
    kzconf_configuration configuration;
    kzconf_initialize_configuration(&configuration);
    require(kzinit_initialize_vesk(&configuration) == KZ_OK, "the library does not start");
}

void write(const Json& report, const std::string& path)
{
    if (path == "-") {
        std::cout << report.dump(1) << '\n';
        return;
    }
    std::ofstream file(path);
    file << report.dump(1) << '\n';
    require(file.good(), "cannot write " + path);
}

/// All cases take part in every round, so that a noisy minute touches a little of each.
void measure_pairs(const Options& options)
{
    const auto cases = chosen(all_cases(), options.names);
    std::cerr << "comparing words with the plain variant's\n";
    require_plain_bits(cases);
    Json report = describe_run();
    std::vector<Contest> contests;
    for (const Case& one : cases) {
        std::cerr << "preparing " << one.name << '\n';
        contests.emplace_back(one.prepare(), options.slice_milliseconds * 1e-3);
    }
    for (int round = 0; round < options.rounds; ++round) {
        std::cerr << "round " << round + 1 << " of " << options.rounds << '\n';
        for (Contest& contest : contests) {
            contest.round(round % 2 == 1);
        }
    }
    report["rounds"] = options.rounds;
    report["cases"] = Json::array();
    for (size_t i = 0; i < cases.size(); ++i) {
        report["cases"].push_back(describe(cases[i], contests[i].result()));
    }
    report["load_at_end"] = describe_run()["load"];
    write(report, options.output);
}

void measure_growth(const Options& options)
{
    Json report = describe_run();
    report["tables"] = Json::array();
    for (const Growth& growth : chosen(all_growths(), options.names)) {
        std::cerr << "measuring " << growth.name << '\n';
        report["tables"].push_back(describe(growth, growth.measure(options.thorough)));
    }
    write(report, options.output);
}

void list()
{
    for (const Case& one : all_cases()) {
        std::printf("%-28s %s, in %s\n", one.name.c_str(), one.measures.c_str(),
                    one.unit.name.c_str());
    }
}

} // namespace

int main(int argc, char** argv)
try {
    Options options;
    CLI::App app("What the library costs, beside what others cost.", "kzbench");
    app.require_subcommand(1);
    auto* const pairs = app.add_subcommand("pairs", "time cases beside their peers");
    pairs->add_option("--rounds", options.rounds, "pairs of slices for each peer")
        ->check(CLI::PositiveNumber);
    pairs->add_option("--slice", options.slice_milliseconds, "length of a slice in ms")
        ->check(CLI::PositiveNumber);
    auto* const grow = app.add_subcommand("grow", "show how the cost grows");
    grow->add_flag("--long", options.thorough, "take sizes that take minutes");
    auto* const digests = app.add_subcommand("digests", "print what the cases yield");
    auto* const count = app.add_subcommand("count", "run each case once for callgrind to count");
    for (auto* const command : {pairs, grow, digests, count}) {
        command->add_option("case", options.names, "names, or their beginnings; default: all");
    }
    for (auto* const command : {pairs, grow}) {
        command->add_option("--output", options.output,
                            "file for the results; - is standard output");
    }
    app.add_subcommand("list", "print the cases' names");
    CLI11_PARSE(app, argc, argv);

    start_library();
    if (pairs->parsed()) {
        measure_pairs(options);
    } else if (grow->parsed()) {
        measure_growth(options);
    } else if (digests->parsed()) {
        print_digests(chosen(all_cases(), options.names));
    } else if (count->parsed()) {
        run_counted(chosen(all_cases(), options.names));
    } else {
        list();
    }
    return 0;
} catch (const std::exception& failure) {
    std::cerr << "kzbench: " << failure.what() << '\n';
    return 1;
}
