#!/bin/sh
# Fetches axe-core, which finds what keeps people from using a page, out of the npm registry: for
# tests only, nothing of it is shipped. Its scripts are not run.
#
#   scripts/fetch_axe.sh FOLDER     axe.min.js is in FOLDER afterwards; nothing is done if it is
#
# Ends with 77 when the registry cannot be reached, and with 1 for all else that goes wrong.
set -eu

version=4.14.1
# Of the registry's archive, as `npm view axe-core@4.14.1 dist.integrity` prints it, in hexadecimal.
digest=1477dafa598d8d065f273d6af302aa203c02e83131707b7fa648cd41bd3d6b734f8c22a0dab86ee6a6f64b8afbe804b214d36db85a2826965edfb3a0b9d546b5

fail() {
    echo "fetch_axe.sh: $*" >&2
    exit 1
}

[ $# -eq 1 ] || fail "usage: scripts/fetch_axe.sh FOLDER"
folder=$1
[ ! -s "$folder/axe.min.js" ] || exit 0
command -v npm >/dev/null || fail "npm is missing; apt-get install npm"

mkdir -p "$folder"
made=$(mktemp -d "$folder/fetch.XXXXXX")
trap 'rm -rf "$made"' EXIT
unreachable='E(NOTFOUND|AI_AGAIN|CONNREFUSED|CONNRESET|TIMEDOUT|NETUNREACH|HOSTUNREACH)'
(cd "$made" && npm pack --ignore-scripts --fetch-retries=1 --fetch-retry-mintimeout=1000 \
    --fetch-timeout=30000 "axe-core@$version" >/dev/null 2>said) || {
    cat "$made/said" >&2
    grep -Eq "$unreachable" "$made/said" || fail "axe-core $version could not be fetched"
    echo "fetch_axe.sh: the npm registry cannot be reached; try again with a network" >&2
    exit 77
}
archive=$made/axe-core-$version.tgz
echo "$digest  $archive" | sha512sum --check --quiet ||
    fail "what came as axe-core $version is not what is known as it"
tar -xzf "$archive" -C "$made" package/axe.min.js
mv "$made/package/axe.min.js" "$folder/axe.min.js"
