#!/bin/sh
# Builds the libraries in several ways, for several processors, and compares what they make of some
# sixty pieces of sound with tests/whole/golden/documents.txt, and the catalogue's trails and
# answers with catalogue.txt beside it. Prints a line for each way and variant of the inner loops;
# any difference fails.
#
#   scripts/check_arch.sh          g++ at -O0, clang++ at -O3; at -O2 64-bit ARM, S/390, 32-bit x86
#   scripts/check_arch.sh all      also the other levels, -march=native, 32-bit ARM with and without
#                                  floating-point hardware, and unit tests on other processors
#   scripts/check_arch.sh <way>... just these: see `scripts/check_arch.sh list`
#   scripts/check_arch.sh groups [quick | all | <way>...]   the groups of scripts/setup.sh it needs
#
# Each way is run with all variants of the inner loops that its processor has. A way that ends in
# -tests runs the unit tests of the rooms that compute.
#
# Programs for ARM and S/390, whose bytes run from the highest to the lowest, run under QEMU; those
# for 32-bit x86 run natively where the machine can. Which factors and taps the floating-point path
# computes rests on the C library's sine and cosine: the cross-built programs run against the same
# release of it.
set -eu
cd "$(dirname "$0")/.."

jobs=${JOBS:-$(getconf _NPROCESSORS_ONLN)}
golden=tests/whole/golden
quick="g++-O0 clang++-O3 aarch64-O2 s390x-O2 i686-O2"
rest="g++-O1 g++-O2 g++-O3 g++-O3-native clang++-O0 clang++-O1 clang++-O2 clang++-O3-native \
aarch64-O0 aarch64-O3 armhf-O0 armhf-O2 armhf-O3 armel-O2 s390x-O0 s390x-O3 i686-O0 i686-O3 \
aarch64-O2-tests s390x-O2-tests armel-O2-tests i686-O2-tests"

groups_only=no
if [ "${1:-}" = groups ]; then
    groups_only=yes
    shift
fi
case ${1:-quick} in
quick) ways=$quick ;;
all) ways="$quick $rest" ;;
list)
    # shellcheck disable=SC2086 # the ways are meant to be split
    printf '%s\n' $quick $rest
    exit 0
    ;;
*) ways=$* ;;
esac

if [ "$groups_only" = yes ]; then
    echo build
    case $ways in *clang*) echo clang ;; esac
    case $ways in *aarch64* | *arm* | *s390x* | *i686*) echo arch ;; esac
    case $ways in *-tests*) echo test wide ;; esac
    exit 0
fi

# How a way is configured: its flags are everything behind the first hyphen.
configure() {
    flags=$(echo "${1#*-}" | sed 's/-native$/ -march=native/; s/-tests$//')
    what=-DKZ_BUILD_TESTS=OFF
    case $1 in
    *-tests) what="-DKZ_BUILD_TESTS=ON -DKZ_GTEST_SOURCE=/usr/src/googletest" ;;
    esac
    flags=-${flags#-}
    case $1 in
    g++-*) compiler="-DCMAKE_C_COMPILER=gcc -DCMAKE_CXX_COMPILER=g++" ;;
    clang++-*) compiler="-DCMAKE_C_COMPILER=clang-14 -DCMAKE_CXX_COMPILER=clang++-14" ;;
    aarch64-*) compiler="-DCMAKE_TOOLCHAIN_FILE=cmake/toolchains/aarch64-linux-gnu.cmake" ;;
    armhf-*) compiler="-DCMAKE_TOOLCHAIN_FILE=cmake/toolchains/arm-linux-gnueabihf.cmake" ;;
    armel-*) compiler="-DCMAKE_TOOLCHAIN_FILE=cmake/toolchains/arm-linux-gnueabi.cmake" ;;
    s390x-*) compiler="-DCMAKE_TOOLCHAIN_FILE=cmake/toolchains/s390x-linux-gnu.cmake" ;;
    i686-*) compiler="-DCMAKE_TOOLCHAIN_FILE=cmake/toolchains/i686-linux-gnu.cmake" ;;
    *)
        echo "no such way: $1"
        return 1
        ;;
    esac
    # shellcheck disable=SC2086 # the options are meant to be split
    cmake -S . -B "$2" -G Ninja $compiler -DCMAKE_BUILD_TYPE=None -DCMAKE_C_FLAGS="$flags" \
        -DCMAKE_CXX_FLAGS="$flags" -DKZ_JNI=OFF -DKZ_BUILD_TOOLS=OFF $what -DKZ_BUILD_GOLDEN=ON \
        -DKZ_BUILD_CATALOGUE=ON -DKZ_SQLITE=OFF -DKZ_WERROR=ON
}

# What starts a program of this way.
emulator() {
    case $1 in
    aarch64-*) echo "qemu-aarch64 -L /usr/aarch64-linux-gnu" ;;
    armhf-*) echo "qemu-arm -L /usr/arm-linux-gnueabihf" ;;
    armel-*) echo "qemu-arm -L /usr/arm-linux-gnueabi" ;;
    s390x-*) echo "qemu-s390x -L /usr/s390x-linux-gnu" ;;
    i686-*)
        native="/usr/i686-linux-gnu/lib/ld-linux.so.2 --library-path /usr/i686-linux-gnu/lib"
        if $native --version >/dev/null 2>&1; then
            echo "$native"
        else
            echo "qemu-i386 -L /usr/i686-linux-gnu"
        fi
        ;;
    esac
}

# The variants that programs of this way may have; one that the processor or the library lacks is
# the default again.
variants() {
    case $1 in
    *-O0) echo "default" ;;
    aarch64-*) echo "plain neon" ;;
    g++-* | clang++-* | i686-*) echo "plain sse41 avx2 avx512" ;;
    *) echo "default" ;;
    esac
}

# compare_with_record <way> <build> <variant> <documents | catalogue>
compare_with_record() {
    # shellcheck disable=SC2046 # the words are meant to be split
    if KZSDK_KERNELS=$3 KZCAT_KERNELS=$3 $(emulator "$1") "$2/tests/whole/golden/golden_$4" \
        "$golden/$4.txt" >"$2/result"; then
        echo "$1, $3: $(wc -l <"$golden/$4.txt") digests of $4, all the same"
    else
        cat "$2/result"
        echo "$1, $3: $4 DIFFERENT"
        return 1
    fi
}

compare_digests() {
    for variant in $(variants "$1"); do
        compare_with_record "$1" "$2" "$variant" documents &&
            compare_with_record "$1" "$2" "$variant" catalogue || return 1
    done
}

run_tests() {
    if ctest --test-dir "$2" --parallel "$jobs" >"$2/result" 2>&1; then
        echo "$1: $(grep 'tests passed' "$2/result")"
    else
        tail -n 30 "$2/result"
        echo "$1: FAILED"
        return 1
    fi
}

check() {
    build=build/arch/$1
    mkdir -p "$build"
    case $1 in
    *-tests) target=all run=run_tests ;;
    *) target="golden_documents golden_catalogue" run=compare_digests ;;
    esac
    # shellcheck disable=SC2086 # the names are meant to be split
    if ! { configure "$1" "$build" && cmake --build "$build" --parallel "$jobs" --target $target; } \
        >"$build/log" 2>&1; then
        tail -n 20 "$build/log"
        echo "$1: not built"
        return 1
    fi
    $run "$1" "$build"
}

failed=
for way in $ways; do
    check "$way" || failed="$failed $way"
done
if [ -n "$failed" ]; then
    echo "check_arch: failed:$failed" >&2
    exit 1
fi
