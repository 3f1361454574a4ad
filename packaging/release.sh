#!/bin/sh
# Writes what is published with a version: the source tarball, beside it what the libraries and kzfp
# are linked with (CycloneDX), and the digests of both.
#
#   packaging/release.sh BUILD [FOLDER]     BUILD holds the libraries and kzfp, built from this
#                                           commit; FOLDER is build/release-files if none
set -eu
cd "$(dirname "$0")/.."

build=$1
folder=${2:-build/release-files}
version=$(packaging/version.sh)
packaging/version.sh date >/dev/null # a release has its day
packaging/tarball.sh "$folder"
packaging/sbom.py "$build" >"$folder/libkzsdk-$version.cdx.json"
cd "$folder"
sha256sum "libkzsdk-$version.tar.gz" "libkzsdk-$version.cdx.json" >"libkzsdk-$version.sha256"
cat "libkzsdk-$version.sha256"
