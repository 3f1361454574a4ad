#!/bin/sh
# Prints the version, from the one place that has it, the project() of CMakeLists.txt; or, with
# `date`, the day on which CHANGELOG.md says that it was released.
#
#   packaging/version.sh [date]
set -eu
cd "$(dirname "$0")/.."

version=$(sed -n 's/^  VERSION \([0-9.]*\)$/\1/p' CMakeLists.txt)
if [ "${1:-}" = date ]; then
    day=$(sed -n "s/^## \[$version\] - \([0-9-]*\)\$/\1/p" CHANGELOG.md)
    if [ -z "$day" ]; then
        echo "version: CHANGELOG.md has no day for $version: write '## [$version] - YYYY-MM-DD'" >&2
        exit 1
    fi
    echo "$day"
else
    echo "$version"
fi
