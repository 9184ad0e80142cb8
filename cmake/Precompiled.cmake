# What nearly every source includes, compiled once. Only headers of others are in here: a header of the project has to
# include what it needs, and a change in one does not rebuild everything. Not for optimised builds (the preset "release"):
# inlined from a precompiled header, what is a system's is warned about like ours.

set(VLSERVICE_COMMON_HEADERS
    <algorithm> <chrono> <filesystem> <functional> <map> <memory> <optional> <ostream> <sstream> <stdexcept> <string>
    <string_view> <tuple> <utility> <vector> <jansson.h>)

# What is costly in sources with sockets; goes behind the common headers, whose <utility> Asio needs.
set(VLSERVICE_ASIO_HEADERS
    <boost/asio/buffer.hpp> <boost/asio/connect.hpp> <boost/asio/io_context.hpp> <boost/asio/ip/tcp.hpp>
    <boost/asio/post.hpp> <boost/asio/ssl/stream.hpp> <boost/asio/steady_timer.hpp> <boost/asio/write.hpp>)

# vlservice_precompile(NAME [PIC] HEADERS...) makes a set of headers; its users are built alike.
function(vlservice_precompile name)
    cmake_parse_arguments(ARG "PIC" "" "HEADERS" ${ARGN})
    set(source ${PROJECT_BINARY_DIR}/${name}.cpp)
    file(GENERATE OUTPUT ${source} CONTENT "")
    add_library(${name} OBJECT ${source})
    set_target_properties(${name} PROPERTIES POSITION_INDEPENDENT_CODE ${ARG_PIC} CXX_CLANG_TIDY "")
    target_compile_features(${name} PRIVATE cxx_std_20)
    target_precompile_headers(${name} PRIVATE ${ARG_HEADERS})
    target_link_libraries(${name} PRIVATE vlservice_warnings)
endfunction()

vlservice_precompile(vlservice_precompiled PIC HEADERS ${VLSERVICE_COMMON_HEADERS})

# Has an executable use the libraries' set, for which it has to be position independent as they are.
function(vlservice_use_precompiled name)
    set_target_properties(${name} PROPERTIES POSITION_INDEPENDENT_CODE OFF)
    target_compile_options(${name} PRIVATE -fPIC)
    target_precompile_headers(${name} REUSE_FROM vlservice_precompiled)
endfunction()
