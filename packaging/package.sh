#!/bin/sh
# Builds Debian's packages of the last commit, and reads them with lintian: no error, no warning.
#
#   packaging/package.sh [FOLDER]     the folder that they are written to; build/packages if none
#
# packaging/debian becomes debian/ in a copy of the source tarball, its changelog is made from the
# version and the day in CHANGELOG.md. DEB_BUILD_OPTIONS="parallel=2 nocheck" is passed on.
set -eu
cd "$(dirname "$0")/.."

folder=${1:-build/packages}
mkdir -p "$folder"
folder=$(cd "$folder" && pwd)
version=$(packaging/version.sh)
day=$(packaging/version.sh date)
tree=$folder/libkzsdk-$version
# Below the first revision that Debian itself would give.
revision=$version-0local1

rm -rf "$tree"
rm -f "$folder"/*.deb "$folder"/*.dsc "$folder"/*.changes "$folder"/*.buildinfo "$folder"/*.tar.*
tarball=$(packaging/tarball.sh "$folder")
mv "$tarball" "$folder/libkzsdk_$version.orig.tar.gz"
tar -xzf "$folder/libkzsdk_$version.orig.tar.gz" -C "$folder"
cp -a "$tree/packaging/debian" "$tree/debian"
maintainer=$(sed -n 's/^Maintainer: //p' "$tree/debian/control")
cat >"$tree/debian/changelog" <<END
libkzsdk ($revision) unstable; urgency=medium

  * Release $version: /usr/share/doc/*/changelog.gz has what it brings.

 -- $maintainer  $(LC_ALL=C date -u -R -d "$day")
END

: "${DEB_BUILD_OPTIONS:=parallel=$(getconf _NPROCESSORS_ONLN)}"
export DEB_BUILD_OPTIONS
if ! (cd "$tree" && dpkg-buildpackage -us -uc) >"$folder/build.log" 2>&1; then
    tail -n 40 "$folder/build.log"
    echo "package: not built; $folder/build.log has all of it" >&2
    exit 1
fi
lintian --fail-on error,warning "$folder"/*.changes
rm -rf "$tree"
ls "$folder"/*.deb
