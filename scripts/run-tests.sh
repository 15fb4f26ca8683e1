#!/usr/bin/env bash
# Installs what is missing, configures and builds a preset (default
# "release"), then runs its whole test suite.
#   scripts/run-tests.sh [release|debug|asan|tsan]
set -euo pipefail
cd "$(dirname "$0")/.."
preset="${1:-release}"
./scripts/install-deps.sh
cmake --preset "$preset"
cmake --build --preset "$preset"
ctest --preset "$preset"
