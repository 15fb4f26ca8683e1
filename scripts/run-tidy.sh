#!/usr/bin/env bash
# Runs clang-tidy with the checked-in .clang-tidy over every C++ source of the
# library, the platform layer and their tests. Needs a configured release
# tree (cmake --preset release) for its compilation database.
set -euo pipefail
cd "$(dirname "$0")/.."
[ -f build/release/compile_commands.json ] || cmake --preset release >/dev/null
mapfile -t files < <(git ls-files 'orvex/*.cc' 'platform/*.cc' 'examples/*.cc')
printf '%s\n' "${files[@]}" | xargs -P "$(nproc)" -n 4 clang-tidy -p build/release --quiet --extra-arg=-Wno-unknown-warning-option
