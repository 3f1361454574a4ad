/// @file
/// The results as JSON, which bench/table.py makes tables of.
#pragma once

#include <string>
#include <vector>

#include <nlohmann/json.hpp>

#include "case.hpp"
#include "growth/growth.hpp"
#include "measure/contest.hpp"

namespace kz::bench {

/// Where and how something is measured: machine, load, compiler, variant, time.
nlohmann::ordered_json describe_run();

nlohmann::ordered_json describe(const Growth& growth, const GrowthTable& table);
nlohmann::ordered_json describe(const Case& measured, const Result& result);

} // namespace kz::bench
