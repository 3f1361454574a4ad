#!/bin/sh
# Builds what is shipped twice, from copies of the tree in two folders whose names differ in length,
# with another locale, time zone, file mode mask and number of jobs, and compares byte for byte: the
# libraries, kzfp, and the jars.
#
#   packaging/check_reproducible.sh
#   packaging/check_reproducible.sh <build-directory>    builds once, compares with this build
#
# CXX=clang++-14 CC=clang-14 takes another compiler than the default; PROGRAM=no leaves kzfp out,
# which takes longer than all others together.
set -eu
cd "$(dirname "$0")/.."

jobs=${JOBS:-$(getconf _NPROCESSORS_ONLN)}
files="kzsdk/libkzsdk.so.1.0.0 kzsdk/libkzsdk.a catalogue/libkzcat.so.1.0.0 catalogue/libkzcat.a
    bindings/java/kzsdk.jar bindings/java/native/libkzcat_java.so bindings/java/kzsdk-desktop.jar"
targets="kzsdk_shared kzsdk_static kzcat_shared kzcat_static kzsdk_jar kzsdk_desktop_jar"
if [ "${PROGRAM:-yes}" != no ]; then
    files="$files tools/kzfp/kzfp"
    targets="$targets kzfp"
fi

folder=$(mktemp -d)
trap 'rm -rf "$folder"' EXIT

# build_in <place> <jobs>: the log is shown where the build fails.
build_in() {
    mkdir -p "$1"
    tar -c --exclude=./build --exclude=./.git . | tar -x -C "$1"
    # shellcheck disable=SC2086 # the names are meant to be split
    if ! { cmake -S "$1" -B "$1/build" -G Ninja -DCMAKE_BUILD_TYPE=Release -DKZ_JAVA=ON \
        -DKZ_BUILD_TESTS=OFF &&
        cmake --build "$1/build" --parallel "$2" --target $targets; } >"$folder/log" 2>&1; then
        tail -n 20 "$folder/log"
        echo "check_reproducible: not built in $1" >&2
        exit 1
    fi
}

if [ $# -gt 0 ]; then
    one=$1
else
    build_in "$folder/one" "$jobs"
    one=$folder/one/build
fi
two=$folder/another/place/with-a-longer-name
(
    export TZ=Asia/Kathmandu LC_ALL=C
    umask 027
    build_in "$two" $((jobs + 1))
)

failed=
for file in $files; do
    if cmp "$one/$file" "$two/build/$file"; then
        echo "$file: $(sha256sum <"$one/$file" | cut -c 1-16)... twice"
    else
        failed="$failed $file"
    fi
done
if [ -n "$failed" ]; then
    echo "check_reproducible: different:$failed" >&2
    exit 1
fi
