#!/bin/sh
# Prints the query document of half a minute of music, which is downloaded and made on first use.
#
#   scripts/demo.sh KZFP    where KZFP is the program, for example build/release/tools/kzfp/kzfp
#
# What is said about the music goes to standard error, so that the document can be piped on.
set -eu

root=$(cd "$(dirname "$0")/.." && pwd)
music=${KZ_MEDIA:-$root/build/media}/music.wav

if [ $# -ne 1 ]; then
    echo "usage: scripts/demo.sh KZFP" >&2
    exit 2
fi
if [ ! -x "$1" ]; then
    echo "demo.sh: $1 is not a program; build kzfp first" >&2
    exit 1
fi

"$root/scripts/make_clips.sh" --music-only
echo "$music: 30 s of \"Trip on the Funny Boat\" by JDruid (Expat licence)" >&2
exec "$1" "$music"
