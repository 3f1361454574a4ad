#!/bin/sh
# Runs the tests that have threads under the thread sanitizer; it has nothing to find in the others.
#
#   scripts/check_threads.sh
set -eu
cd "$(dirname "$0")/.."

jobs=${JOBS:-$(getconf _NPROCESSORS_ONLN)}
cmake --preset tsan -DKZ_WERROR=ON -DKZ_BUILD_TOOLS=OFF
cmake --build --preset tsan --parallel "$jobs" --target abi_threads_test soak jni_tests \
    abs_startup_test stream_stream_test catalogue_thread_tests
ctest --preset tsan --parallel "$jobs" \
    --tests-regex '^(abi_threads_test|soak|jni_.*)\.|^(abs_startup_test|stream_stream_test|kzcat_.*)\..*Thread'
