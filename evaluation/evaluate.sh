#!/bin/sh
# Measures how well clips are recognised, from the download of the music to the tables.
#
#   evaluation/evaluate.sh KZFP [tune] [report] [loops]     default: report loops
#
# Whatever is there already in build/media/evaluation (or $KZ_MEDIA/evaluation) is not made again:
# the music takes 2 GB to fetch and 23 GB as WAV files, the clips of a half 9 GB and, on two
# processors, an hour. JOBS=4 takes four processes instead of two.
set -eu

if [ $# -lt 1 ]; then
    echo "usage: evaluation/evaluate.sh KZFP [tune] [report] [loops]" >&2
    exit 2
fi
kzfp=$1
shift
[ $# -gt 0 ] || set -- report loops
here=$(dirname "$0")

for half in "$@"; do
    case $half in
    loops)
        "$here/corpus.py" fetch --half report
        "$here/loops.py"
        ;;
    *)
        "$here/corpus.py" fetch --half "$half"
        "$here/clips.py" "$half"
        "$here/peers.py" "$half"
        ;;
    esac
    "$here/score.py" run "$kzfp" "$half"
done

for half in "$@"; do
    printf '\n== %s\n' "$half"
    [ "$half" = loops ] || "$here/score.py" table "$half"
    "$here/score.py" strangers "$half"
    [ "$half" != tune ] || "$here/score.py" thresholds
done
