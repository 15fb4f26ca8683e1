# Build helpers shared by every directory of the project.

# Warnings for our own targets. Dependencies are included as system headers,
# so -Werror only ever fires on our code.
function(orvex_target_warnings target)
  target_compile_options(${target} PRIVATE
    -Wall -Wextra -Wpedantic -Wshadow -Wnon-virtual-dtor -Wcast-align
    -Woverloaded-virtual -Wnull-dereference -Wformat=2 -Wimplicit-fallthrough
    -Wmisleading-indentation)
  if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
    target_compile_options(${target} PRIVATE -Wduplicated-cond -Wlogical-op)
  endif()
  if(ORVEX_WERROR)
    target_compile_options(${target} PRIVATE -Werror)
  endif()
  if(NOT ORVEX_SANITIZE STREQUAL "" AND CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
    # Sanitizer instrumentation makes GCC's flow analysis report false
    # "may be used uninitialized" warnings in union-based value types.
    target_compile_options(${target} PRIVATE -Wno-maybe-uninitialized)
  endif()
endfunction()

# Sanitizer flags apply to every target of the build tree, dependencies' code
# compiled here included, so that instrumentation is consistent.
macro(orvex_configure_sanitizers)
  if(ORVEX_SANITIZE STREQUAL "address")
    add_compile_options(-fsanitize=address,undefined -fno-sanitize-recover=all
                        -fno-omit-frame-pointer)
    add_link_options(-fsanitize=address,undefined -fno-sanitize-recover=all)
  elseif(ORVEX_SANITIZE STREQUAL "fuzzer")
    # Set by ORVEX_BUILD_FUZZERS (clang only): ASan, UBSan and libFuzzer's
    # coverage instrumentation without its main(); the fuzz targets link
    # -fsanitize=fuzzer.
    if(NOT CMAKE_CXX_COMPILER_ID STREQUAL "Clang")
      message(FATAL_ERROR "ORVEX_BUILD_FUZZERS needs clang (the fuzz preset sets it)")
    endif()
    add_compile_options(-fsanitize=fuzzer-no-link,address,undefined
                        -fno-sanitize-recover=all -fno-omit-frame-pointer)
    add_link_options(-fsanitize=address,undefined -fno-sanitize-recover=all)
  elseif(ORVEX_SANITIZE STREQUAL "thread")
    add_compile_options(-fsanitize=thread -fno-omit-frame-pointer)
    add_link_options(-fsanitize=thread)
  elseif(NOT ORVEX_SANITIZE STREQUAL "")
    message(FATAL_ERROR "ORVEX_SANITIZE must be empty, 'address' or 'thread'")
  endif()
endmacro()

# Cross builds run the tests under an emulator (CMAKE_CROSSCOMPILING_EMULATOR).
# Death tests that re-execute the test program need it as well, since the host
# cannot start a foreign binary by itself: ORVEX_TEST_EXEC_WRAPPER gives them
# the emulator's command line (see platform/testing/reexec_death_test.h).
function(orvex_test_environment test)
  if(CMAKE_CROSSCOMPILING_EMULATOR)
    list(JOIN CMAKE_CROSSCOMPILING_EMULATOR " " wrapper)
    set_property(TEST ${test} APPEND PROPERTY ENVIRONMENT "ORVEX_TEST_EXEC_WRAPPER=${wrapper}")
  endif()
endfunction()

# orvex_test(NAME SOURCES a_test.cc ... [LIBS extra ...] [LABELS l ...]
#            [NO_PLATFORM])
# One test binary per unit, registered with ctest under NAME. Tests labelled
# "concurrency" also run in the ThreadSanitizer pass.
function(orvex_test name)
  if(NOT ORVEX_BUILD_TESTS)
    return()
  endif()
  cmake_parse_arguments(T "" "" "SOURCES;LIBS;LABELS" ${ARGN})
  add_executable(${name} ${T_SOURCES})
  target_link_libraries(${name} PRIVATE orvex_base orvex_testing orvex_test_main ${T_LIBS})
  orvex_target_warnings(${name})
  add_test(NAME ${name} COMMAND ${name})
  set_tests_properties(${name} PROPERTIES TIMEOUT 300)
  orvex_test_environment(${name})
  if(T_LABELS)
    set_tests_properties(${name} PROPERTIES LABELS "${T_LABELS}")
  endif()
endfunction()

# orvex_benchmark(NAME SOURCES a_benchmark.cc ... [LIBS extra ...])
function(orvex_benchmark name)
  cmake_parse_arguments(B "" "" "SOURCES;LIBS" ${ARGN})
  add_executable(${name} ${B_SOURCES})
  target_link_libraries(${name} PRIVATE orvex_base benchmark::benchmark ${B_LIBS})
  orvex_target_warnings(${name})
endfunction()
