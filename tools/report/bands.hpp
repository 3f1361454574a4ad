/// @file
/// The 15 bands of a fingerprint's values.
#pragma once

#include <string>

namespace report {

inline constexpr int kBands = 15;

/// In hertz: the first 16 edges of the critical bands of hearing, which bound the 15 bands, and
/// three more for what is drawn above them. E. Zwicker: Subdivision of the audible frequency range
/// into critical bands. Journal of the Acoustical Society of America 33 (1961), 248.
inline constexpr double kBandEdges[] = {0,    100,  200,  300,  400,  510,  630,  770,  920, 1080,
                                        1270, 1480, 1720, 2000, 2320, 2700, 3150, 3700, 4400};
inline constexpr int kDrawnBands = 18;

/// "100 to 200 Hz".
inline std::string band_text(int band)
{
    const auto edge = [](int i) { return std::to_string(static_cast<int>(kBandEdges[i])); };
    return edge(band) + " to " + edge(band + 1) + " Hz";
}

} // namespace report
