# Warnings, sanitizers and the compiler cache, the same for every target of the project.

find_program(CCACHE_PROGRAM ccache)
if(CCACHE_PROGRAM AND NOT CMAKE_CXX_COMPILER_LAUNCHER)
    # Without these the cache takes no source that uses precompiled headers.
    set(CMAKE_CXX_COMPILER_LAUNCHER
        ${CMAKE_COMMAND} -E env CCACHE_SLOPPINESS=pch_defines,time_macros ${CCACHE_PROGRAM})
endif()

# What is built while developing is linked some sixty times; lld takes a quarter of the time. What is released comes from
# the system's linker.
find_program(LLD_PROGRAM ld.lld)
if(LLD_PROGRAM AND CMAKE_BUILD_TYPE STREQUAL "Debug")
    add_link_options(-fuse-ld=lld)
endif()

# A debug build is short of time sooner than of memory: g++ collects its garbage once there are 512 MiB of it, in kB here.
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND CMAKE_BUILD_TYPE STREQUAL "Debug")
    add_compile_options(--param=ggc-min-heapsize=524288)
endif()

set(VLSERVICE_SANITIZE "" CACHE STRING "Sanitizers to build with, as -fsanitize= takes them")
if(VLSERVICE_SANITIZE)
    add_compile_options(-fsanitize=${VLSERVICE_SANITIZE} -fno-sanitize-recover=all -fno-omit-frame-pointer)
    add_link_options(-fsanitize=${VLSERVICE_SANITIZE})
endif()

option(VLSERVICE_COVERAGE "Instrument for coverage" OFF)
if(VLSERVICE_COVERAGE)
    add_compile_options(--coverage)
    add_link_options(--coverage)
endif()

# Only our own targets are warned about; what find_package brings is a system include.
add_library(vlservice_warnings INTERFACE)
target_compile_options(vlservice_warnings INTERFACE -Wall -Wextra -Wpedantic -Wshadow -Wnon-virtual-dtor
    -Woverloaded-virtual -Wcast-align)
if(VLSERVICE_SANITIZE AND CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
    # The instrumentation makes g++ see uninitialised values where there are none.
    target_compile_options(vlservice_warnings INTERFACE -Wno-maybe-uninitialized)
endif()
if(CMAKE_CXX_COMPILER_ID STREQUAL "Clang")
    target_compile_options(vlservice_warnings INTERFACE -Wreserved-identifier)
endif()
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND CMAKE_CXX_COMPILER_VERSION VERSION_LESS 13)
    # Optimising, g++ 12 takes `"literal" + text` for a copy between overlapping blocks.
    target_compile_options(vlservice_warnings INTERFACE -Wno-restrict)
endif()
