#!/bin/sh
# Builds the test clips from Debian packages: music in all rates and encodings, speech, tones,
# noise, silence. The same bytes come out every time, with the same versions of the packages.
#
#   scripts/make_clips.sh               everything, into build/media/clips
#   scripts/make_clips.sh --music-only  only build/media/music.wav: half a minute of music
#
# The music is "Trip on the Funny Boat" by Joona Karjalainen (JDruid), 2006, Expat licence, out of
# the Debian package funnyboat, which is downloaded (3.7 MB) and not installed. Set KZ_MEDIA to
# another directory than build/media.
set -eu

root=$(cd "$(dirname "$0")/.." && pwd)
media=${KZ_MEDIA:-$root/build/media}
clips=$media/clips
song=$media/funnyboat.ogg
song_path=usr/share/games/funnyboat/data/JDruid-Trip_on_the_Funny_Boat.ogg
song_digest=1db157e12fa37b54a5add98a9f2ad6c906806e898fac53c29a96cd48a09c9278

fail() {
    echo "make_clips.sh: $*" >&2
    exit 1
}

need() {
    command -v "$1" >/dev/null || fail "$1 is missing; apt-get install $2"
}

# Without dither and with a fixed seed, so that the same bytes come out every time.
sox_plain() {
    sox -D -R -V1 "$@"
}

provide_music() {
    need sox "sox libsox-fmt-all"
    [ -s "$media/music.wav" ] && return
    "$root/scripts/fetch_tune.sh" funnyboat "$song_path" "$song_digest" "$song"
    sox_plain "$song" -b 16 "$media/music.part.wav" trim 30 30
    mv "$media/music.part.wav" "$media/music.wav"
}

# The same 20 seconds at every rate, in one and two channels, in every encoding of the library.
make_music() {
    for rate in 8000 11025 16000 22050 24000 32000 44100 48000; do
        sox_plain "$media/music.wav" -b 16 "music-$rate-stereo-s16.wav" trim 0 20 gain -3 rate -v $rate
        sox_plain "music-$rate-stereo-s16.wav" "music-$rate-mono-s16.wav" remix 1,2
        for channels in mono stereo; do
            source=music-$rate-$channels-s16.wav
            sox_plain "$source" -e a-law "music-$rate-$channels-alaw.wav"
            sox_plain "$source" -e mu-law "music-$rate-$channels-ulaw.wav"
        done
    done
}

make_containers() {
    source=music-44100-stereo-s16.wav
    sox_plain "$source" -b 8 -e unsigned music-8bit.wav
    sox_plain "$source" -b 24 music-24bit.wav
    sox_plain "$source" -b 32 -e floating-point music-float.wav
    sox_plain "$source" -b 64 -e floating-point music-double.wav
    sox_plain "$source" -b 16 music.flac
    sox_plain "$source" -C 4 music.ogg
    sox_plain "$source" -C 128 music.mp3
    sox_plain music-22050-mono-s16.wav -C 64 music-22050-mono.mp3
    sox_plain "$source" -b 16 music.aiff
    sox_plain music-8000-mono-s16.wav -e mu-law music-ulaw.au
    # Louder than full scale as floats: what is above has to be clipped, not to wrap round.
    sox_plain "$source" -b 32 -e floating-point music-float-loud.wav vol 4
    sox_plain "$source" -b 16 music-96000.wav rate -v 96000
    sox_plain "$source" -b 16 music-37800.wav rate -v 37800
    # Six channels that mix down to (left + right) * 3 / 8, and four that mix down to the average.
    sox_plain "$source" music-6-channels.wav remix 1 2 1 2 1 2
    sox_plain "$source" music-4-channels.wav remix 1 2 1 2
    sox_plain music-44100-mono-s16.wav -t raw -e signed -b 16 -L music-44100-mono.s16
    sox_plain music-8000-stereo-s16.wav -t raw -e a-law -b 8 music-8000-stereo.alaw
    sox_plain music-8000-mono-s16.wav -t raw -e mu-law -b 8 music-8000-mono.ulaw
    sox_plain music-22050-mono-s16.wav -t raw -e unsigned -b 8 music-22050-mono.u8
}

# Without what differs from one run to the next: dates, the encoder's name.
ffmpeg_plain() {
    ffmpeg -nostdin -loglevel error -y "$@"
}

