#!/bin/sh
# Builds build/kzsdk.aar for all four ABIs. Needs a JDK and, in ANDROID_NDK_HOME, an NDK of version
# 26 or later.
set -eu
cd "$(dirname "$0")/.."

if [ ! -f "${ANDROID_NDK_HOME:-}/build/cmake/android.toolchain.cmake" ]; then
    echo "aar: set ANDROID_NDK_HOME to the directory of an Android NDK" >&2
    exit 1
fi
ndk=$(sed -n 's/^Pkg.Revision *= *\([0-9]*\).*/\1/p' "$ANDROID_NDK_HOME/source.properties")
version=$(sed -n 's/^ *VERSION \([0-9.]*\)$/\1/p' CMakeLists.txt)

cmake --preset release -DKZ_BUILD_TOOLS=OFF -DKZ_BUILD_TESTS=OFF -B build/jar
cmake --build build/jar --target kzsdk_jar

libraries=
for abi in arm64-v8a armeabi-v7a x86_64 x86; do
    cmake --preset "android-$abi"
    cmake --build --preset "android-$abi" --target kzsdk_shared
    libraries="$libraries;$abi=build/android-$abi/kzsdk/libkzsdk.so"
done

# The tools' folder is named after the machine that builds.
readelf=$(echo "$ANDROID_NDK_HOME"/toolchains/llvm/prebuilt/*/bin/llvm-readelf)

cmake -D JAR=build/jar/bindings/java/kzsdk.jar -D "LIBRARIES=${libraries#;}" -D "VERSION=$version" -D "NDK=$ndk" \
    -D "READELF=$readelf" -D WORK_DIR=build/aar -D OUT=build/kzsdk.aar -P packaging/aar.cmake
echo "aar: build/kzsdk.aar"
