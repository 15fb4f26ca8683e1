#!/usr/bin/env bash
# Checks Android.bp without an Android tree: bpfmt (Debian's blueprint-tools)
# leaves it unchanged, and every library, tool or test source that the CMake
# build compiles is listed in Android.bp and the other way round, except the
# sources below that exist for a Debian host only. Configures a throwaway
# CMake tree to learn what CMake compiles; builds nothing.
set -euo pipefail
cd "$(dirname "$0")/.."

# Host-only sources, with the reason a device build leaves them out.
host_only=(
  platform/properties/properties.cc        # property store: a device has the property service
  platform/properties/properties_test.cc
  platform/trace/host_trace.cc             # trace recorder: a device has the system trace
  orvex/api/debug/perf_trace_host_test.cc  # records with the host trace recorder
  orvex/api/thread/fence_test.cc           # records with the host trace recorder
  tools/orvex/orvex_tool_test.cc           # records with it (demo --trace)
  orvex/api/debug/perf_trace_test.cc       # runs without a trace library; a device has libcutils
  orvex/testing/coverage_flush.cc          # coverage builds only
)

status=0
format_diff=$(bpfmt -d Android.bp)
if [ -n "$format_diff" ]; then
  echo "Android.bp is not in bpfmt's layout (fix with: bpfmt -w Android.bp):"
  echo "$format_diff"
  status=1
fi

work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
cmake -S . -B "$work/build" -G Ninja -DORVEX_BUILD_BENCHMARKS=OFF >"$work/configure.log" 2>&1 ||
  { cat "$work/configure.log"; exit 2; }
# What CMake compiles under orvex/, platform/ and tools/ (examples and
# benchmarks have no Android module); the generated schema classes stand for
# their .proto.
sed -n 's/^ *"file": "\(.*\)",\{0,1\}$/\1/p' "$work/build/compile_commands.json" |
  sed -e "s|^$work/build/\(.*\)\.pb\.cc$|\1.proto|" -e "s|^$PWD/||" |
  grep -E '^(orvex|platform|tools)/' | sort -u >"$work/cmake.txt"
grep -oE '"[^"]+\.(cc|proto)"' Android.bp | tr -d '"' | sort -u >"$work/bp.txt"
printf '%s\n' "${host_only[@]}" | sort -u >"$work/host_only.txt"

only_cmake=$(comm -23 "$work/cmake.txt" "$work/bp.txt" | comm -23 - "$work/host_only.txt")
only_bp=$(comm -13 "$work/cmake.txt" "$work/bp.txt")
if [ -n "$only_cmake" ]; then
  echo "compiled by CMake but not listed in Android.bp:"
  echo "$only_cmake" | sed 's/^/  /'
  status=1
fi
if [ -n "$only_bp" ]; then
  echo "listed in Android.bp but not compiled by CMake:"
  echo "$only_bp" | sed 's/^/  /'
  status=1
fi
if [ "$status" -eq 0 ]; then
  echo "Android.bp: formatted; $(wc -l <"$work/bp.txt") sources agree with the CMake build" \
       "($(wc -l <"$work/host_only.txt") host-only sources left out)"
fi
exit "$status"
