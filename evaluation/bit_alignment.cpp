// Aligns raw fingerprints by bit errors, as those of Chromaprint are compared: a clip is laid over
// each track at every offset, and the offset with the smallest share of differing bits counts.
//
//   bit_alignment TRACKS CLIPS      each line of either file: a name, a blank, 32-bit values with
//                                   commas between them
//
// Prints one line a clip: its name, and for the best and the second-best track its name, the score
// (0.5 less the share of differing bits) and the offset in values. At least four fifths of the clip
// lie over the track.
#include <algorithm>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iostream>
#include <string>
#include <utility>
#include <vector>

namespace {

struct Print {
    std::string name;
    std::vector<std::uint32_t> values;
};

struct Answer {
    double score = -1;
    std::size_t track = 0;
    std::ptrdiff_t offset = 0;
};

std::vector<Print> read_prints(const char* path)
{
    std::vector<Print> prints;
    std::ifstream file(path);
    for (std::string line; std::getline(file, line);) {
        const std::size_t blank = line.find(' ');
        if (blank == std::string::npos) {
            continue;
        }
        Print print{line.substr(0, blank), {}};
        const char* at = line.c_str() + blank + 1;
        while (*at != '\0') {
            char* end = nullptr;
            print.values.push_back(static_cast<std::uint32_t>(std::strtoul(at, &end, 10)));
            at = *end == ',' ? end + 1 : end;
            if (end == at && *end != '\0') {
                break;
            }
        }
        prints.push_back(std::move(print));
    }
    return prints;
}

std::uint32_t differing_bits(const std::uint32_t* one, const std::uint32_t* other,
                             std::size_t count)
{
    std::uint32_t bits = 0;
    for (std::size_t i = 0; i < count; ++i) {
        bits += static_cast<std::uint32_t>(std::popcount(one[i] ^ other[i]));
    }
    return bits;
}

// The best offset of the clip on one track; a score of -1 when it is too short for any.
Answer best_offset(const Print& clip, const Print& track, std::size_t index)
{
    Answer best;
    best.track = index;
    const auto length = static_cast<std::ptrdiff_t>(clip.values.size());
    const auto whole = static_cast<std::ptrdiff_t>(track.values.size());
    const std::ptrdiff_t least = (4 * length + 4) / 5;
    for (std::ptrdiff_t offset = least - length; offset <= whole - least; ++offset) {
        const std::ptrdiff_t from = std::max<std::ptrdiff_t>(0, -offset);
        const std::ptrdiff_t count = std::min(length, whole - offset) - from;
        if (count < least || count <= 0) {
            continue;
        }
        const std::uint32_t bits =
            differing_bits(clip.values.data() + from, track.values.data() + offset + from,
                           static_cast<std::size_t>(count));
        const double score = 0.5 - bits / (32.0 * static_cast<double>(count));
        if (score > best.score) {
            best.score = score;
            best.offset = offset;
        }
    }
    return best;
}

void look_up(const Print& clip, const std::vector<Print>& tracks)
{
    Answer first;
    Answer second;
    for (std::size_t i = 0; i < tracks.size(); ++i) {
        const Answer answer = best_offset(clip, tracks[i], i);
        if (answer.score > first.score) {
            second = std::exchange(first, answer);
        } else if (answer.score > second.score) {
            second = answer;
        }
    }
    std::cout << clip.name;
    for (const Answer& answer : {first, second}) {
        if (answer.score < 0) {
            std::cout << " - 0 0";
        } else {
            std::cout << ' ' << tracks[answer.track].name << ' ' << answer.score << ' '
                      << answer.offset;
        }
    }
    std::cout << '\n';
}

} // namespace

int main(int argc, char** argv)
{
    if (argc != 3) {
        std::fputs("usage: bit_alignment TRACKS CLIPS\n", stderr);
        return 2;
    }
    const std::vector<Print> tracks = read_prints(argv[1]);
    for (const Print& clip : read_prints(argv[2])) {
        look_up(clip, tracks);
    }
    return 0;
}
