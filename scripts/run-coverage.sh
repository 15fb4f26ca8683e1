#!/usr/bin/env bash
# Builds the "coverage" preset (gcc --coverage, -O0), runs the whole test
# suite and reports line and branch coverage of the library sources under
# orvex/ (tests, test helpers, generated *.pb.* files, bench/, tools/ and
# platform/ are left out):
#   - a per-file line table and a per-file branch table on stdout,
#   - an HTML report with annotated sources in build/coverage/report/,
#   - the raw figures as JSON in build/coverage/report/coverage.json.
#   scripts/run-coverage.sh [--no-test]   (--no-test: report the counters
#                                          of the last run only)
# Branch figures leave out the exception edges g++ adds to every call that
# may throw (--exclude-throw-branches: the library throws nothing itself, and
# an allocation failure is not a branch its tests can or should take) and
# branches on lines without source code, such as those of compiler-made
# destructor calls (--exclude-unreachable-branches).
set -euo pipefail
cd "$(dirname "$0")/.."
run_tests=1
if [ "${1:-}" = "--no-test" ]; then run_tests=0; fi

./scripts/install-deps.sh coverage
build=build/coverage
out="$build/report"
if [ "$run_tests" -eq 1 ]; then
  cmake --preset coverage >/dev/null
  cmake --build --preset coverage -j2
  # Counters accumulate across runs; start from zero.
  find "$build" -name '*.gcda' -delete
  ctest --preset coverage
fi

rm -rf "$out"
mkdir -p "$out"
gcovr --root . --object-directory "$build" -j 2 \
  --filter 'orvex/' \
  --exclude '.*_test\.cc$' \
  --exclude '.*/testing/.*' --exclude '.*_testing\.h$' \
  --exclude 'orvex/status/status_matchers\.h$' \
  --exclude '.*\.pb\.(cc|h)$' \
  --exclude 'bench/' --exclude 'tools/' --exclude 'platform/' \
  --exclude-directories 'build/coverage/CMakeFiles' --gcov-ignore-parse-errors \
  --exclude-throw-branches --exclude-unreachable-branches \
  --json "$out/coverage.json"

report=(gcovr --root . --add-tracefile "$out/coverage.json")
echo "== Line coverage of orvex/"
"${report[@]}" --txt
echo
echo "== Branch coverage of orvex/"
"${report[@]}" --txt --branches
"${report[@]}" --html-details "$out/index.html" --html-title "liborvex_base coverage" \
  --print-summary
echo "HTML report: $out/index.html"
