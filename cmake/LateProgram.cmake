# Programs that load some of their libraries when they call them first, and start in a fraction of the time.

# vlservice_add_late_program(NAME SOURCES... LIBS... LATE FILES...): an executable; of the shared libraries in LATE none is
# loaded before one of its functions is called. The program is linked as usual first, under the name NAME_at_once, which
# tells what it calls; for these functions calls are written (programs/base/late_calls.h), so that nothing is left for the
# linker to look for in the libraries. A library that the program takes data of stays one that is loaded at the start.
#
# The calls are written for one processor, and a sanitizer has to see every library when it starts.
set(VLSERVICE_LATE_CALLS OFF)
if(CMAKE_SYSTEM_PROCESSOR STREQUAL "x86_64" AND NOT VLSERVICE_SANITIZE)
    set(VLSERVICE_LATE_CALLS ON)
endif()

function(vlservice_add_late_program name)
    cmake_parse_arguments(ARG "" "" "SOURCES;LIBS;LATE" ${ARGN})
    add_executable(${name} ${ARG_SOURCES})
    target_link_libraries(${name} PRIVATE ${ARG_LIBS} vlservice_warnings)
    if(NOT VLSERVICE_LATE_CALLS)
        return()
    endif()
    add_executable(${name}_at_once ${ARG_SOURCES})
    target_link_libraries(${name}_at_once PRIVATE ${ARG_LIBS} vlservice_warnings)
    target_link_options(${name}_at_once PRIVATE -Wl,-s)
    # It is never run; what looks for its libraries is to find the packages that have them.
    set_target_properties(${name}_at_once PROPERTIES SKIP_BUILD_RPATH ON)
    set(calls ${CMAKE_CURRENT_BINARY_DIR}/${name}_late_calls.cpp)
    list(JOIN ARG_LATE "," libraries)
    add_custom_command(OUTPUT ${calls}
        COMMAND ${CMAKE_COMMAND} -DPROGRAM=$<TARGET_FILE:${name}_at_once> "-DLIBRARIES=${libraries}" -DOUT=${calls}
            -DNM=${CMAKE_NM} -DOBJDUMP=${CMAKE_OBJDUMP} -P ${PROJECT_SOURCE_DIR}/cmake/WriteLateCalls.cmake
        DEPENDS ${name}_at_once ${PROJECT_SOURCE_DIR}/cmake/WriteLateCalls.cmake VERBATIM)
    target_sources(${name} PRIVATE ${calls})
    target_link_libraries(${name} PRIVATE VLService::base)
    target_link_options(${name} PRIVATE -Wl,--as-needed)
endfunction()
