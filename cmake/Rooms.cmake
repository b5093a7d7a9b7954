# One library a room, one test program a room, one fuzz target a parser.

# Everything but tests, fuzz targets and benchmarks.
add_custom_target(rooms)
# Every fuzz target.
add_custom_target(fuzz_targets)

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

# zeb_test(NAME SOURCES … USES …): a test program, which is one test of ctest: starting a program
# takes longer than most tests.
function(zeb_test name)
  cmake_parse_arguments(TEST "" "" "SOURCES;USES;DEFINITIONS" ${ARGN})
  add_executable(${name} ${TEST_SOURCES})
  target_link_libraries(${name} PRIVATE ${TEST_USES} GTest::gmock GTest::gtest_main)
  target_compile_definitions(${name} PRIVATE ${TEST_DEFINITIONS}
                             ZEB_SOURCE_DIR="${PROJECT_SOURCE_DIR}")
  add_test(NAME ${name} COMMAND ${name} --gtest_brief=1)
  set_tests_properties(${name} PROPERTIES TIMEOUT 900)
endfunction()

# zeb_fuzz(NAME SOURCE … USES …): a program around LLVMFuzzerTestOneInput. In the fuzz preset it is
# a libFuzzer binary; in every other it replays the files of fuzz/corpus/NAME, as a test.
function(zeb_fuzz name)
  cmake_parse_arguments(FUZZ "" "SOURCE" "USES" ${ARGN})
  if(ZEB_FUZZ)
    add_executable(fuzz_${name} ${FUZZ_SOURCE})
    target_link_options(fuzz_${name} PRIVATE -fsanitize=fuzzer)
  else()
    add_executable(fuzz_${name} ${FUZZ_SOURCE} ${PROJECT_SOURCE_DIR}/fuzz/replay.cpp)
    add_test(NAME fuzz.${name} COMMAND fuzz_${name} ${PROJECT_SOURCE_DIR}/fuzz/corpus/${name})
  endif()
  target_link_libraries(fuzz_${name} PRIVATE ${FUZZ_USES})
  add_dependencies(fuzz_targets fuzz_${name})
endfunction()
