#!/usr/bin/env bash
# Builds the libFuzzer targets (preset "fuzz": clang, ASan + UBSan) and runs
# each for a bounded time over a temporary copy of its seed corpus in
# fuzz/corpus/, so that new inputs never land in the repository. Fails on
# the first crash, sanitizer report or broken property; the input that did
# it is kept as <target>-crash-<hash> in the artifact directory.
#   scripts/run-fuzz.sh [seconds-per-target]      (default 60)
# Environment: FUZZ_TARGETS (default: all four), FUZZ_ARTIFACTS (default
# build/fuzz/artifacts), FUZZ_JOBS (parallel workers per target, default 1).
set -euo pipefail
cd "$(dirname "$0")/.."
seconds="${1:-60}"
targets=(${FUZZ_TARGETS:-image_format_fuzzer path_fuzzer property_fuzzer cpa_fuzzer})
artifacts="${FUZZ_ARTIFACTS:-$PWD/build/fuzz/artifacts}"
jobs="${FUZZ_JOBS:-1}"

./scripts/install-deps.sh clang
cmake --preset fuzz
cmake --build --preset fuzz

export ASAN_OPTIONS="halt_on_error=1:abort_on_error=1:detect_leaks=1:strict_string_checks=1"
export UBSAN_OPTIONS="halt_on_error=1:print_stacktrace=1"
mkdir -p "$artifacts"
work="$(mktemp -d)"
trap 'rm -rf "$work"' EXIT

for target in "${targets[@]}"; do
  corpus="$work/$target"
  mkdir -p "$corpus"
  cp -r "fuzz/corpus/$target/." "$corpus/"
  log="$work/$target.log"
  echo "== $target: ${seconds}s"
  status=0
  extra=()
  if [ "$jobs" -gt 1 ]; then extra=(-fork="$jobs" -ignore_crashes=0); fi
  "build/fuzz/fuzz/$target" -max_total_time="$seconds" -print_final_stats=1 \
    -artifact_prefix="$artifacts/$target-" "${extra[@]}" "$corpus" >"$log" 2>&1 || status=$?
  # The last status line carries the coverage and the speed reached.
  grep -E '^#[0-9]+' "$log" | tail -n 1 || true
  if [ "$status" -ne 0 ]; then
    tail -n 60 "$log"
    echo "$target FAILED (exit $status); reproduce with: build/fuzz/fuzz/$target <crash file>" >&2
    exit 1
  fi
done
