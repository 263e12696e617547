# The few kinds of target the project has, so that each folder's CMakeLists.txt names only its own.

# kova_library(NAME SHARED|STATIC|OBJECT SOURCES ... [LINK ...] [PRIVATE_LINK ...] [HEADERS precompiled])
function(kova_library name kind)
  cmake_parse_arguments(ARG "" "HEADERS" "SOURCES;LINK;PRIVATE_LINK" ${ARGN})
  add_library(${name} ${kind} ${ARG_SOURCES})
  target_link_libraries(${name} PUBLIC kova::options ${ARG_LINK} PRIVATE ${ARG_PRIVATE_LINK})
  if(NOT ARG_HEADERS)
    set(ARG_HEADERS kova_library_headers)
  endif()
  kova_use_headers(${name} ${ARG_HEADERS})
  if(kind STREQUAL "SHARED")
    set_target_properties(${name} PROPERTIES VERSION ${PROJECT_VERSION} SOVERSION ${PROJECT_VERSION_MAJOR})
    if(NOT KOVA_SANITIZE)  # the sanitizers' own symbols come with the program
      target_link_options(${name} PRIVATE -Wl,--no-undefined)
    endif()
    install(TARGETS ${name} LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR} NAMELINK_SKIP)
  endif()
endfunction()

# kova_test_program(NAME SOURCES ... [LINK ...]): tests in one executable, which somebody else runs than ctest.
function(kova_test_program name)
  cmake_parse_arguments(ARG "" "" "SOURCES;LINK" ${ARGN})
  add_executable(${name} ${ARG_SOURCES})
  target_link_libraries(${name} PRIVATE kova::options ${ARG_LINK} GTest::gmock GTest::gtest_main)
  target_compile_options(${name} PRIVATE ${KOVA_TEST_OPTIONS})
  kova_use_headers(${name} kova_test_headers)
  set_target_properties(${name} PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/test)
endfunction()

# kova_test(NAME LABEL unit|contract|integration|abi|e2e SOURCES ... [LINK ...] [TIMEOUT seconds])
# One executable; every TEST in it is one test of ctest.
function(kova_test name)
  cmake_parse_arguments(ARG "" "LABEL;TIMEOUT" "SOURCES;LINK" ${ARGN})
  include(GoogleTest)
  if(NOT ARG_TIMEOUT)
    set(ARG_TIMEOUT 300)
  endif()
  kova_test_program(${name} SOURCES ${ARG_SOURCES} LINK ${ARG_LINK})
  gtest_discover_tests(${name} DISCOVERY_MODE PRE_TEST PROPERTIES LABELS ${ARG_LABEL} TIMEOUT ${ARG_TIMEOUT})
endfunction()

# kova_test_library(NAME STATIC|OBJECT SOURCES ... [LINK ...]): what tests share. Only test programs link it, so it is
# compiled as they are.
function(kova_test_library name kind)
  kova_library(${name} ${kind} ${ARGN} HEADERS kova_test_headers)
  target_compile_options(${name} PRIVATE ${KOVA_TEST_OPTIONS})
  kova_compile_as_program(${name})
endfunction()
