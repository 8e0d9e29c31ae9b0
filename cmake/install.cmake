include(CMakePackageConfigHelpers)

set(package_folder ${CMAKE_INSTALL_LIBDIR}/cmake/rZqCommon)

install(TARGETS rZqCommon EXPORT rZqCommonTargets
  FILE_SET HEADERS DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/rZqCommon)
install(EXPORT rZqCommonTargets NAMESPACE rZqCommon:: DESTINATION ${package_folder})

# Who links the library statically links what stands below it, too, and needs that installed; nobody else does.
if(NOT BUILD_SHARED_LIBS)
  set(package_dependencies "include(CMakeFindDependencyMacro)\nfind_dependency(ICU COMPONENTS uc)\nfind_dependency(Threads)\n")
  set(pc_requires_private icu-uc)
  set(pc_libs_private ${CMAKE_THREAD_LIBS_INIT} ${CMAKE_DL_LIBS})
  list(TRANSFORM pc_libs_private REPLACE "^([^-].*)" "-l\\1")
  list(JOIN pc_libs_private " " pc_libs_private)
endif()

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
