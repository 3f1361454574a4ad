#!/bin/sh
# Shows what a fingerprint is good for: prints the query document of half a minute of music, then
# how far other encodings of that tune lie from it, and another tune; and recognises a clip out of
# its middle. The music is downloaded on first use.
#
#   scripts/demo.sh KZFP    where KZFP is the program, for example build/release/tools/kzfp/kzfp
#
# The distance is the mean absolute difference of the 30 values (docs/fingerprint.md). The other
# tune is the main title of the game Holotz's Castle by Juan Carlos Seijo Pérez, GPL 2 or later, out
# of the Debian package holotz-castle-data (2.6 MB).
set -eu

root=$(cd "$(dirname "$0")/.." && pwd)
media=${KZ_MEDIA:-$root/build/media}
mkdir -p "$media"
media=$(cd "$media" && pwd)
music=$media/music.wav
made=$media/demo
title=$made/holotz-castle.wav
title_path=usr/share/games/holotz-castle/game/sound/HCMainTitle.wav
title_digest=a7f363c92d1f270dd35423d9a5a6b401db8789dd51ab6f9009e7e77eec692d32

if [ $# -ne 1 ]; then
    echo "usage: scripts/demo.sh KZFP" >&2
    exit 2
fi
kzfp=$1
if [ ! -x "$kzfp" ]; then
    echo "demo.sh: $kzfp is not a program; build kzfp first" >&2
    exit 1
fi

# make FILE SOX-ARGUMENT...: the music in another form, made once; FILE appears when it is whole.
make() {
    name=$1
    shift
    [ -s "$made/$name" ] && return
    (cd "$made" && sox -D -R -V1 "$music" "$@" && mv "part-$name" "$name")
}

provide_sound() {
    KZ_MEDIA=$media "$root/scripts/make_clips.sh" --music-only
    mkdir -p "$made"
    "$root/scripts/fetch_tune.sh" holotz-castle-data "$title_path" "$title_digest" "$title"
    make tune.flac part-tune.flac
    make tune.ogg -C 4 part-tune.ogg
    make tune.mp3 -C 64 part-tune.mp3
    make quiet.wav part-quiet.wav gain -20
    make telephone.wav -r 8000 -c 1 -e a-law part-telephone.wav
    make clip.wav -r 8000 -c 1 -e u-law part-clip.wav trim 11 10 speed 1.03
}

# row FILE TEXT: one line of the table.
row() {
    "$kzfp" --format values "$music" "$1" | awk -v text="$2" '
        NR == 1 { split($0, first) }
        NR == 2 { for (i = 1; i <= NF; i++) sum += $i < first[i] ? first[i] - $i : $i - first[i]
                  printf "  %-46s %8.1f\n", text, sum / NF }
        END { exit NR != 2 }'
}

provide_sound >&2
echo "The fingerprint of \"Trip on the Funny Boat\" by JDruid, as a query document:"
echo
"$kzfp" "$music"
echo
echo "How far other recordings are from it (mean difference of the 30 values):"
echo
row "$made/tune.flac" "the same tune as FLAC"
row "$made/tune.ogg" "the same tune as Ogg Vorbis, quality 4"
row "$made/tune.mp3" "the same tune as MP3, 64 kbit/s"
row "$made/quiet.wav" "the same tune, 20 dB quieter"
row "$made/telephone.wav" "the same tune at 8000 Hz in A-law"
row "$title" "another tune, the title of Holotz's Castle"
echo
echo "Which tune, and where in it, are 10 seconds from 0:11 on, over a telephone and 3 % faster?"
echo
"$kzfp" add "$made/music.kzc" "$music" "$title" >&2
"$kzfp" match "$made/music.kzc" "$made/clip.wav"
