/// @file
/// Writes the library's coefficient tables as C++ source: tablegen <output file>
///
/// The formulas are where the library uses them, in kzsdk/dsp/filter_design.hpp and
/// kzsdk/kernels/butterfly.hpp. A machine whose mathematics rounds otherwise must not make another
/// library: the words are compared with a digest, and a difference fails the build.

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iostream>
#include <sstream>
#include <string_view>
#include <vector>

#include "kzsdk/dsp/filter_design.hpp"
#include "kzsdk/kernels/butterfly.hpp"
#include "tables/short_filters.hpp"

namespace {

struct Polyphase {
    uint32_t hertz, up, down;
    double gain;
};

constexpr Polyphase kPolyphase[] = {
    {.hertz = 8000,
     .up = 441,
     .down = 320,
     .gain = 0.5}, // the centre tap, 441/320, would not fit Q31
    {.hertz = 16000, .up = 441, .down = 640, .gain = 1.0},
    {.hertz = 24000, .up = 147, .down = 320, .gain = 1.0},
    {.hertz = 32000, .up = 441, .down = 1280, .gain = 1.0},
    {.hertz = 48000, .up = 147, .down = 640, .gain = 1.0},
};

std::vector<int32_t> to_q31(const std::vector<float>& taps, double gain)
{
    std::vector<int32_t> words;
    for (const float tap : taps) {
        words.push_back(
            static_cast<int32_t>(std::lround(static_cast<double>(tap) * gain * 0x1p31)));
    }
    return words;
}

void write_value(std::ostream& out, int32_t word) { out << word; }

// Hexadecimal, which shows every bit.
void write_value(std::ostream& out, float value) { out << std::hexfloat << value << 'F'; }

// FNV-1a over the bits of every value, low byte first.
class Digest {
public:
    void take(uint32_t bits)
    {
        for (int byte = 0; byte < 4; ++byte) {
            hash_ = (hash_ ^ ((bits >> (8 * byte)) & 0xffU)) * 0x100000001b3U;
        }
    }
    void take(int32_t word) { take(static_cast<uint32_t>(word)); }
    void take(float value) { take(std::bit_cast<uint32_t>(value)); }
    uint64_t value() const { return hash_; }

private:
    uint64_t hash_ = 0xcbf29ce484222325U;
};

constexpr uint64_t kKnownDigest = 0x6c676693ad4e4d42U;

// The source files that are written, and the digest of what is in them: what the inner loops read,
// and the fixed-point prototypes that callers can request.
struct Source {
    std::ostream& text;
    std::ostream& prototypes;
    Digest digest;
};

template <class Value>
void write_array(std::ostream& out, std::string_view type, std::string_view name,
                 const std::vector<Value>& values)
{
    out << "const " << type << ' ' << name << '[' << values.size() << "] = {";
    for (size_t i = 0; i < values.size(); ++i) {
        out << (i % 12 == 0 ? "\n    " : " ");
        write_value(out, values[i]);
        out << ',';
    }
    out << "\n};\n\n";
}

template <class Value>
void write_array(std::ostream& out, Digest& digest, std::string_view type, std::string_view name,
                 const std::vector<Value>& values)
{
    write_array(out, type, name, values);
    for (const Value value : values) {
        digest.take(value);
    }
}

template <class Value>
void write_array(Source& out, std::string_view type, std::string_view name,
                 const std::vector<Value>& values)
{
    write_array(out.text, out.digest, type, name, values);
}

// The taps in two halves, which is how fixed-point inner loops multiply them, and their accessors.
void write_filter(Source& out, uint32_t hertz, const std::vector<int32_t>& words)
{
    std::vector<int16_t> msb;
    std::vector<uint16_t> lsb;
    for (const int32_t word : words) {
        msb.push_back(static_cast<int16_t>(word >> 16));
        lsb.push_back(static_cast<uint16_t>(word & 0xffff));
    }
    out.prototypes << "namespace hertz_" << hertz << " {\n";
    write_array(out.prototypes, out.digest, "int16_t", "msb", msb);
    write_array(out.prototypes, out.digest, "uint16_t", "lsb", lsb);
    out.prototypes << "} // namespace hertz_" << hertz << "\n\n";
    const auto accessor = [&](std::string_view type, std::string_view what) -> std::ostream& {
        return out.prototypes << type << " kzdsp_get_" << hertz << "_11025_fixed_coeff_" << what
                              << "() noexcept";
    };
    accessor("const int16_t*", "msb") << " { return hertz_" << hertz << "::msb; }\n";
    accessor("const uint16_t*", "lsb") << " { return hertz_" << hertz << "::lsb; }\n";
    accessor("uint32_t", "length") << " { return " << words.size() << "; }\n\n";
}

// The same taps once more, in rows. These words follow from those that the digest covers.
void write_rows(std::ostream& out, uint32_t hertz, uint32_t up, uint32_t down,
                const std::vector<int32_t>& words)
{
    constexpr size_t kWidestVector = 8;
    const size_t per_phase = words.size() / up;
    const size_t row_length = (per_phase + kWidestVector - 1) / kWidestVector * kWidestVector;
    std::vector<int32_t> row_of(up);
    std::vector<int32_t> taps(kWidestVector + up * row_length);
    std::vector<int32_t> high_parts(taps.size());
    std::vector<int32_t> high_sums(up);
    int32_t largest_high = 0;
    size_t used = 0;
    for (uint32_t row = 0, phase = 0; row < up; ++row, phase = (phase + down) % up) {
        row_of[phase] = static_cast<int32_t>(row);
        for (size_t k = 0; k < per_phase; ++k) {
            const int32_t word = words[phase + k * up];
            const int32_t high = word >> 16;
            const size_t column = per_phase - 1 - k;
            const size_t at = kWidestVector + row * row_length + column;
            used = word != 0 ? std::max(used, column + 1) : used;
            taps[at] = std::bit_cast<int32_t>(std::rotl(std::bit_cast<uint32_t>(word), 16));
            high_parts[at] = high + ((word >> 15) & 1);
            high_sums[row] += high;
            largest_high = std::max(largest_high, std::abs(high));
        }
    }
    out << "namespace hertz_" << hertz << " {\n";
    write_array(out, "uint16_t", "row_of", row_of);
    write_array(out, "int32_t", "taps", taps);
    write_array(out, "int16_t", "high_parts", high_parts);
    write_array(out, "int32_t", "high_sums", high_sums);
    out << "} // namespace hertz_" << hertz << "\n\nconst kz::kernels::PhaseRows kz::kernels::rows_"
        << hertz << " = {" << up << ", " << row_length << ", " << used << ", " << largest_high
        << ", hertz_" << hertz << "::row_of,\n    hertz_" << hertz << "::taps + " << kWidestVector
        << ", hertz_" << hertz << "::high_parts + " << kWidestVector << ", hertz_" << hertz
        << "::high_sums};\n\n";
}

// The same design for the floating-point resampler, phase by phase.
void write_phases(Source& out, const Polyphase& rate, const std::vector<float>& taps)
{
    std::vector<float> phases;
    for (uint32_t phase = 0; phase < rate.up; ++phase) {
        for (size_t i = phase; i < taps.size(); i += rate.up) {
            phases.push_back(taps[i]);
        }
    }
    out.text << "namespace hertz_" << rate.hertz << " {\n";
    write_array(out, "float", "phases", phases);
    out.text << "} // namespace hertz_" << rate.hertz << "\n\n";
}

void write_filters(Source& out)
{
    std::ostringstream designed;
    for (const Polyphase& rate : kPolyphase) {
        const auto layout = kz::dsp::filter_layout(rate.up, rate.down);
        std::vector<float> taps(layout.length);
        kz::dsp::design_windowed_sinc(layout, taps);
        const auto words = to_q31(taps, rate.gain);
        write_filter(out, rate.hertz, words);
        write_rows(out.text, rate.hertz, rate.up, rate.down, words);
        write_phases(out, rate, taps);
        designed << "    {" << rate.up << ", " << rate.down << ", " << taps.size() / rate.up
                 << ", hertz_" << rate.hertz << "::phases},\n";
    }
    out.text << "const kz::kernels::DesignedFilter kz::kernels::designed_filters[] = {\n"
             << designed.str() << "};\n\n";
    const auto half_band = kz::tables::design_short_filter(kz::tables::kHalfBand);
    const auto quarter_band = kz::tables::design_short_filter(kz::tables::kQuarterBand);
    write_filter(out, 22050, to_q31(half_band, 1.0));
    write_rows(out.text, 22050, 1, 2, to_q31(half_band, 1.0));
    write_filter(out, 44100, to_q31(quarter_band, 1.0));
    write_rows(out.text, 44100, 1, 4, to_q31(quarter_band, 1.0));
    write_array(out, "float", "kz::kernels::coefficients_2to1", half_band);
    write_array(out, "float", "kz::kernels::coefficients_4to1", quarter_band);
}

// Stage s, of half-width h = 2^(s-1), multiplies by a factor of 30 fraction bits over 2^(s-2): so
// the largest factor of each stage, about h, fits a word.
std::vector<int32_t> dct_coefficients(uint32_t length)
{
    std::vector<int32_t> words(length, 0);
    for (uint32_t half_width = 1; half_width < length; half_width *= 2) {
        for (uint32_t j = 0; j < half_width; ++j) {
            const double factor = kz::kernels::butterfly_factor(half_width, j);
            words[half_width + j] = static_cast<int32_t>(factor * 0x1p31 / half_width);
        }
    }
    return words;
}

std::vector<float> dct_factors(uint32_t length)
{
    std::vector<float> factors(length);
    kz::kernels::fill_butterfly_factors(factors);
    return factors;
}

} // namespace

