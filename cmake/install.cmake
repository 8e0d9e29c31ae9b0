include(CMakePackageConfigHelpers)

set(package_folder ${CMAKE_INSTALL_LIBDIR}/cmake/rZqCommon)

install(TARGETS rZqCommon EXPORT rZqCommonTargets INCLUDES DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/rZqCommon)
if(BUILD_SHARED_LIBS)
  install(FILES ${messages} RENAME 1
    DESTINATION ${CMAKE_INSTALL_LIBDIR}/$<TARGET_SONAME_FILE_NAME:rZqCommon>.resources/11)
endif()
install(DIRECTORY common runtime DESTINATION ${CMAKE_INSTALL_INCLUDEDIR}/rZqCommon
  FILES_MATCHING PATTERN *.h PATTERN runtime/linux EXCLUDE)
install(EXPORT rZqCommonTargets NAMESPACE rZqCommon:: DESTINATION ${package_folder})

# Who links the library statically links what stands below it, too, and needs that installed; nobody else does.
if(NOT BUILD_SHARED_LIBS)
  string(CONCAT package_dependencies "include(CMakeFindDependencyMacro)\n"
    "find_dependency(ICU COMPONENTS uc)\nfind_dependency(ZLIB)\nfind_dependency(Threads)\n")
  set(pc_requires_private "icu-uc zlib")
  set(pc_libs_private ${CMAKE_THREAD_LIBS_INIT} ${CMAKE_DL_LIBS})
  list(TRANSFORM pc_libs_private REPLACE "^([^-].*)" "-l\\1")
  list(JOIN pc_libs_private " " pc_libs_private)
endif()

configure_package_config_file(cmake/rZqCommonConfig.cmake.in ${PROJECT_BINARY_DIR}/rZqCommonConfig.cmake
  INSTALL_DESTINATION ${package_folder} NO_SET_AND_CHECK_MACRO)
write_basic_package_version_file(${PROJECT_BINARY_DIR}/rZqCommonConfigVersion.cmake COMPATIBILITY ${abi_compatibility})
install(FILES ${PROJECT_BINARY_DIR}/rZqCommonConfig.cmake ${PROJECT_BINARY_DIR}/rZqCommonConfigVersion.cmake
  DESTINATION ${package_folder})

# A relative folder lies below the prefix and the .pc file tells the way up to that, so that an installed tree may be
# moved; an absolute one stands as it is.
foreach(kind IN ITEMS LIBDIR INCLUDEDIR)
  set(pc_${kind} ${CMAKE_INSTALL_${kind}})
  if(NOT IS_ABSOLUTE ${pc_${kind}})
    string(PREPEND pc_${kind} "\${prefix}/")
  endif()
endforeach()
set(pc_prefix ${CMAKE_INSTALL_PREFIX})
if(NOT IS_ABSOLUTE ${CMAKE_INSTALL_LIBDIR})
  cmake_path(RELATIVE_PATH pc_prefix BASE_DIRECTORY ${CMAKE_INSTALL_FULL_LIBDIR}/pkgconfig)
  string(PREPEND pc_prefix "\${pcfiledir}/")
endif()
configure_file(packaging/rZqCommon.pc.in ${PROJECT_BINARY_DIR}/rZqCommon.pc @ONLY)
install(FILES ${PROJECT_BINARY_DIR}/rZqCommon.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
