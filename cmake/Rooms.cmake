# One library a room, one test program a room, one fuzz target a parser.

# Everything but tests, fuzz targets and benchmarks.
add_custom_target(rooms)

# zeb_room(NAME [SHARED] SOURCES … USES …): a library that other rooms may link, and nothing more
# than what its USES name (headers are found from the top folder). Static, but SHARED for the rooms
# whose state a program and the bundles that it loads must have in common.
function(zeb_room name)
  cmake_parse_arguments(ROOM "SHARED" "" "SOURCES;USES" ${ARGN})
  if(ROOM_SHARED)
    add_library(${name} SHARED ${ROOM_SOURCES})
    set_target_properties(${name} PROPERTIES OUTPUT_NAME zeb-${name})
  else()
    add_library(${name} STATIC ${ROOM_SOURCES})
  endif()
  target_include_directories(${name} PUBLIC ${PROJECT_SOURCE_DIR})
  target_link_libraries(${name} PUBLIC ${ROOM_USES})
  add_dependencies(rooms ${name})
endfunction()

# How test code is compiled: for libraries and programs alike, so that both take the same precompiled
# header; under sanitizers without optimisation, which the rooms need and most tests do not: it would
# double the time that they take to build.
set(ZEB_TEST_OPTIONS -fPIC)
if(ZEB_SANITIZE)
  list(APPEND ZEB_TEST_OPTIONS -O0)
endif()

# What every test includes, compiled once for all of them.
add_library(test_prefix OBJECT EXCLUDE_FROM_ALL ${PROJECT_SOURCE_DIR}/tests/TestPrefix.cpp)
target_link_libraries(test_prefix PRIVATE GTest::gmock)
target_compile_options(test_prefix PRIVATE ${ZEB_TEST_OPTIONS})
target_precompile_headers(test_prefix PRIVATE <gmock/gmock.h> <gtest/gtest.h>)

# zeb_test_code(NAME): the target is made of test code.
function(zeb_test_code name)
  target_compile_options(${name} PRIVATE ${ZEB_TEST_OPTIONS})
  target_precompile_headers(${name} REUSE_FROM test_prefix)
endfunction()

# zeb_test(NAME [LABORIOUS] SOURCES … USES …): a test program, which is one test of ctest: starting a
# program takes longer than most tests. LABORIOUS ones, with models of their own to compare with, are
# optimised everywhere.
function(zeb_test name)
  cmake_parse_arguments(TEST "LABORIOUS" "" "SOURCES;USES;DEFINITIONS" ${ARGN})
  add_executable(${name} ${TEST_SOURCES})
  target_link_libraries(${name} PRIVATE ${TEST_USES} GTest::gmock GTest::gtest_main)
  target_compile_definitions(${name} PRIVATE ${TEST_DEFINITIONS}
                             ZEB_SOURCE_DIR="${PROJECT_SOURCE_DIR}")
  if(NOT TEST_LABORIOUS)
    zeb_test_code(${name})
  endif()
  add_test(NAME ${name} COMMAND ${name} --gtest_brief=1)
  set_tests_properties(${name} PROPERTIES TIMEOUT 900)
endfunction()

# zeb_fuzz(NAME SOURCE … USES …): a program around LLVMFuzzerTestOneInput. With ZEB_FUZZ it is a
# libFuzzer binary, else it replays files; either way ctest runs it over fuzz/corpus/NAME.
function(zeb_fuzz name)
  cmake_parse_arguments(FUZZ "" "SOURCE" "USES" ${ARGN})
  set(corpus ${PROJECT_SOURCE_DIR}/fuzz/corpus/${name})
  if(ZEB_FUZZ)
    add_executable(fuzz_${name} ${FUZZ_SOURCE})
    target_link_options(fuzz_${name} PRIVATE -fsanitize=fuzzer)
    add_test(NAME fuzz.${name} COMMAND fuzz_${name} -runs=0 ${corpus})
  else()
    add_executable(fuzz_${name} ${FUZZ_SOURCE} ${PROJECT_SOURCE_DIR}/fuzz/replay.cpp)
    add_test(NAME fuzz.${name} COMMAND fuzz_${name} ${corpus})
  endif()
  target_link_libraries(fuzz_${name} PRIVATE ${FUZZ_USES})
endfunction()
