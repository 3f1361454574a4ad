#!/usr/bin/env bash
# All tests and checks, at full length: a night's work. The summary at the end names what failed.
#
#   scripts/check_all.sh [fuzz-seconds] [soak-seconds]    default: 1800 for each fuzz target, and 600
#
# ARCH=quick compares documents on five builds only. Each step can be had alone: see ./run help.
set -uo pipefail
cd "$(dirname "$0")/.." || exit
. scripts/steps.sh

fuzz_seconds=${1:-1800}
soak_seconds=${2:-600}

tests() {
    PRESET=$1 ./run test -DKZ_WERROR=ON
}

step "g++: all tests" tests release
step "the same bytes in another folder" packaging/check_reproducible.sh build/release
step "clang++: all tests" tests release-clang
step "address, undefined-behaviour, integer and leak sanitizers: all tests" tests asan-clang
step "thread sanitizer: the tests that have threads" scripts/check_threads.sh
step "lint, tests too" env LINT_TESTS=yes ./run lint
step "instruction counts" ./run bench-counts
step "same documents with other compilers, optimisations and processors" ./run check-arch "${ARCH:-all}"
step "load, for $soak_seconds s" ./run soak "$soak_seconds" 8
step "fuzzing, $fuzz_seconds s for each target" ./run fuzz "$fuzz_seconds"
step "coverage" ./run coverage
end_of_steps
