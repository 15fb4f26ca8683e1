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
  libpng-dev libexpat1-dev
  android-libbase-dev android-liblog-dev android-libcutils-dev
  blueprint-tools
)
# Android's own base libraries (libbase, liblog, libcutils) come from Debian's
# android-*-dev packages; blueprint-tools gives bpfmt for the Android.bp check.
# Extra package groups, chosen with arguments: "asan"/"tsan" need nothing
# beyond g++; "clang" adds the compiler and runtime for fuzzing and the Clang
# user build; "coverage"
# adds the coverage report generator; "aarch64" adds the 64-bit Arm cross
# compiler, the arm64 builds of the libraries (multiarch) and qemu-user to run
# the tests.
foreign_arch=""
for group in "$@"; do
  case "$group" in
    clang) packages+=(clang libclang-rt-14-dev) ;;
    aarch64)
      foreign_arch=arm64
      packages+=(g++-aarch64-linux-gnu qemu-user
                 libabsl-dev:arm64 libfmt-dev:arm64 libprotobuf-dev:arm64
                 libgtest-dev:arm64 libgmock-dev:arm64 libbenchmark-dev:arm64
                 libhwy-dev:arm64 libpng-dev:arm64 libexpat1-dev:arm64
                 android-libbase-dev:arm64 android-liblog-dev:arm64
                 android-libcutils-dev:arm64) ;;
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
if [ -n "$foreign_arch" ] && ! dpkg --print-foreign-architectures | grep -qx "$foreign_arch"; then
  $sudo dpkg --add-architecture "$foreign_arch"
fi
$sudo apt-get update -qq
$sudo apt-get install -y -qq --no-install-recommends "${missing[@]}"
