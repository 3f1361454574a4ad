// The folder must be new or empty: clips of two runs would have the same names.

#include "kzfp/evaluate/keeper.hpp"

#include <cerrno>
#include <cmath>
#include <filesystem>

#include "audio/source.hpp"
#include "kzfp/output/json_object.hpp"

namespace kzfp::evaluate {

namespace {

double to_six_places(double number) { return std::round(number * 1e6) / 1e6; }

} // namespace

Keeper::Keeper(const std::string& folder) : path_(folder + "/truth.jsonl")
{
    std::error_code error;
    std::filesystem::create_directories(folder, error);
    if (error) {
        throw audio::FileError(folder + " cannot be made (" + error.message() + ")");
    }
    if (!std::filesystem::is_empty(folder, error) || error) {
        throw audio::FileError(folder + " is not empty; name a new folder for the clips");
    }
    errno = 0;
    file_.open(path_, std::ios::binary);
    if (!file_) {
        throw audio::system_error(path_ + " cannot be written", errno);
    }
}

void Keeper::note(const Series& series, const MusicTrack& track, const Examined& examined)
{
    const Kind& kind = *series.kind;
    JsonObject object = make_object();
    set_path(object, "file", examined.file);
    object["kind"] = kind.name;
    object["length"] = series.seconds;
    object["role"] = track.is_known() ? "known" : "stranger";
    set_path(object, "track", track.path);
    object["seconds"] = to_six_places(examined.outcome.seconds);
    object["speed"] = to_six_places(kind.speed);
    object["tempo"] = to_six_places(kind.tempo);
    object["pitch"] = to_six_places(kind.pitch());
    object["verdict"] = examined.outcome.accepted ? "match" : "no match";
    object["score"] = std::round(examined.outcome.score * 1e3) / 1e3;
    object["right"] = examined.outcome.right;
    object["found"] = nullptr;
    if (!examined.outcome.found.empty()) {
        set_path(object, "found", examined.outcome.found);
    }
    errno = 0;
    if (!(file_ << to_line(object)).flush()) {
        throw audio::system_error(path_ + " cannot be written", errno);
    }
}

} // namespace kzfp::evaluate
