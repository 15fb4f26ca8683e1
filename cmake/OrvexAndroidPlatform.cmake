# Android's own base libraries, as Debian builds them from Android's sources
# (android-libbase-dev, android-liblog-dev, android-libcutils-dev): headers
# under /usr/include/android, libraries under /usr/lib/<multiarch>/android,
# the arm64 builds included. Defines two imported targets:
#   android::base    libbase (which brings liblog) and the include directory
#                    of all three packages (android-base/, cutils/, log/);
#   android::cutils  libcutils. The library needs only its headers on a host:
#                    Debian's host build has no property functions and no-op
#                    trace entry points (see platform/trace).
# Used by the build and by the installed package's orvexConfig.cmake. The
# cache variables ORVEX_ANDROID_INCLUDE_DIR and ORVEX_ANDROID_LIB_DIR point
# elsewhere for another layout.
if(TARGET android::base)
  return()
endif()

set(ORVEX_ANDROID_INCLUDE_DIR "/usr/include/android" CACHE PATH
    "Headers of Android's base libraries (android-base/, cutils/, log/)")
set(ORVEX_ANDROID_LIB_DIR "/usr/lib/${CMAKE_LIBRARY_ARCHITECTURE}/android" CACHE PATH
    "Android's base libraries for the target architecture")

# Explicit directories only: the host's x86-64 builds must never be picked
# for a cross build, whatever the search roots are.
find_path(ORVEX_ANDROID_CUTILS_HEADER_DIR cutils/trace.h
          PATHS "${ORVEX_ANDROID_INCLUDE_DIR}" NO_DEFAULT_PATH)
find_path(ORVEX_ANDROID_BASE_HEADER_DIR android-base/logging.h
          PATHS "${ORVEX_ANDROID_INCLUDE_DIR}" NO_DEFAULT_PATH)
find_library(ORVEX_ANDROID_LIBBASE NAMES base PATHS "${ORVEX_ANDROID_LIB_DIR}" NO_DEFAULT_PATH)
find_library(ORVEX_ANDROID_LIBCUTILS NAMES cutils PATHS "${ORVEX_ANDROID_LIB_DIR}"
             NO_DEFAULT_PATH)
foreach(var IN ITEMS ORVEX_ANDROID_BASE_HEADER_DIR ORVEX_ANDROID_CUTILS_HEADER_DIR
                     ORVEX_ANDROID_LIBBASE ORVEX_ANDROID_LIBCUTILS)
  if(NOT ${var})
    message(FATAL_ERROR
      "Android's base libraries were not found (${var}; looked in ${ORVEX_ANDROID_INCLUDE_DIR} "
      "and ${ORVEX_ANDROID_LIB_DIR}). On Debian install android-libbase-dev, "
      "android-liblog-dev and android-libcutils-dev for the target architecture "
      "(scripts/install-deps.sh does).")
  endif()
endforeach()

add_library(android::base SHARED IMPORTED)
set_target_properties(android::base PROPERTIES
  IMPORTED_LOCATION "${ORVEX_ANDROID_LIBBASE}"
  INTERFACE_INCLUDE_DIRECTORIES "${ORVEX_ANDROID_INCLUDE_DIR}")
add_library(android::cutils SHARED IMPORTED)
set_target_properties(android::cutils PROPERTIES
  IMPORTED_LOCATION "${ORVEX_ANDROID_LIBCUTILS}"
  INTERFACE_LINK_LIBRARIES android::base)
