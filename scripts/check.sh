#!/usr/bin/env bash
# Everything that a change must pass, step by step. Each step runs even when an earlier one failed,
# so that one run reports everything; the summary closes the log. `./run check` sets up what this
# needs.
#
#   scripts/check.sh                                        half an hour on two processors
#   scripts/check.sh --long [fuzz seconds] [soak seconds]   a night's work: 1800 and 600
#
# ARCH=quick ./run check --long compares documents on five builds only.
set -uo pipefail
cd "$(dirname "$0")/.." || exit

summary=()
failed=0

# step <name> <command...>
step() {
    local name=$1 begun=$SECONDS result=passed
    shift
    printf '\n==== %s\n' "$name"
    "$@" </dev/null || { result=FAILED failed=1; }
    summary+=("$(printf '%-7s %4d s  %s' "$result" $((SECONDS - begun)) "$name")")
}

# A step of the long check alone.
long_step() {
    [ "$long" = no ] || step "$@"
}

# tests <preset> [cmake option...]: all tests that it can run, warnings being errors.
tests() {
    local preset=$1
    shift
    PRESET=$preset ./run test -DKZ_WERROR=ON "$@"
}

clang_libraries() {
    if [ "$long" = yes ]; then
        tests release-clang
    else
        tests release-clang -DKZ_BUILD_TOOLS=OFF -DKZ_BUILD_CATALOGUE=ON
    fi
}

benchmarks() {
    cmake -S . -B build/bench -G Ninja -DKZ_WERROR=ON -DKZ_BUILD_BENCH=ON -DKZ_BUILD_TESTS=OFF \
        -DKZ_BUILD_TOOLS=OFF -DKZ_BUILD_CATALOGUE=ON && cmake --build build/bench --target kzbench
}

if [ "${1:-}" = --long ]; then
    long=yes
    shift
    fuzz_seconds=${1:-1800} soak_seconds=${2:-600} ways=${ARCH:-all} lint_tests=yes
elif [ $# -gt 0 ]; then
    echo "usage: ./run check [--long [fuzz seconds] [soak seconds]]" >&2
    exit 2
else
    long=no fuzz_seconds=3 soak_seconds=0 ways=quick lint_tests=no
fi

# The very command of the README, which ends with the suite's own count.
step "g++: build and all tests" ./run test -DKZ_WERROR=ON
step "the same bytes in another folder" ./run check-reproducible build/release
# The sanitizers' step builds the program with clang++ too, which takes long.
step "clang++: the libraries and their tests" clang_libraries
# Clang's sanitizers see more, and g++'s take some headers of its own library for faulty.
step "address, undefined-behaviour, integer and leak sanitizers: all tests" tests asan-clang
step "thread sanitizer: the tests that have threads" ./run check-threads
step "same documents with other compilers, optimisations and processors" ./run check-arch "$ways"
step "lint: format, clang-tidy, cppcheck, man page, scripts" env LINT_TESTS="$lint_tests" ./run lint
step "demo: the README's first command" ./run demo
step "benchmarks build" benchmarks
# Nothing here depends on how fast the machine is: words are compared, and peers checked.
step "benchmarks run, once" build/bench/bench/kzbench pairs --rounds 1 --slice 1 \
    --output build/bench/pairs.json
step "growth is measured, once" build/bench/bench/kzbench grow --output build/bench/growth.json
step "instruction counts" bench/counts.py build/bench/bench/kzbench
long_step "load, for $soak_seconds s" ./run soak "$soak_seconds" 8
step "fuzzing: every target from its seeds on, $fuzz_seconds s each" ./run fuzz "$fuzz_seconds"
long_step "coverage" ./run coverage

printf '\n==== summary (%d s)\n' "$SECONDS"
printf '%s\n' "${summary[@]}"
exit "$failed"
