#!/bin/sh
# Takes one piece of music out of a Debian package, which is downloaded and not installed.
#
#   scripts/fetch_tune.sh PACKAGE PATH SHA256 FILE    PATH inside the package, FILE to write
#
# Does nothing when FILE is there already with that digest.
set -eu

if [ $# -ne 4 ]; then
    echo "usage: scripts/fetch_tune.sh PACKAGE PATH SHA256 FILE" >&2
    exit 2
fi
package=$1
path=$2
digest=$3
file=$4

fail() {
    echo "fetch_tune.sh: $*" >&2
    exit 1
}

need() {
    command -v "$1" >/dev/null || fail "$1 is missing; apt-get install $2"
}

as_root() {
    if [ "$(id -u)" = 0 ]; then "$@"; else sudo -n "$@"; fi
}

# The package lists of a fresh machine are empty: they are fetched when the first try fails.
download() {
    apt-get download "$package" >download.log 2>&1 && return
    as_root apt-get update >>download.log 2>&1 || true
    apt-get download "$package" >>download.log 2>&1
}

digest_is() {
    echo "$digest  $1" | sha256sum --check --status
}

if [ -f "$file" ] && digest_is "$file"; then
    exit 0
fi
need apt-get apt
need dpkg-deb dpkg
mkdir -p "$(dirname "$file")"
file=$(cd "$(dirname "$file")" && pwd)/$(basename "$file")
work=$(mktemp -d "$(dirname "$file")/download.XXXXXX")
trap 'rm -rf "$work"' EXIT
chmod 755 "$work" # apt-get downloads as a user of its own
cd "$work"
download || fail "the Debian package $package, which holds the music, cannot be downloaded:
$(grep '^E:' download.log)
Without a network, put $path
out of that package at $file and try again."
dpkg-deb -x "$package"_*.deb .
digest_is "$path" || fail "the music in the package $package is not the one expected"
mv "$path" "$file"
