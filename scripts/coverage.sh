#!/usr/bin/env bash
# Reports how much of kzsdk/ and catalogue/ runs in the unit tests, and how much on the corpus of
# the fuzz targets.
#
#   scripts/coverage.sh [tests | corpus]...   default: both
#
# The corpus is what fuzz/run.sh has gathered in $FUZZ_HOME (build/fuzz/home), with the seeds.
# Leaves the totals of each room, and every line and branch that did not run, in
# build/coverage/<which>.txt.
set -euo pipefail
cd "$(dirname "$0")/.."

build=$PWD/build/coverage
jobs=${JOBS:-$(getconf _NPROCESSORS_ONLN)}
corpus=${FUZZ_HOME:-$PWD/build/fuzz/home}/corpus
[ $# -gt 0 ] || set -- tests corpus
mkdir -p "$corpus"
corpus=$(cd "$corpus" && pwd)

# The counters change the built files; the tests that read those are left out.
run_tests() {
    ctest --preset coverage --parallel "$jobs" \
        --exclude-regex '^(abi_exported|abi_hardening|abi_installed|abi_kzcat_installed|variants_isolation|failures_every_allocation_test\.EveryAllocatingFunction)' >"$build/tests.log" 2>&1 ||
        grep -A 50 'tests failed' "$build/tests.log" || true
}

run_corpus() {
    local place target
    rm -rf "$build/seeds"
    fuzz/seeds.py "$build/seeds"
    for place in "$build"/seeds/*; do
        target=${place##*/}
        mkdir -p "$corpus/$target"
        "$build/fuzz/$target" -runs=0 -close_fd_mask=3 "$place" "$corpus/$target" \
            >"$build/$target.log" 2>&1 </dev/null || tail -n 5 "$build/$target.log"
    done
}

# Every program that holds code of the library, and every library.
objects() {
    find "$build" -type f -perm -u+x -not -path '*/CMakeFiles/*' -not -name '*.py' -not -name '*.sh' |
        while read -r file; do
            ! readelf -S "$file" 2>/dev/null | grep -q __llvm_covmap || printf '%s\n' "$file"
        done
}

# Each program is read by itself: of functions that share a name in several, llvm-cov would take one
# program's for all.
export_one() {
    llvm-cov-14 export -instr-profile="$profile" \
        -ignore-filename-regex='/(tests|fuzz|tools|tables|build)/|^/usr' "$1" >"$exports/$(echo "$1" | tr / _).json"
}
export -f export_one

cmake --preset coverage >/dev/null
cmake --build --preset coverage --parallel "$jobs" >"$build/build.log" || { tail -n 30 "$build/build.log" && exit 1; }
mapfile -t programs < <(objects)
for which in "$@"; do
    rm -rf "$build/raw"
    # The processes of one program add up in its files.
    LLVM_PROFILE_FILE="$build/raw/%4m.profraw" "run_$which"
    export profile=$build/$which.profdata exports=$build/exports/$which
    llvm-profdata-14 merge -sparse -o "$profile" "$build"/raw/*.profraw
    rm -rf "$exports"
    mkdir -p "$exports"
    # shellcheck disable=SC2016 # the inner shell expands it
    printf '%s\0' "${programs[@]}" | xargs -0 -n 1 -P "$jobs" bash -c 'export_one "$1"' export_one \
        2>"$build/$which.warnings"
    scripts/coverage.py "$exports"/*.json >"$build/$which.txt"
    echo "$which ($build/$which.txt):"
    sed -n '/^room/,$p' "$build/$which.txt"
done
