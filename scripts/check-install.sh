#!/usr/bin/env bash
# Installs a built preset (default release) into a temporary prefix, then
# builds and runs the consumer example against the installed package, once
# through CMake's find_package and once through pkg-config.
set -euo pipefail
cd "$(dirname "$0")/.."
preset="${1:-release}"
prefix=$(mktemp -d)
work=$(mktemp -d)
trap 'rm -rf "$prefix" "$work"' EXIT
cmake --install "build/$preset" --prefix "$prefix" >/dev/null
cmake -S examples/consumer -B "$work/cmake" -G Ninja -DCMAKE_PREFIX_PATH="$prefix" >/dev/null
cmake --build "$work/cmake" >/dev/null
LD_LIBRARY_PATH="$prefix/lib:$prefix/lib64:${LD_LIBRARY_PATH:-}" "$work/cmake/consumer"
export PKG_CONFIG_PATH="$prefix/lib/pkgconfig:$prefix/lib64/pkgconfig:$prefix/share/pkgconfig"
# shellcheck disable=SC2046
g++ -std=c++20 -pthread examples/consumer/main.cc -o "$work/pc-consumer" $(pkg-config --cflags --libs orvex)
LD_LIBRARY_PATH="$prefix/lib:$prefix/lib64:${LD_LIBRARY_PATH:-}" "$work/pc-consumer"
# The installed tool runs from the prefix without any library path set.
"$prefix/bin/orvex" layout 64 32 YV12 --conform YV12 | tail -1
echo "install check: passed"
