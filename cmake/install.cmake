include(CMakePackageConfigHelpers)

set(package_folder ${CMAKE_INSTALL_LIBDIR}/cmake/rZqCommon)

install(TARGETS rZqCommon EXPORT rZqCommonTargets
  FILE_SET HEADERS DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/rZqCommon)
install(EXPORT rZqCommonTargets NAMESPACE rZqCommon:: DESTINATION ${package_folder})

configure_package_config_file(cmake/rZqCommonConfig.cmake.in ${PROJECT_BINARY_DIR}/rZqCommonConfig.cmake
  INSTALL_DESTINATION ${package_folder} NO_SET_AND_CHECK_MACRO)
write_basic_package_version_file(${PROJECT_BINARY_DIR}/rZqCommonConfigVersion.cmake COMPATIBILITY ${abi_compatibility})
install(FILES ${PROJECT_BINARY_DIR}/rZqCommonConfig.cmake ${PROJECT_BINARY_DIR}/rZqCommonConfigVersion.cmake
  DESTINATION ${package_folder})

# The way from the .pc file up to the prefix, so that an installed tree may be moved.
set(pc_to_prefix ${CMAKE_INSTALL_PREFIX})
cmake_path(RELATIVE_PATH pc_to_prefix BASE_DIRECTORY ${CMAKE_INSTALL_FULL_LIBDIR}/pkgconfig)
configure_file(packaging/rZqCommon.pc.in ${PROJECT_BINARY_DIR}/rZqCommon.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/rZqCommon.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
