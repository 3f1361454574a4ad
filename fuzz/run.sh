#!/usr/bin/env bash
# Runs the fuzz targets: each first on its corpus, then on what it derives from that.
#
#   fuzz/run.sh [seconds] [target...]      seconds for each target, 60 if not given; all targets
#
# As many run at once as there are processors; JOBS=1 another number. RUNS=20000000 ends a target
# earlier, after that many executions. Corpus and logs are kept in $FUZZ_HOME (build/fuzz/home); an
# input that ends a target stays there as <target>-crash-*, and the status is 1.
set -u
cd "$(dirname "$0")/.." || exit

programs=${FUZZ_PROGRAMS:-$PWD/build/fuzz/fuzz}
home=${FUZZ_HOME:-$PWD/build/fuzz/home}
seconds=${1:-60}
jobs=${JOBS:-$(getconf _NPROCESSORS_ONLN)}
[ $# -eq 0 ] || shift
if [ $# -eq 0 ]; then
    # The targets that were built.
    # shellcheck disable=SC2046 # the names are meant to be split
    set -- $(sed -n 's/^fuzz //p' "$programs/../layers.txt")
fi

run_target() {
    local target=$1 status=0
    cd "$home" && mkdir -p "corpus/$target" || return 1
    "$programs/$target" -max_total_time="$seconds" -runs="${RUNS:--1}" \
        -max_len=4096 -timeout=60 -rss_limit_mb=4096 -close_fd_mask=3 -print_final_stats=1 \
        -artifact_prefix="$home/$target-" "corpus/$target" "seeds/$target" \
        >"$target.log" 2>&1 </dev/null || status=1
    if [ "$status" -ne 0 ]; then
        grep -v '^#' "$target.log" | tail -n 30
    fi
    echo "fuzz: $target: $(sed -n 's/^Done \(.*\)/\1/p' "$target.log")" \
        "$(find "corpus/$target" -type f | wc -l) inputs in the corpus"
    return "$status"
}

mkdir -p "$home"
home=$(cd "$home" && pwd)
programs=$(cd "$programs" && pwd)
fuzz/seeds.py "$home/seeds"
export programs home seconds
export -f run_target
# shellcheck disable=SC2016 # the inner shell expands it
printf '%s\0' "$@" | xargs -0 -n 1 -P "$jobs" bash -c 'run_target "$1"' run_target || exit 1
