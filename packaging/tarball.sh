#!/bin/sh
# Writes the source tarball of the last commit, libkzsdk-VERSION.tar.gz, and prints its name. The
# same commit gives the same bytes, whenever, wherever and by whomever it is made.
#
#   packaging/tarball.sh [FOLDER]     the folder that it is written to; build/release-files if none
set -eu
cd "$(dirname "$0")/.."

folder=${1:-build/release-files}
version=$(packaging/version.sh)
name=libkzsdk-$version
if ! git rev-parse --quiet --verify HEAD >/dev/null; then
    echo "tarball: not a checkout of git; the tarball is made from a commit" >&2
    exit 1
fi
if [ -n "$(git status --porcelain --untracked-files=no)" ]; then
    echo "tarball: note: changes that are not committed are left out" >&2
fi
mkdir -p "$folder"
# The times in it are the commit's; gzip is not to add its own.
git -c tar.umask=0022 archive --format=tar --prefix="$name/" HEAD | gzip -n -9 >"$folder/part-$name.tar.gz"
mv "$folder/part-$name.tar.gz" "$folder/$name.tar.gz"
echo "$folder/$name.tar.gz"
