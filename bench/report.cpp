#include "report.hpp"

#include <array>
#include <cstdlib>
#include <ctime>
#include <fstream>
#include <thread>

#include "measure/bits.hpp"

namespace kz::bench {

namespace {

using Json = nlohmann::ordered_json;

std::string processor()
{
    std::ifstream file("/proc/cpuinfo");
    for (std::string line; std::getline(file, line);) {
        if (line.rfind("model name", 0) == 0) {
            return line.substr(line.find(':') + 2);
        }
    }
    return "unknown";
}

std::string today()
{
    const std::time_t now = std::time(nullptr);
    std::tm date = {};
    gmtime_r(&now, &date);
    std::array<char, 32> text{};
    const size_t length = std::strftime(text.data(), text.size(), "%Y-%m-%d %H:%M UTC", &date);
    return {text.data(), length};
}

Json in_units(const Spread& seconds, const Unit& unit)
{
    return {{"median", seconds.median / unit.seconds},
            {"lower", seconds.lower / unit.seconds},
            {"upper", seconds.upper / unit.seconds},
            {"best", seconds.least / unit.seconds}};
}

Json describe(const Limit& limit)
{
    if (limit.most == 0) {
        return nullptr;
    }
    return {{"peer", limit.peer.empty() ? Json(nullptr) : Json(limit.peer)}, {"most", limit.most}};
}

} // namespace

Json describe_run()
{
    std::array<double, 1> load{};
    getloadavg(load.data(), 1);
    return {{"date", today()},
            {"processor", processor()},
            {"processors", std::thread::hardware_concurrency()},
            {"load", load[0]},
            {"build", KZ_BENCH_BUILD},
            {"variant", variant()}};
}

Json describe(const Case& measured, const Result& result)
{
    Json peers = Json::array();
    for (const PeerResult& peer : result.peers) {
        Json ratio = in_units(peer.ratio, {"", 1});
        ratio["best"] = peer.ratio_of_bests;
        peers.push_back({{"name", peer.name},
                         {"time", in_units(peer.seconds, measured.unit)},
                         {"ratio", std::move(ratio)}});
    }
    return {{"name", measured.name},          {"measures", measured.measures},
            {"unit", measured.unit.name},     {"time", in_units(result.seconds, measured.unit)},
            {"peers", std::move(peers)},      {"must", describe(measured.must)},
            {"goal", describe(measured.goal)}};
}

Json describe(const Growth& growth, const GrowthTable& table)
{
    return {{"name", growth.name},
            {"law", table.law},
            {"holds", table.holds ? Json(*table.holds) : Json(nullptr)},
            {"columns", table.columns},
            {"rows", table.rows}};
}

} // namespace kz::bench
