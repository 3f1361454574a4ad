#!/bin/sh
# Compiles libkzsdk for Android's four kinds of processors with clang, where there is no NDK: with
# the C and C++ headers of Debian's cross compilers, and with Android's jni.h and log.h. Nothing is
# linked. Says how many files were compiled for each; takes some minutes.
#
#   packaging/check_android.sh [file...]     default: all of kzsdk
#
# Needs what `scripts/setup.sh build java clang arch` installs.
set -eu
cd "$(dirname "$0")/.."

folder=$(mktemp -d)
trap 'rm -rf "$folder"' EXIT

# Apps have no use for the thread of a build inside Android's own sources.
# shellcheck disable=SC2046 # the names are meant to be split
[ $# -gt 0 ] || set -- $(find kzsdk -name '*.cpp' ! -name android_thread.cpp | LC_ALL=C sort)

# instruction_set FILE: as kz_instruction_set() of cmake/KzBuild.cmake has it.
instruction_set() {
    case $1 in
    *sse41*) echo "-msse4.1" ;;
    *avx2*) echo "-mavx2" ;;
    *avx512*) echo "-mavx2 -mavx512f -mavx512bw -mavx512vpopcntdq" ;;
    esac
}

# headers NAME: the folders of a cross compiler's headers; this machine's own lie elsewhere.
headers() {
    own=/usr/$1/include
    if [ -d "$own" ]; then
        echo "-isystem $own/c++/12 -isystem $own/c++/12/$1 -isystem $own"
    else
        echo "-isystem /usr/include/c++/12 -isystem /usr/include/$1/c++/12 -isystem /usr/include/$1 -isystem /usr/include"
    fi
}

# check TRIPLE NAME FILE...: compiles each file into an object.
check() {
    triple=$1
    where=$(headers "$2")
    shift 2
    for file in "$@"; do
        flags=
        case $triple in
        x86_64* | i686*) flags=$(instruction_set "$file") ;;
        esac
        # shellcheck disable=SC2086 # the flags are meant to be split
        clang++-14 -target "$triple" -std=c++20 -O0 -fPIC -D_FILE_OFFSET_BITS=64 -fno-exceptions -fno-rtti \
            -fvisibility=hidden -Wall -Wextra -Wconversion -Wsign-conversion -Wshadow -Werror $flags \
            -nostdinc++ -nostdlibinc -I. -isystem /usr/include/android/nativehelper $where \
            -idirafter /usr/include/android -c -o "$folder/object.o" "$file"
    done
    echo "$triple: $# files, $(readelf -h "$folder/object.o" | sed -n 's/^ *Machine: *//p')"
}

check aarch64-linux-android24 aarch64-linux-gnu "$@"
check armv7a-linux-androideabi24 arm-linux-gnueabi "$@"
check x86_64-linux-android24 x86_64-linux-gnu "$@"
check i686-linux-android24 i686-linux-gnu "$@"
