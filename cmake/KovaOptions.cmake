# What every target of the project is compiled with. Targets take it by linking kova::options.

option(KOVA_WERROR "Treat warnings as errors" OFF)
option(KOVA_BENCHMARKS "Build the benchmarks" ON)
option(KOVA_FUZZ "Build the fuzz targets (clang only)" OFF)
set(KOVA_SANITIZE "" CACHE STRING "Sanitizers, as for -fsanitize=, or empty")
set(KOVA_TEST_OPTIONS "" CACHE STRING "What the sources of tests are compiled with besides")

if(NOT CMAKE_BUILD_TYPE)
  set(CMAKE_BUILD_TYPE RelWithDebInfo CACHE STRING "" FORCE)
endif()

set(CMAKE_CXX_STANDARD 20)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_POSITION_INDEPENDENT_CODE ON)
set(CMAKE_EXPORT_COMPILE_COMMANDS ON)

set(CMAKE_RUNTIME_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/bin)
set(CMAKE_LIBRARY_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/lib)
set(CMAKE_ARCHIVE_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/lib)
set(CMAKE_INSTALL_RPATH "$ORIGIN/../${CMAKE_INSTALL_LIBDIR}" "$ORIGIN")

# With precompiled headers the compiler cache has to be told to trust what the compiler itself checks.
find_program(KOVA_CCACHE ccache)
if(KOVA_CCACHE)
  set(CMAKE_CXX_COMPILER_LAUNCHER env CCACHE_SLOPPINESS=pch_defines,time_macros ${KOVA_CCACHE})
endif()

add_library(kova_options INTERFACE)
add_library(kova::options ALIAS kova_options)
target_include_directories(kova_options INTERFACE ${PROJECT_SOURCE_DIR} ${PROJECT_BINARY_DIR}/generated)
target_compile_options(kova_options INTERFACE -Wall -Wextra -Wpedantic -Wshadow -Wnon-virtual-dtor
  -Woverloaded-virtual -Wcast-align -Wimplicit-fallthrough -Wold-style-cast)
if(KOVA_WERROR)
  target_compile_options(kova_options INTERFACE -Werror)
endif()
if(KOVA_SANITIZE)
  target_compile_options(kova_options INTERFACE -fsanitize=${KOVA_SANITIZE} -fno-omit-frame-pointer
    -fno-sanitize-recover=all)
  target_link_options(kova_options INTERFACE -fsanitize=${KOVA_SANITIZE})
endif()

find_package(Threads REQUIRED)
