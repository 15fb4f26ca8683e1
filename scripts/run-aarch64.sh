#!/usr/bin/env bash
# Cross-builds the library, its tests and tools for 64-bit Arm Linux and runs
# the whole test suite under qemu-user (build tree build/aarch64).
#   scripts/run-aarch64.sh [extra ctest arguments...]
# Installs what is missing first (scripts/install-deps.sh aarch64). Prints
# the wall time of each step and the vector instruction sets the kernel
# tests ran on.
set -euo pipefail
cd "$(dirname "$0")/.."
jobs="${ORVEX_JOBS:-2}"
now() { date +%s; }

./scripts/install-deps.sh aarch64
t0=$(now)
cmake --preset aarch64
cmake --build --preset aarch64 -j"$jobs"
t1=$(now)
status=0
ctest --preset aarch64 "$@" || status=$?
t2=$(now)

echo "== vector targets (from the test log)"
awk '/^[0-9]+\/[0-9]+ Test: /{name = $3} /^Vector targets exercised:/{print name ": " $0}' \
  build/aarch64/Testing/Temporary/LastTest.log || true
echo "== aarch64: configure+build $((t1 - t0))s, tests $((t2 - t1))s"
exit "$status"
