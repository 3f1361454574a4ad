#!/bin/sh
# Makes small disc images for tests, with the tools that make real ones.
#
#   scripts/make_disc_images.sh DIRECTORY
#
#   dvd.iso      ISO 9660 with UDF, as a DVD is; label HOLIDAY_2026, two title sets
#   bluray.iso   the same volume structure with the files of a Blu-ray disc; label SUMMER_FILM
#   words.iso    label "TWO WORDS"
#   longest.iso  ISO 9660 label of 32 characters, UDF label cut to the 30 that UDF allows
#   plain.iso    ISO 9660 alone; label PLAIN
#   far.udf      UDF alone, whose volume descriptors do not begin in sector 32; label FAR
#   dvd, bluray  what the first two hold, taken out of them again
set -eu

[ $# -eq 1 ] || {
    echo "usage: make_disc_images.sh DIRECTORY" >&2
    exit 2
}

for tool in genisoimage:genisoimage mkudffs:udftools xorriso:xorriso; do
    PATH=$PATH:/usr/sbin command -v "${tool%%:*}" >/dev/null || {
        echo "make_disc_images.sh: ${tool%%:*} is missing; apt-get install ${tool##*:}" >&2
        exit 1
    }
done

mkdir -p "$1"
target=$(cd "$1" && pwd)
work=$(mktemp -d "$target/work.XXXXXX")
trap 'chmod -R u+w "$work"; rm -rf "$work"' EXIT
cd "$work"

mkdir -p in/dvd/VIDEO_TS in/dvd/AUDIO_TS
for file in VIDEO_TS.IFO VIDEO_TS.BUP VTS_01_0.IFO VTS_01_1.VOB VTS_02_0.IFO; do
    echo "$file" >"in/dvd/VIDEO_TS/$file"
done
mkdir -p in/bluray/AACS in/bluray/BDMV/PLAYLIST in/bluray/BDMV/STREAM
for file in AACS/Content000.cer BDMV/index.bdmv BDMV/MovieObject.bdmv BDMV/PLAYLIST/00000.mpls \
    BDMV/PLAYLIST/00007.mpls BDMV/STREAM/00000.m2ts; do
    echo "$file" >"in/bluray/$file"
done
mkdir in/empty

image() {
    name=$1 label=$2 content=$3
    shift 3
    genisoimage -quiet -R "$@" -V "$label" -o "$name" "in/$content"
}

image dvd.iso HOLIDAY_2026 dvd -udf
image bluray.iso SUMMER_FILM bluray -udf
image words.iso "TWO WORDS" empty -udf
image longest.iso ABCDEFGHIJKLMNOPQRSTUVWXYZ012345 empty -udf
image plain.iso PLAIN empty
PATH=$PATH:/usr/sbin mkudffs --new-file --blocksize=2048 --label=FAR far.udf 1024 >/dev/null

for disc in dvd bluray; do
    xorriso -report_about FAILURE -osirrox on -indev "$disc.iso" -extract / "$disc" >log 2>&1 || {
        cat log >&2
        exit 1
    }
    chmod -R u+w "$disc"
    rm -rf "${target:?}/$disc"
done
mv dvd.iso bluray.iso words.iso longest.iso plain.iso far.udf dvd bluray "$target"
