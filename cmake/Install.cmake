# The installed package. Components: runtime (the shared libraries), development (headers, CMake package, pkg-config
# file) and programs.
include(CMakePackageConfigHelpers)

set(VLSERVICE_CMAKE_DIR ${CMAKE_INSTALL_LIBDIR}/cmake/VLService)
set(VLSERVICE_PC_DIR ${CMAKE_INSTALL_LIBDIR}/pkgconfig)

install(TARGETS vlservice_platform VLService EXPORT VLServiceTargets
    LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT runtime NAMELINK_COMPONENT development
    FILE_SET HEADERS DESTINATION ${CMAKE_INSTALL_INCLUDEDIR} COMPONENT development)
install(EXPORT VLServiceTargets NAMESPACE VLService:: DESTINATION ${VLSERVICE_CMAKE_DIR} COMPONENT development)

configure_package_config_file(${CMAKE_CURRENT_LIST_DIR}/VLServiceConfig.cmake.in VLServiceConfig.cmake
    INSTALL_DESTINATION ${VLSERVICE_CMAKE_DIR})
write_basic_package_version_file(VLServiceConfigVersion.cmake COMPATIBILITY SameMinorVersion)

# Relative, so that the package works wherever `cmake --install --prefix` puts it.
file(RELATIVE_PATH VLSERVICE_PC_TO_PREFIX ${CMAKE_INSTALL_PREFIX}/${VLSERVICE_PC_DIR} ${CMAKE_INSTALL_PREFIX})
configure_file(${CMAKE_CURRENT_LIST_DIR}/vlservice.pc.in vlservice.pc @ONLY)

install(FILES ${CMAKE_CURRENT_BINARY_DIR}/VLServiceConfig.cmake ${CMAKE_CURRENT_BINARY_DIR}/VLServiceConfigVersion.cmake
    DESTINATION ${VLSERVICE_CMAKE_DIR} COMPONENT development)
install(FILES ${CMAKE_CURRENT_BINARY_DIR}/vlservice.pc DESTINATION ${VLSERVICE_PC_DIR} COMPONENT development)
