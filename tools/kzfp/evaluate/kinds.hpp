/// @file
/// The degradations by name: what each does, and what it takes.
#pragma once

#include <functional>
#include <span>
#include <string>
#include <vector>

#include "kzfp/evaluate/toolbox.hpp"

namespace kzfp::evaluate {

/// What a degradation has at hand.
struct Resources {
    const Toolbox& toolbox;
    Random& random;
    std::string target; ///< a path without ending, for files
};

/// Kinds that differ in strength only.
struct Curve {
    std::string name; ///< such as "white noise"; empty for none
    double strength = 0;
    std::string unit; ///< such as "dB"
};

/// One degradation, with the name that it has in evaluation/degrade.py where it is there too.
struct Kind {
    std::string name;
    std::string explanation;
    std::function<Product(const Clip&, const Resources&)> make;
    std::function<std::string(const Toolbox&)> missing; ///< what to install; empty: nothing
    double speed = 1;                                   ///< pitch and tempo are changed alike
    double tempo = 1;
    double cents = 0;
    bool usual = true; ///< made unless kinds are named
    Curve curve = {};

    /// Seconds of the track in a second of the clip.
    double stretch() const { return speed * tempo; }
    double pitch() const;
    /// Seconds of the track that a clip of so many seconds is made from.
    double source_seconds(double seconds) const;
};

std::span<const Kind> all_kinds();

/// Null when there is no kind of this name.
const Kind* find_kind(const std::string& name);

/// "clean, white_20, ...".
std::string kind_names();

} // namespace kzfp::evaluate
