#!/bin/sh
# Installs what is missing to build and test the library on Debian 12.
#
#   scripts/setup.sh [build] [catalogue] [postgresql] [java] [python] [tools] [service] [test]
#                    [clips] [bench] [lint] [clang] [fuzz] [wasm] [browser] [coverage] [arch]
#                    [debian] [wide]
#                                 default: all of them but the last four
#
# Needs root, or sudo. Installs only what is missing and does nothing when nothing is.
set -eu

# What brings npm: Debian's package, unless Node came from elsewhere and brought its own, which that
# package conflicts with.
npm_package() {
    command -v npm >/dev/null || echo npm
}

packages_of() {
    case $1 in
    # Also a jni.h, for the library's Java front.
    build) echo "g++ cmake ninja-build make android-libnativehelper-dev" ;;
    catalogue) echo "libsqlite3-dev nettle-dev pkg-config sqlite3" ;; # keeping and hashing; a second reader for tests
    # The client library, a server for the tests, and what its extensions are built with.
    postgresql) echo "libpq-dev postgresql-15 postgresql-client-15 postgresql-server-dev-15" ;;
    # FFmpeg's libraries read what libsndfile does not, PortAudio listens to microphones.
    tools) echo "pkg-config libsndfile1-dev libsoxr-dev libcli11-dev nlohmann-json3-dev libavformat-dev libavcodec-dev portaudio19-dev libpng-dev" ;;
    # kzfp serve; what asks it, stands before it and loads it; what reads its description.
    service) echo "libmicrohttpd-dev curl wrk openssl nginx-light python3-pytest python3-yaml python3-jsonschema python3-numpy" ;;
    test) echo "libgtest-dev libgmock-dev pkg-config binutils genisoimage udftools xorriso python3 zsh fish libexpat1-dev libpng-dev chromium-headless-shell" ;;
    # The Java front and its tests; Android's log and threads as a desktop has them, its resources.
    java) echo "default-jdk-headless junit4 android-liblog-dev android-libutils-dev proguard-cli aapt android-framework-res" ;;
    kotlin) echo "kotlin" ;; # for -DKZ_KOTLIN=ON; 70 packages
    # The package, what tests it, and what its example and its other reader of files want.
    python) echo "python3-cffi python3-setuptools python3-wheel python3-build python3-venv python3-pytest python3-numpy python3-soundfile python3-matplotlib" ;;
    # The npm package for browsers and Node: its compiler, and that of its types.
    wasm) echo "emscripten nodejs node-typescript" ;;
    # What runs pages in tests, and fetches what checks them. Other Nodes bring their own npm.
    browser) echo "chromium-headless-shell nodejs $(npm_package)" ;;
    clips) echo "sox libsox-fmt-all espeak-ng ffmpeg" ;; # the demo's music, and the tests' clips
    # Tools that count instructions and print tables, and the peers, each of which may be missing.
    bench) echo "valgrind python3 pkg-config libcli11-dev nlohmann-json3-dev libchromaprint-dev libfftw3-dev libswresample-dev libavutil-dev libsoxr-dev libspeexdsp-dev libpugixml-dev libtinyxml2-dev libxml2-dev" ;;
    fuzz) echo "libexpat1-dev python3" ;; # a parser to read what is rendered, and the seeds
    # The programs that degrade music, and the peer that is packaged.
    evaluation) echo "ffmpeg sox libsox-fmt-all espeak-ng libchromaprint-tools python3 python3-numpy" ;;
    lint) echo "python3-mypy clang-format-14 clang-tidy-14 cppcheck mandoc shellcheck nodejs $(npm_package)" ;;
    clang) echo "clang-14 libclang-rt-14-dev" ;;
    coverage) echo "llvm-14" ;; # what counts
    # Cross compilers, and what runs their programs.
    arch) echo "g++-aarch64-linux-gnu g++-arm-linux-gnueabihf g++-arm-linux-gnueabi g++-s390x-linux-gnu g++-i686-linux-gnu qemu-user" ;;
    # What builds and checks the packages, and a bare system to install them in.
    debian) echo "build-essential debhelper dh-python lintian debootstrap" ;;
    wide) echo "libboost-dev" ;; # 128-bit numbers for tests on processors whose compilers have none
    *)
        echo "setup: no such group: $1" >&2
        exit 2
        ;;
    esac
}

installed() {
    [ "$(dpkg-query -W -f '${db:Status-Status}' "$1" 2>/dev/null || true)" = installed ]
}

[ $# -gt 0 ] || set -- build catalogue postgresql java python tools service test clips bench lint clang fuzz wasm browser

wanted=
for group in "$@"; do
    wanted="$wanted $(packages_of "$group")"
done

if ! command -v apt-get >/dev/null || ! command -v dpkg-query >/dev/null; then
    echo "setup: not a Debian system; going on in the hope that these are there:$wanted" >&2
    exit 0
fi

missing=
for package in $wanted; do
    if ! installed "$package"; then
        missing="$missing $package"
    fi
done
[ -n "$missing" ] || exit 0

if [ "$(id -u)" -eq 0 ]; then
    as_root=
elif command -v sudo >/dev/null; then
    as_root=sudo
else
    echo "setup: neither root nor sudo. Ask root for: apt-get install$missing" >&2
    exit 1
fi

apt() {
    $as_root env DEBIAN_FRONTEND=noninteractive apt-get -q -o DPkg::Lock::Timeout=300 "$@"
}

# A package list is fetched when there is none, or when the one at hand is too old to serve.
known() {
    for package in $missing; do
        apt-cache show --no-all-versions "$package" >/dev/null 2>&1 || return 1
    done
}

install_missing() {
    # shellcheck disable=SC2086 # the names are meant to be split
    apt install -y --no-install-recommends $missing
}

echo "setup: installing$missing"
if known && install_missing; then
    exit 0
fi
apt update
install_missing
