# How every target of the project is compiled. Sanitizers and coverage are chosen by presets, never by hand in a target.

option(PALISADE_BENCHMARKS "Build the benchmarks" OFF)
option(PALISADE_COVERAGE "Instrument for line and branch coverage" OFF)
option(PALISADE_WERROR "Treat warnings as errors" ON)
set(PALISADE_SANITIZERS "" CACHE STRING "Sanitizers to build with, as for -fsanitize=")

set(CMAKE_CXX_STANDARD 20)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_POSITION_INDEPENDENT_CODE ON)
set(CMAKE_EXPORT_COMPILE_COMMANDS ON)

# A module exports what it marks for export; nothing else leaves it.
set(CMAKE_CXX_VISIBILITY_PRESET hidden)
set(CMAKE_VISIBILITY_INLINES_HIDDEN ON)

# A compiler cache where there is one. ccache keeps objects that use a precompiled header only when it is told that the
# header's defines and time stamps may be trusted; the header here is GoogleTest's, which uses neither.
find_program(PALISADE_CCACHE ccache)
if(PALISADE_CCACHE AND NOT DEFINED CMAKE_CXX_COMPILER_LAUNCHER)
  set(CMAKE_CXX_COMPILER_LAUNCHER ${CMAKE_COMMAND} -E env CCACHE_SLOPPINESS=pch_defines,time_macros ${PALISADE_CCACHE})
endif()

# Headers are included by their path from the top, and log records name files the same way.
include_directories(${PROJECT_SOURCE_DIR})
add_compile_options(
  -Wall -Wextra -Wpedantic -Wshadow -Wnon-virtual-dtor -Wold-style-cast -Woverloaded-virtual
  -fmacro-prefix-map=${PROJECT_SOURCE_DIR}/= -fstack-protector-strong)
# GCC 12 sees overlapping copies in joined std::strings that cannot overlap: https://gcc.gnu.org/PR105651.
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND CMAKE_CXX_COMPILER_VERSION VERSION_LESS 13)
  add_compile_options(-Wno-restrict)
endif()
add_compile_definitions($<$<CONFIG:Debug>:_GLIBCXX_ASSERTIONS>)
add_link_options(-Wl,--as-needed -Wl,-z,relro -Wl,-z,now)

# In a unity build every source is included, and GCC takes it for a header, whose types should not hold unnamed ones.
if(CMAKE_UNITY_BUILD)
  add_compile_options(-Wno-subobject-linkage)
endif()

if(PALISADE_WERROR)
  add_compile_options(-Werror)
endif()

# Line tables are all that a sanitizer's report reads, and full debug information doubles the time to compile. The thread
# sanitizer's tests repeat races many times and gain from optimisation; the other two only compile more slowly with it.
# In instrumented code GCC takes an empty std::optional's content for used: https://gcc.gnu.org/PR80635.
if(PALISADE_SANITIZERS)
  add_compile_options(-fsanitize=${PALISADE_SANITIZERS} -fno-sanitize-recover=all -fno-omit-frame-pointer -g1
    -Wno-maybe-uninitialized)
  add_link_options(-fsanitize=${PALISADE_SANITIZERS})
  if(PALISADE_SANITIZERS MATCHES "thread")
    add_compile_options(-O1)
  endif()
endif()

# Tests run many threads through the same lines; counters that are not atomic would lose counts or go backwards.
if(PALISADE_COVERAGE)
  add_compile_options(--coverage -O0 -fno-inline -fprofile-update=atomic)
  add_link_options(--coverage)
endif()

find_package(Threads REQUIRED)
