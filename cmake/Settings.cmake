# Language, warnings, sanitizers and caches: everything that is the same for every target.
set(CMAKE_CXX_STANDARD 20)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_POSITION_INDEPENDENT_CODE ON)

set(CMAKE_CXX_FLAGS_DEV "-O1 -g1" CACHE STRING "Flags of the Dev build type" FORCE)
# Hardened as the distribution's own packages are: pages and downloads come from anywhere.
set(CMAKE_CXX_FLAGS_RELEASE "-O2 -DNDEBUG -D_FORTIFY_SOURCE=2 -fstack-protector-strong"
    CACHE STRING "Flags of the Release build type" FORCE)
add_link_options($<$<CONFIG:Release>:LINKER:-z,relro,-z,now>)

set(ZEB_SANITIZE "" CACHE STRING "Value for -fsanitize, empty for none")
option(ZEB_FUZZ "Link fuzz targets with libFuzzer instead of the corpus replayer" OFF)

find_program(ZEB_CCACHE ccache)
if(ZEB_CCACHE)
  # Where a build lies makes no difference to what comes out, so presets and clones share results.
  set(CMAKE_CXX_COMPILER_LAUNCHER ${CMAKE_COMMAND} -E env CCACHE_NOHASHDIR=1
      CCACHE_BASEDIR=${PROJECT_SOURCE_DIR} CCACHE_SLOPPINESS=pch_defines,time_macros ${ZEB_CCACHE})
endif()

add_compile_options(-Wall -Wextra -Wpedantic -Wshadow -Wconversion -Wnon-virtual-dtor
                    -Woverloaded-virtual -Wimplicit-fallthrough -Werror)
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
  # g++ 12 reports these inside the standard library for correct code.
  add_compile_options(-Wno-error=stringop-overflow -Wno-error=array-bounds -Wno-error=restrict
                      -Wno-error=maybe-uninitialized -Wno-error=dangling-pointer)
endif()
if(CMAKE_CXX_COMPILER_ID MATCHES "Clang")
  add_compile_options(-Wthread-safety -Wthread-safety-beta)
endif()
if(ZEB_SANITIZE)
  add_compile_options(-fsanitize=${ZEB_SANITIZE} -fno-omit-frame-pointer)
  add_link_options(-fsanitize=${ZEB_SANITIZE})
  if(ZEB_SANITIZE MATCHES "undefined")
    add_compile_options(-fno-sanitize-recover=undefined)
  endif()
endif()
