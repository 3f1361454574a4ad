#!/bin/sh
# Fetches axe-core, which finds what keeps people from using a page, out of the npm registry: for
# tests only, nothing of it is shipped. Its scripts are not run.
#
#   scripts/fetch_axe.sh FOLDER     axe.min.js is in FOLDER afterwards; nothing is done if it is
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
(cd "$made" && npm pack --silent --ignore-scripts "axe-core@$version" >/dev/null)
archive=$made/axe-core-$version.tgz
echo "$digest  $archive" | sha512sum --check --quiet ||
    fail "what came as axe-core $version is not what is known as it"
tar -xzf "$archive" -C "$made" package/axe.min.js
mv "$made/package/axe.min.js" "$folder/axe.min.js"
