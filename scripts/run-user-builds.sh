#!/usr/bin/env bash
# Builds the library and the orvex tool the way a user does, without our
# presets: plain CMAKE_BUILD_TYPE=Release (-O3, no -Werror), once with GCC
# and once with Clang, in build/user-gcc and build/user-clang. Only those two
# targets are built, to keep CI short. Fails on any compiler warning (a user
# sees them; -Werror stays ours) and runs the tool once.
set -euo pipefail
cd "$(dirname "$0")/.."
jobs="${ORVEX_JOBS:-2}"
./scripts/install-deps.sh clang

for pair in gcc:g++ clang:clang++; do
  cc=${pair%%:*}
  cxx=${pair##*:}
  dir=build/user-$cc
  start=$(date +%s)
  cmake -S . -B "$dir" -G Ninja -DCMAKE_BUILD_TYPE=Release \
        -DCMAKE_C_COMPILER="$cc" -DCMAKE_CXX_COMPILER="$cxx" >/dev/null
  cmake --build "$dir" --target orvex_base orvex -j"$jobs" >"$dir.log" 2>&1 ||
    { tail -50 "$dir.log"; exit 1; }
  if grep -q 'warning:' "$dir.log"; then
    grep -A5 'warning:' "$dir.log" | head -60
    echo "$cc Release build: compiler warnings (full log: $dir.log)"
    exit 1
  fi
  "$dir/tools/orvex/orvex" layout 64 32 YV12 --conform YV12 | tail -1
  echo "$cc Release build of the library and tool: no warnings, $(( $(date +%s) - start ))s"
done
