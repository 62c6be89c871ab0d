# How every target of the project is compiled: the language, the warnings, the sanitizers, and
# the tools that make a build faster where the machine has them.

set(CMAKE_CXX_STANDARD 20)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_CXX_VISIBILITY_PRESET hidden)
set(CMAKE_VISIBILITY_INLINES_HIDDEN ON)
set(CMAKE_POSITION_INDEPENDENT_CODE ON)
set(CMAKE_EXPORT_COMPILE_COMMANDS ON)
set(CMAKE_LIBRARY_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/lib)
set(CMAKE_RUNTIME_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/bin)
if(NOT CMAKE_BUILD_TYPE)
  set(CMAKE_BUILD_TYPE Release)
endif()

find_package(Threads REQUIRED)

add_compile_options(-Wall -Wextra -Wpedantic -Wshadow -Wnon-virtual-dtor -Woverloaded-virtual
                    -Wcast-qual)
# Products are rounded before they are added, on each machine: compilers for processors that do both in
# one instruction would take it, and results would depend on the machine. Those of x86 do so unasked.
if(NOT CMAKE_SYSTEM_PROCESSOR MATCHES "x86_64|AMD64")
  add_compile_options(-ffp-contract=off)
endif()
if(VEXG_WERROR)
  add_compile_options(-Werror)
endif()
if(VEXG_SANITIZE)
  add_compile_options(-fsanitize=${VEXG_SANITIZE} -fno-sanitize-recover=all
                      -fno-omit-frame-pointer -g1)
  add_link_options(-fsanitize=${VEXG_SANITIZE})
  # They make g++ see accesses in std::string that there are not, and states of a std::regex that nobody
  # has set.
  add_compile_options("$<$<CXX_COMPILER_ID:GNU>:-Wno-array-bounds;-Wno-restrict;-Wno-stringop-overflow>"
                      "$<$<CXX_COMPILER_ID:GNU>:-Wno-maybe-uninitialized>")
endif()
if(VEXG_BUILD_FUZZ)
  add_compile_options(-fsanitize=fuzzer-no-link)
endif()

find_program(VEXG_CCACHE ccache)
if(VEXG_CCACHE AND NOT CMAKE_CXX_COMPILER_LAUNCHER)
  # The cache is shared between checkouts, and precompiled headers need their times ignored.
  set(CMAKE_CXX_COMPILER_LAUNCHER ${CMAKE_COMMAND} -E env CCACHE_BASEDIR=${PROJECT_SOURCE_DIR}
      CCACHE_NOHASHDIR=1 CCACHE_SLOPPINESS=pch_defines,time_macros ${VEXG_CCACHE})
endif()
find_program(VEXG_MOLD mold)
if(VEXG_MOLD AND NOT CMAKE_CROSSCOMPILING)
  add_link_options(-fuse-ld=mold)
endif()

# Nearly every source includes these: precompiled headers. They hide a header that forgets to include
# one of them; scripts/lint compiles the headers that have changed alone, and the preset "debug" all.
set(VEXG_STANDARD_HEADERS <algorithm> <cmath> <functional> <map> <memory> <mutex> <optional> <string>
    <vector>)
