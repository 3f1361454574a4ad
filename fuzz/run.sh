#!/bin/sh
# Runs the fuzz targets, one after the other: first what is in the corpus, then what grows out of it.
#
#   fuzz/run.sh [seconds] [target...]      seconds for each target, 60 if not given; all targets
#
# RUNS=20000000 ends a target earlier, after that many executions. Corpus and logs are kept in $FUZZ_HOME
# (build/fuzz/home); an input that ends a target stays there as <target>-crash-*, and the status is 1.
set -u
cd "$(dirname "$0")/.."

programs=${FUZZ_PROGRAMS:-$PWD/build/fuzz/fuzz}
home=${FUZZ_HOME:-$PWD/build/fuzz/home}
seconds=${1:-60}
[ $# -eq 0 ] || shift
if [ $# -eq 0 ]; then
    # shellcheck disable=SC2046 # the names are meant to be split
    set -- $(sed -n 's/^ *kz_fuzz(\([a-z_]*\) .*/\1/p' fuzz/CMakeLists.txt) kzfp_options kzfp_files
fi

mkdir -p "$home"
home=$(cd "$home" && pwd)
programs=$(cd "$programs" && pwd)
fuzz/seeds.py "$home/seeds"
failed=0
for target in "$@"; do
    mkdir -p "$home/corpus/$target"
    if ! (cd "$home" && exec "$programs/$target" -max_total_time="$seconds" -runs="${RUNS:--1}" \
        -max_len=4096 -timeout=60 -rss_limit_mb=4096 -close_fd_mask=3 -print_final_stats=1 \
        -artifact_prefix="$home/$target-" "corpus/$target" "seeds/$target" \
        >"$home/$target.log" 2>&1 </dev/null); then
        failed=1
        grep -v '^#' "$home/$target.log" | tail -n 30
    fi
    echo "fuzz: $target: $(sed -n 's/^Done \(.*\)/\1/p' "$home/$target.log")" \
        "$(ls "$home/corpus/$target" | wc -l) inputs in the corpus"
done
exit "$failed"
