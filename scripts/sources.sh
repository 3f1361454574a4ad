#!/bin/sh
# Lists the C and C++ files of the tree, one a line.
set -eu
cd "$(dirname "$0")/.."
find bench bindings catalogue evaluation examples fuzz kzsdk packaging tables tests tools \
    \( -name '*.c' -o -name '*.h' -o -name '*.cpp' -o -name '*.hpp' \) -print | LC_ALL=C sort
