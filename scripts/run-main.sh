#!/usr/bin/env bash
# The main job: installs what is missing, builds the orvex tool (release
# preset) and runs its demo with the defaults (arguments are passed on to the
# demo), then reads the latency profile the demo wrote back with `orvex cpa`.
set -euo pipefail
cd "$(dirname "$0")/.."
./scripts/install-deps.sh
cmake --preset release
cmake --build --preset release --target orvex
orvex=./build/release/tools/orvex/orvex
log=$(mktemp)
trap 'rm -f "$log"' EXIT
status=0
"$orvex" demo "$@" | tee "$log" || status=$?
profile=$(sed -n 's/^latency profile: //p' "$log")
if [ -n "$profile" ]; then
  echo
  echo "\$ orvex cpa $profile"
  "$orvex" cpa "$profile"
fi
exit "$status"
