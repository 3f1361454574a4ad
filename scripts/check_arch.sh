#!/bin/sh
# Builds the library in several ways, for several processors, and compares what it makes of some sixty
# pieces of sound with tests/golden/documents.txt. Prints one line for each way; any difference fails.
#
#   scripts/check_arch.sh          g++ and clang++ at -O0 and -O3; 64-bit and 32-bit ARM at -O2
#   scripts/check_arch.sh all      also -O1, -O2 and -march=native, 32-bit x86, and ARM at -O0 and -O3
#   scripts/check_arch.sh <way>... just these: see `scripts/check_arch.sh list`
#
# ARM and 32-bit x86 programs run under QEMU. Which factors and taps the floating-point path computes rests
# on the C library's sine and cosine: the cross-built programs run against the same release of it.
set -eu
cd "$(dirname "$0")/.."

jobs=${JOBS:-$(getconf _NPROCESSORS_ONLN)}
golden=tests/golden/documents.txt
quick="g++-O0 g++-O3 clang++-O0 clang++-O3 aarch64-O2 armhf-O2"
rest="g++-O1 g++-O2 g++-O3-native clang++-O1 clang++-O2 clang++-O3-native \
aarch64-O0 aarch64-O3 armhf-O0 armhf-O3 i686-O0 i686-O2 i686-O3"

case ${1:-quick} in
quick) ways=$quick ;;
all) ways="$quick $rest" ;;
list)
    printf '%s\n' $quick $rest
    exit 0
    ;;
*) ways=$* ;;
esac

# How a way is configured: its flags are everything behind the first hyphen.
configure() {
    flags=$(echo "${1#*-}" | sed 's/-native$/ -march=native/')
    flags=-${flags#-}
    case $1 in
    g++-*) compiler="-DCMAKE_C_COMPILER=gcc -DCMAKE_CXX_COMPILER=g++" ;;
    clang++-*) compiler="-DCMAKE_C_COMPILER=clang-14 -DCMAKE_CXX_COMPILER=clang++-14" ;;
    aarch64-*) compiler="-DCMAKE_TOOLCHAIN_FILE=cmake/toolchains/aarch64-linux-gnu.cmake" ;;
    armhf-*) compiler="-DCMAKE_TOOLCHAIN_FILE=cmake/toolchains/arm-linux-gnueabihf.cmake" ;;
    i686-*) compiler="-DCMAKE_TOOLCHAIN_FILE=cmake/toolchains/i686-linux-gnu.cmake" ;;
    *)
        echo "no such way: $1"
        return 1
        ;;
    esac
    # shellcheck disable=SC2086 # the options are meant to be split
    cmake -S . -B "$2" -G Ninja $compiler -DCMAKE_BUILD_TYPE=None -DCMAKE_C_FLAGS="$flags" \
        -DCMAKE_CXX_FLAGS="$flags" -DKZ_BUILD_TOOLS=OFF -DKZ_BUILD_TESTS=OFF -DKZ_BUILD_GOLDEN=ON \
        -DKZ_WERROR=ON
}

emulator() {
    case $1 in
    aarch64-*) echo "qemu-aarch64 -L /usr/aarch64-linux-gnu" ;;
    armhf-*) echo "qemu-arm -L /usr/arm-linux-gnueabihf" ;;
    i686-*) echo "qemu-i386 -L /usr/i686-linux-gnu" ;;
    esac
}

check() {
    build=build/arch/$1
    mkdir -p "$build"
    if ! { configure "$1" "$build" && cmake --build "$build" --parallel "$jobs" --target golden_documents; } \
        >"$build/log" 2>&1; then
        tail -n 20 "$build/log"
        echo "$1: not built"
        return 1
    fi
    # shellcheck disable=SC2046 # likewise
    if $(emulator "$1") "$build/tests/golden/golden_documents" "$golden" >"$build/result"; then
        echo "$1: $(wc -l <"$golden") digests, all the same"
    else
        cat "$build/result"
        echo "$1: DIFFERENT"
        return 1
    fi
}

groups="build"
case $ways in *clang*) groups="$groups clang" ;; esac
case $ways in *aarch64* | *armhf* | *i686*) groups="$groups arch" ;; esac
if [ "${SETUP:-yes}" != no ]; then
    # shellcheck disable=SC2086 # likewise
    scripts/setup.sh $groups
fi

failed=
for way in $ways; do
    check "$way" || failed="$failed $way"
done
if [ -n "$failed" ]; then
    echo "check_arch: failed:$failed" >&2
    exit 1
fi
