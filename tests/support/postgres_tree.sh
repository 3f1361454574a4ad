#!/bin/sh
# Makes a PostgreSQL installation that has the extension kzmatch, beside the machine's own, which
# stays as it is: a copy of the server program among links to everything else. The server looks for
# its libraries and extensions beside its own program.
#
#   postgres_tree.sh PG_CONFIG EXTENSION_FOLDER BUILD_FOLDER TREE
set -eu
umask 022
config=$1 extension=$2 built=$3 tree=$4
bin=$("$config" --bindir)
share=$("$config" --sharedir)
lib=$("$config" --pkglibdir)

rm -rf "$tree"
mkdir -p "$tree$bin" "$tree$share/extension" "$tree$lib"
ln -s "$bin"/* "$tree$bin"
ln -s "$lib"/* "$tree$lib" 2>/dev/null
for file in "$share"/*; do
    [ "${file##*/}" = extension ] || ln -s "$file" "$tree$share"
done
ln -s "$share"/extension/* "$tree$share/extension"
rm "$tree$bin/postgres"
cp "$bin/postgres" "$tree$bin"
rm -f "$tree$lib/kzmatch.so" "$tree$share"/extension/kzmatch*
cp "$built/kzmatch.so" "$tree$lib"
cp "$extension"/kzmatch.control "$built"/kzmatch--*.sql "$tree$share/extension"
touch "$tree"
