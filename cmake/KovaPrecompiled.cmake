# Headers of other makers, read once per build instead of once per source: they are most of what a compiler reads here,
# and they never change between two builds. Headers of the project are never among them, so that a change of one
# compiles only what includes it.
#
# A source still includes what it uses: `make clang` reads every source without these headers, and fails over the first
# that leans on them. Only GCC is given them; clang is there to judge, not to be quick. What is shipped does without.

option(KOVA_PRECOMPILED "Read headers of other makers once per build (GCC only)" ON)
set(KOVA_STANDARD_HEADERS <algorithm> <array> <atomic> <chrono> <functional> <map> <memory> <mutex> <optional> <ostream>
  <set> <sstream> <stdexcept> <string> <string_view> <utility> <vector>)

# kova_headers(NAME program|library HEADERS ... [LINK ...] [DEFINITIONS ...] [OPTIONS ...] [PROPERTIES ...])
# A target that holds precompiled headers.
# How a source is compiled must be how its precompiled headers were: those of programs fit no library.
function(kova_headers name kind)
  cmake_parse_arguments(ARG "" "" "HEADERS;LINK;DEFINITIONS;OPTIONS;PROPERTIES" ${ARGN})
  if(NOT KOVA_PRECOMPILED OR NOT CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
    return()
  endif()
  set(source ${CMAKE_CURRENT_BINARY_DIR}/${name}.cpp)
  file(CONFIGURE OUTPUT ${source} CONTENT "// Nothing but the precompiled headers.\n")
  add_library(${name} OBJECT EXCLUDE_FROM_ALL ${source})
  target_link_libraries(${name} PRIVATE kova::options ${ARG_LINK})
  target_compile_definitions(${name} PRIVATE ${ARG_DEFINITIONS})
  target_compile_options(${name} PRIVATE ${ARG_OPTIONS})
  if(ARG_PROPERTIES)
    set_target_properties(${name} PROPERTIES ${ARG_PROPERTIES})
  endif()
  target_precompile_headers(${name} PRIVATE ${ARG_HEADERS})
  if(kind STREQUAL "program")
    kova_compile_as_program(${name})
  endif()
endfunction()

# kova_use_headers(TARGET HEADERS): the target's sources begin with what the target HEADERS holds.
function(kova_use_headers target headers)
  if(TARGET ${headers})
    target_precompile_headers(${target} REUSE_FROM ${headers})
    target_compile_options(${target} PRIVATE -fpch-preprocess)  # the compiler cache asks for it
    # GCC 12 does not keep with precompiled headers where it had silenced itself in them, and finds a std::string's own
    # buffer too small. `make shipped` has these warnings of everything that is shipped.
    target_compile_options(${target} PRIVATE -Wno-array-bounds -Wno-stringop-overflow)
  endif()
endfunction()

# kova_compile_as_program(TARGET): a library that only programs link, compiled as they are.
function(kova_compile_as_program target)
  set_target_properties(${target} PROPERTIES POSITION_INDEPENDENT_CODE OFF)
  target_compile_options(${target} PRIVATE ${CMAKE_CXX_COMPILE_OPTIONS_PIE})
endfunction()

kova_headers(kova_library_headers library HEADERS ${KOVA_STANDARD_HEADERS})

find_package(CLI11 REQUIRED)
kova_headers(kova_command_line_headers program HEADERS <CLI/CLI.hpp> ${KOVA_STANDARD_HEADERS} LINK CLI11::CLI11)

# Tests have nothing to be read for but what they say, so they are compiled quickly. What they read is so much more
# than what they hold that the compiler had better not look for memory to free.
find_package(GTest REQUIRED)
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
  list(APPEND KOVA_TEST_OPTIONS --param=ggc-min-heapsize=524288)
endif()
kova_headers(kova_test_headers program HEADERS <gmock/gmock.h> <gtest/gtest.h> ${KOVA_STANDARD_HEADERS}
  LINK GTest::gmock OPTIONS ${KOVA_TEST_OPTIONS})
