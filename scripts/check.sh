#!/usr/bin/env bash
# Everything that a change must pass, step by step. Each step runs even when an earlier one failed,
# so that one run reports everything; the summary closes the log. `./run check` sets up what this
# needs.
#
#   scripts/check.sh                                        about an hour on two processors
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

# Clang's sanitizers see more, and g++'s take some headers of its own library for faulty. The fuzz
# targets need the same objects, with marks that libFuzzer reads: one build serves both.
sanitizers() {
    tests asan-clang -DKZ_BUILD_FUZZ=ON \
        -DKZ_SANITIZE=fuzzer-no-link,address,undefined,integer,leak
}

fuzzing() {
    if [ "$long" = yes ]; then
        ./run fuzz "$fuzz_seconds"
    else
        FUZZ_PROGRAMS=build/asan-clang/fuzz FUZZ_HOME=build/asan-clang/home \
            fuzz/run.sh "$fuzz_seconds"
    fi
}

benchmarks() {
    cmake -S . -B build/bench -G Ninja -DKZ_WERROR=ON -DKZ_BUILD_BENCH=ON -DKZ_BUILD_TESTS=OFF \
        -DKZ_BUILD_TOOLS=OFF -DKZ_BUILD_CATALOGUE=ON && cmake --build build/bench --target kzbench
}

if [ "${1:-}" = --long ]; then
    long=yes
    shift
    fuzz_seconds=${1:-1800} soak_seconds=${2:-600} ways=${ARCH:-all} lint_tests=yes lint_commits=
    built="the libraries, kzfp and the jar"
elif [ $# -gt 0 ]; then
    echo "usage: ./run check [--long [fuzz seconds] [soak seconds]]" >&2
    exit 2
else
    long=no fuzz_seconds=3 soak_seconds=0 ways=quick lint_tests=no lint_commits=25
    built="the libraries and the jar"
fi

# The very command of the README, which ends with the suite's own count.
step "g++: build and all tests" ./run test -DKZ_WERROR=ON
step "the same bytes in another folder: $built" env PROGRAM="$long" \
    ./run check-reproducible build/release
# The sanitizers' step builds everything with clang++ too.
long_step "clang++: build and all tests" tests release-clang
step "address, undefined-behaviour, integer and leak sanitizers: all tests" sanitizers
step "thread sanitizer: the tests that have threads" ./run check-threads
step "same documents with other compilers, optimisations and processors" ./run check-arch "$ways"
step "lint: format, clang-tidy, cppcheck, man page, scripts" \
    env LINT_TESTS="$lint_tests" LINT_COMMITS="$lint_commits" ./run lint
# With the first step's option: another one would have everything compiled again.
step "demo: the README's first command" ./run demo -DKZ_WERROR=ON
step "benchmarks build" benchmarks
# Nothing here depends on how fast the machine is: words are compared, and peers checked.
step "benchmarks run, once" build/bench/bench/kzbench pairs --rounds 1 --slice 1 \
    --output build/bench/pairs.json
step "growth is measured, once" build/bench/bench/kzbench grow --output build/bench/growth.json
step "instruction counts" bench/counts.py build/bench/bench/kzbench
long_step "load, for $soak_seconds s" ./run soak "$soak_seconds" 8
step "fuzzing: every target from its seeds on, $fuzz_seconds s each" fuzzing
long_step "coverage" ./run coverage

printf '\n==== summary (%d s)\n' "$SECONDS"
printf '%s\n' "${summary[@]}"
exit "$failed"
