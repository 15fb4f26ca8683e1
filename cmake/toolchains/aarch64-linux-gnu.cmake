# Cross build for 64-bit Arm Linux with Debian's cross toolchain
# (g++-aarch64-linux-gnu) and the arm64 multiarch -dev packages of our
# dependencies (libabsl-dev:arm64, libfmt-dev:arm64, ...). Headers are shared
# with the host under /usr/include; libraries and CMake package files come
# from /usr/lib/aarch64-linux-gnu. Build-time tools (protoc) are the host's.
# Built programs run under qemu-user, so ctest works unchanged.
set(CMAKE_SYSTEM_NAME Linux)
set(CMAKE_SYSTEM_PROCESSOR aarch64)

set(ORVEX_CROSS_TRIPLE aarch64-linux-gnu)
set(CMAKE_C_COMPILER /usr/bin/${ORVEX_CROSS_TRIPLE}-gcc-12)
set(CMAKE_CXX_COMPILER /usr/bin/${ORVEX_CROSS_TRIPLE}-g++-12)
set(CMAKE_LIBRARY_ARCHITECTURE ${ORVEX_CROSS_TRIPLE})

# Multiarch layout: the "root" is the host's own /usr, restricted to the
# aarch64 library directories; the cross compiler's own runtime sits under
# /usr/aarch64-linux-gnu. The host's x86-64 libraries must never be picked.
set(CMAKE_FIND_ROOT_PATH /usr/${ORVEX_CROSS_TRIPLE})
list(APPEND CMAKE_PREFIX_PATH /usr/lib/${ORVEX_CROSS_TRIPLE}/cmake)
set(CMAKE_IGNORE_PATH
    /usr/lib/x86_64-linux-gnu /lib/x86_64-linux-gnu
    /usr/lib/x86_64-linux-gnu/cmake)
set(CMAKE_FIND_ROOT_PATH_MODE_PROGRAM NEVER)
set(CMAKE_FIND_ROOT_PATH_MODE_LIBRARY BOTH)
set(CMAKE_FIND_ROOT_PATH_MODE_INCLUDE BOTH)
set(CMAKE_FIND_ROOT_PATH_MODE_PACKAGE BOTH)

# The schema compiler runs on the build machine; its version matches the
# arm64 runtime because both come from the same Debian source package.
set(Protobuf_PROTOC_EXECUTABLE /usr/bin/protoc CACHE FILEPATH "Host protoc")

# pkg-config, if anything asks, must describe the arm64 libraries.
set(ENV{PKG_CONFIG_LIBDIR} /usr/lib/${ORVEX_CROSS_TRIPLE}/pkgconfig:/usr/share/pkgconfig)
set(ENV{PKG_CONFIG_PATH} "")

# Test programs (ctest, and any build-time run of a target) go through
# qemu-user on its "max" CPU (every optional feature it emulates, SVE and SVE2
# included, so that each vector target can run). No -L/QEMU_LD_PREFIX: the
# arm64 multiarch C library (libc6:arm64, pulled in by the -dev packages) is
# found at its native paths. Pointing -L at /usr/aarch64-linux-gnu would load
# the cross toolchain's dynamic loader next to the multiarch libraries, and
# with the two glibc builds mixed every fork() child spins forever (which
# hangs death tests).
find_program(ORVEX_QEMU_AARCH64 NAMES qemu-aarch64 qemu-aarch64-static REQUIRED)
set(CMAKE_CROSSCOMPILING_EMULATOR
    "${ORVEX_QEMU_AARCH64};-cpu;max")