# The same music as files that libsndfile does not read.
make_compressed() {
    set -- -i music-44100-stereo-s16.wav -fflags +bitexact -flags:a +bitexact
    tags='-metadata title=Trip -metadata artist=JDruid -metadata album=Boats -metadata date=2006'
    # shellcheck disable=SC2086 # the tags are meant to be split
    {
        ffmpeg_plain "$@" -c:a aac -b:a 128k $tags -metadata track=3 music.m4a
        ffmpeg_plain "$@" -c:a wmav2 -b:a 128k $tags -metadata track=3 music.wma
    }
    ffmpeg_plain "$@" -c:a alac music-alac.m4a
    ffmpeg_plain "$@" -c:a libopus -b:a 96k music.webm
    # Out of packets of changing length, as many files of Opus are.
    ffmpeg_plain -i music.ogg -fflags +bitexact -flags:a +bitexact -c:a libopus music.opus
    ffmpeg_plain "$@" -c:a ac3 -b:a 192k music.ac3
    ffmpeg_plain "$@" -c:a aac -b:a 128k -f adts music.aac
    # A film, the picture of an album in front of the sound, and music before another sound.
    ffmpeg_plain -f lavfi -i testsrc=size=64x48:rate=5:duration=20 "$@" -map 0:v -map 1:a \
        -c:v mpeg4 -c:a aac -b:a 128k music.mp4
    ffmpeg_plain -f lavfi -i testsrc=size=64x48 -frames:v 1 picture.png
    ffmpeg_plain -i picture.png "$@" -map 0:v -map 1:a -c:v copy -disposition:v attached_pic \
        -c:a alac music-picture.m4a
    rm picture.png
    ffmpeg_plain -f lavfi -i anoisesrc=d=20:seed=1:r=44100 "$@" -map 1:a -map 0:a -c:a flac \
        music-two-sounds.mkv
    ffmpeg_plain -f lavfi -i testsrc=size=64x48:rate=5:duration=2 -c:v mpeg4 -fflags +bitexact \
        no-sound.mp4
    ffmpeg_plain "$@" -c:a aac -b:a 128k -movflags +faststart index-first.m4a
    head -c 150000 index-first.m4a >broken.m4a
    head -c 150000 music.m4a >no-index.m4a
    rm index-first.m4a
    head -c 150000 music.wma >broken.wma
    head -c 1000000 music-two-sounds.mkv >broken.mkv
    head -c 100000 music.mp3 >cut.mp3
    head -c 100000 music.ogg >broken.ogg
    head -c 1000000 music-44100-stereo-s16.wav >broken.wav
    head -c 1000000 music.aiff >broken.aiff
    # With a tag that has the length; in the second, the bit rate of its quiet start is not that of
    # the rest, and no tag says so.
    ffmpeg_plain "$@" -c:a libmp3lame -b:a 128k music-tagged.mp3
    head -c 150000 music-tagged.mp3 >broken.mp3
    ffmpeg_plain "$@" -af "volume=enable='lt(t,3)':volume=0" -c:a libmp3lame -q:a 6 -write_xing 0 \
        music-varying.mp3
}

make_silences() {
    for rate in 8000 22050 44100 48000; do
        for channels in mono stereo; do
            # 7.3 s: not a whole number of the pieces in which silence is looked for.
            sox_plain "music-$rate-$channels-s16.wav" "late-$rate-$channels.wav" pad 7.3
        done
    done
    sox_plain -n -r 44100 -b 16 -c 2 silence.wav trim 0 20
    sox_plain music-44100-stereo-s16.wav short.wav trim 0 9.1
    sox_plain music-44100-stereo-s16.wav late-and-short.wav trim 0 9.1 pad 10
    sox_plain -n -r 44100 -b 16 -c 1 no-samples.wav trim 0 0
    # The music begins far beyond the first million bytes of a pipe.
    sox_plain music-44100-stereo-s16.wav very-late.wav pad 60
    for name in very-late.m4a very-late.mkv; do
        codec=alac
        [ $name = very-late.m4a ] || codec=flac
        ffmpeg_plain -i very-late.wav -fflags +bitexact -flags:a +bitexact -c:a $codec $name
    done
}

make_others() {
    espeak-ng -v en -s 140 -w speech.part.wav "The quick brown fox jumps over the lazy dog. \
Sphinx of black quartz, judge my vow. How vexingly quick daft zebras jump. \
The five boxing wizards jump quickly. Pack my box with five dozen liquor jugs. \
Jackdaws love my big sphinx of quartz. Waltz, bad nymph, for quick jigs vex."
    sox_plain speech.part.wav -b 16 speech.wav repeat 1
    rm speech.part.wav
    sox_plain -n -r 16000 -b 16 -c 1 tone.wav synth 20 sine 440 gain -6
    sox_plain -n -r 44100 -b 16 -c 2 sweep.wav synth 20 sine 50-3000 sine 60-2500 gain -6
    sox_plain -n -r 24000 -b 16 -c 1 noise.wav synth 20 pinknoise gain -6
    printf 'These are words, not sound.\n' >words.txt
    : >empty.wav
    head -c 100000 music.flac >broken.flac
}

main() {
    mkdir -p "$media"
    exec 9>"$media/lock"
    flock 9 # two runs beside each other would write the same files
    provide_music
    if [ "${1:-}" = --music-only ]; then
        return
    fi
    need espeak-ng espeak-ng
    need ffmpeg ffmpeg
    stamp=$(sha256sum <"$root/scripts/make_clips.sh")
    if [ -f "$clips/stamp" ] && [ "$(cat "$clips/stamp")" = "$stamp" ]; then
        return
    fi
    rm -rf "$clips"
    mkdir "$clips"
    cd "$clips"
    make_music
    make_containers
    make_compressed
    make_silences
    make_others
    echo "$stamp" >stamp
}

main "$@"
