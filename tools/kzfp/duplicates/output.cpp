#include "kzfp/duplicates/output.hpp"

#include <algorithm>
#include <cmath>
#include <string>
#include <utility>
#include <vector>

#include "kzfp/catalogue/answer.hpp"
#include "kzfp/output/csv.hpp"
#include "kzfp/output/json_object.hpp"
#include "kzfp/output/printed.hpp"
#include "kzfp/output/write.hpp"

namespace kzfp {

namespace {

using State = Quality::State;

constexpr size_t kLongestWord = 16;
constexpr size_t kColumns = 15; ///< of duplicates_csv_header()

const char* word_of(State state)
{
    switch (state) {
    case State::there:
        return "there";
    case State::gone:
        return "gone";
    case State::unreadable:
        break;
    }
    return "unreadable";
}

/// The best file of a group is one that is there, or there is none.
bool has_best(const Finding& finding)
{
    return finding.files.front().quality.state == State::there;
}

const char* kinship_in(const Finding& finding, const FoundFile& file)
{
    const bool first = &file == &finding.files.front();
    return first && !has_best(finding) ? "not there" : word_of(file.kinship);
}

/// To so many digits behind the point; never minus zero.
double round_to(double number, int digits)
{
    const double unit = std::pow(10.0, digits);
    return std::round(number * unit) / unit + 0.0;
}

std::string rounded(double number, int digits)
{
    return printed("%.*f", digits, round_to(number, digits));
}

/// "lossless, 44100 Hz, 2 channels, 912 kbit/s, up to 20.5 kHz"
std::string quality_text(const Quality& quality)
{
    if (quality.state == State::gone) {
        return "the file is not there";
    }
    if (quality.state == State::unreadable) {
        return "cannot be read: " + quality.trouble;
    }
    if (quality.rate == 0) {
        return "a trail, no sound";
    }
    std::string text = quality.lossless ? "lossless" : "lossy";
    text += ", " + std::to_string(quality.rate) + " Hz, " + std::to_string(quality.channels) +
            (quality.channels == 1 ? " channel, " : " channels, ") +
            rounded(quality.bit_rate / 1000, 0) + " kbit/s";
    if (quality.bandwidth > 0) {
        text += ", up to " + rounded(quality.bandwidth / 1000, 1) + " kHz";
    }
    return text;
}

std::string line_of(const Finding& finding, const FoundFile& file, const Style& style)
{
    const bool is_best = &file == &finding.files.front() && has_best(finding);
    std::string word = kinship_in(finding, file);
    word.append(kLongestWord - std::min(kLongestWord, word.size()), ' ');
    std::string text =
        "  " + (is_best ? style.green(word) : word) + without_control_characters(file.file.path);
    if (file.kinship == Kinship::excerpt) {
        text += ", from " + clock_text(file.offset) + " on";
    }
    return text +
           style.dim(" (" + clock_text(file.seconds) + ", " +
                     without_control_characters(quality_text(file.quality)) + ")") +
           '\n';
}

JsonObject object_of(const Finding& finding, const FoundFile& file)
{
    JsonObject object = JsonObject::object();
    const bool first = &file == &finding.files.front();
    set_path(object, "file", file.file.path);
    object["track"] = file.track;
    object["best"] = first && has_best(finding);
    object["relation"] = kinship_in(finding, file);
    object["offset"] = round_to(file.offset, 3);
    object["error_rate"] = round_to(file.error_rate, 4);
    if (file.copy_of) {
        set_path(object, "copy_of", finding.files[*file.copy_of].file.path);
    }
    object["seconds"] = round_to(file.seconds, 3);
    object["state"] = word_of(file.quality.state);
    if (file.quality.state == State::unreadable) {
        object["error"] = file.quality.trouble;
    }
    if (file.quality.rate != 0) {
        object["lossless"] = file.quality.lossless;
        object["sample_rate"] = file.quality.rate;
        object["channels"] = file.quality.channels;
        object["bit_rate"] = round_to(file.quality.bit_rate, 0);
        object["bandwidth"] = file.quality.bandwidth;
    }
    return object;
}

} // namespace

std::string to_text(const Finding& finding, size_t number, const Style& style)
{
    std::string text = style.bold("Group " + std::to_string(number) + ": " +
                                  std::to_string(finding.files.size()) + " files") +
                       '\n';
    for (const FoundFile& file : finding.files) {
        text += line_of(finding, file, style);
    }
    return text;
}

std::string to_json(const Finding& finding, size_t number)
{
    JsonObject object = make_object();
    object["group"] = number;
    JsonObject files = JsonObject::array();
    for (const FoundFile& file : finding.files) {
        files.push_back(object_of(finding, file));
    }
    object["files"] = std::move(files);
    return to_line(object);
}

std::string duplicates_csv_header()
{
    return "group,file,track,best,relation,offset,error_rate,copy_of,seconds,state,lossless,"
           "sample_rate,channels,bit_rate,bandwidth\n";
}

std::string to_csv(const Finding& finding, size_t number)
{
    std::string text;
    for (const FoundFile& file : finding.files) {
        const bool is_best = &file == &finding.files.front() && has_best(finding);
        const Quality& quality = file.quality;
        std::vector<std::string> fields = {
            std::to_string(number),      file.file.path,
            std::to_string(file.track),  is_best ? "1" : "0",
            kinship_in(finding, file),   rounded(file.offset, 3),
            rounded(file.error_rate, 4), file.copy_of ? finding.files[*file.copy_of].file.path : "",
            rounded(file.seconds, 3),    word_of(quality.state)};
        if (quality.rate != 0) {
            const std::string lossless = quality.lossless ? "1" : "0";
            fields.insert(fields.end(),
                          {lossless, std::to_string(quality.rate), std::to_string(quality.channels),
                           rounded(quality.bit_rate, 0), rounded(quality.bandwidth, 0)});
        }
        fields.resize(kColumns);
        text += csv_line(fields);
    }
    return text;
}

std::string summary_text(size_t groups, size_t more, size_t recordings)
{
    if (groups == 0) {
        return "no duplicates among " + std::to_string(recordings) +
               (recordings == 1 ? " recording" : " recordings");
    }
    return std::to_string(groups) + (groups == 1 ? " group" : " groups") + " of duplicates; " +
           std::to_string(more) + (more == 1 ? " file" : " files") + " beside the best ones";
}

} // namespace kzfp
