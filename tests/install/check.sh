#!/usr/bin/env bash
# Installs the build into a temporary prefix, then builds and runs a separate
# project against it twice: through the CMake package and through pkg-config.
#   check.sh BUILD_DIR SOURCE_DIR CXX_FLAGS
set -euo pipefail
build=$1
source=$2
flags=${3:-}
prefix=$(mktemp -d)
trap 'rm -rf "$prefix"' EXIT

cmake --install "$build" --prefix "$prefix" >/dev/null
cmake -S "$source/tests/install/consumer" -B "$prefix/consumer-build" -G Ninja \
  -DCMAKE_PREFIX_PATH="$prefix" -DCMAKE_CXX_FLAGS="$flags" >/dev/null
cmake --build "$prefix/consumer-build" >/dev/null
out=$(LD_LIBRARY_PATH="$prefix/lib" "$prefix/consumer-build/consumer")
[ "$out" = "installed package works same-id" ] || { echo "cmake consumer printed: $out"; exit 1; }

export PKG_CONFIG_PATH="$prefix/lib/pkgconfig"
# shellcheck disable=SC2046
c++ -std=c++17 $flags "$source/tests/install/consumer/main.cpp" -o "$prefix/consumer-pc" $(pkg-config --cflags --libs tolmonetsync)
out=$(LD_LIBRARY_PATH="$prefix/lib" "$prefix/consumer-pc")
[ "$out" = "installed package works same-id" ] || { echo "pkg-config consumer printed: $out"; exit 1; }
echo "installed package usable through CMake and pkg-config"
