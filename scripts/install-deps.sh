#!/usr/bin/env bash
# Installs the Debian packages the build and the tests need, skipping those
# already present. Safe to run repeatedly; needs root (or sudo) only when
# something is missing.
set -euo pipefail

packages=(
  cmake ninja-build g++ pkg-config git
  libabsl-dev libfmt-dev
  libprotobuf-dev protobuf-compiler
  libgtest-dev libgmock-dev libbenchmark-dev
  libhwy-dev
)
# Extra package groups, chosen with arguments: "asan"/"tsan" need nothing
# beyond g++; "clang" adds the compiler and runtime for fuzzing; "coverage"
# adds the coverage report generator.
for group in "$@"; do
  case "$group" in
    clang) packages+=(clang libclang-rt-14-dev) ;;
    tidy) packages+=(clang-tidy clang-format) ;;
    coverage) packages+=(gcovr) ;;
    *) ;;
  esac
done

missing=()
for p in "${packages[@]}"; do
  if ! dpkg-query -W -f='${Status}' "$p" 2>/dev/null | grep -q "install ok installed"; then
    missing+=("$p")
  fi
done
if [ ${#missing[@]} -eq 0 ]; then
  exit 0
fi

echo "installing: ${missing[*]}" >&2
sudo=""
if [ "$(id -u)" -ne 0 ]; then sudo="sudo"; fi
export DEBIAN_FRONTEND=noninteractive
$sudo apt-get update -qq
$sudo apt-get install -y -qq --no-install-recommends "${missing[@]}"
