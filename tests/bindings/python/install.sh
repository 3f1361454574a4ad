#!/bin/sh
# Builds the wheel and the source archive, without a network, and installs the wheel into a new
# environment, from which the tests run.
#
#   install.sh <python> <folder of the package> <folder for archives> <environment>
set -eu
python=$1 package=$2 dist=$3 environment=$4

rm -rf "$dist" "$environment" "$package/build" "$package/kzsdk.egg-info"
"$python" -m build --no-isolation --sdist --wheel --outdir "$dist" "$package"
"$python" -m venv --system-site-packages "$environment"
"$environment/bin/python" -m pip install --quiet --disable-pip-version-check --no-index --no-deps \
    "$dist"/kzsdk-*.whl