int main(int argc, char** argv)
{
    if (argc != 3) {
        std::cerr << "usage: tablegen <tables for the inner loops> <prototypes for callers>\n";
        return 2;
    }
    std::ofstream tables(argv[1]);
    tables << "// Written by tables/tablegen.cpp.\n\n#include \"kzsdk/kernels/tables.hpp\"\n\n";
    std::ofstream prototypes(argv[2]);
    prototypes << "// Written by tables/tablegen.cpp.\n\n#include \"kzsdk/dsp/resampler.h\"\n\n";
    Source out{tables, prototypes, {}};
    write_filters(out);
    write_array(out, "int32_t", "kz::kernels::kDctCoefficients", dct_coefficients(32768));
    write_array(out, "float", "kz::kernels::kDctFactors", dct_factors(32768));
    tables.close();
    prototypes.close();
    if (!tables || !prototypes) {
        std::cerr << "tablegen: cannot write " << argv[tables ? 2 : 1] << '\n';
        return 1;
    }
    if (out.digest.value() != kKnownDigest) {
        std::cerr << "tablegen: this machine's mathematics makes other tables (digest 0x"
                  << std::hex << out.digest.value() << ", 0x" << kKnownDigest
                  << " is known): fingerprints would match no others\n";
        return 1;
    }
    return 0;
}
