# Installs the library of BUILD into empty folders below WORK and tests hosts that are built against it: once below a
# prefix that it wasn't configured with, once with folders outside of any prefix.

function(run)
  execute_process(COMMAND ${ARGV} COMMAND_ECHO STDOUT COMMAND_ERROR_IS_FATAL ANY)
endfunction()

function(test_hosts name libdir)
  set(ENV{PKG_CONFIG_PATH} ${libdir}/pkgconfig)
  run(${CMAKE_COMMAND} -S ${CMAKE_CURRENT_LIST_DIR} -B ${WORK}/${name} -G ${GENERATOR} -DCMAKE_CXX_COMPILER=${COMPILER}
    -DSHARED=${SHARED} -DrZqCommon_DIR=${libdir}/cmake/rZqCommon)
  run(${CMAKE_COMMAND} --build ${WORK}/${name})
  run(${CMAKE_CTEST_COMMAND} --test-dir ${WORK}/${name} --output-on-failure --no-tests=error)
endfunction()

file(REMOVE_RECURSE ${WORK})
run(${CMAKE_COMMAND} --install ${BUILD} --prefix ${WORK}/prefix)
if(NOT CONFIG STREQUAL "Debug")
  execute_process(COMMAND grep -rlF -e ${SOURCE}/ -e ${BUILD}/ ${WORK}/prefix OUTPUT_VARIABLE named)
  if(named)
    message(FATAL_ERROR "Installed files name the folder they were built in:\n${named}")
  endif()
endif()
test_hosts(moved ${WORK}/prefix/${LIBDIR})

# Configured anew, not built anew. What is installed into a folder of the source tree has to be told relatively.
execute_process(COMMAND mktemp -d OUTPUT_VARIABLE outside OUTPUT_STRIP_TRAILING_WHITESPACE COMMAND_ERROR_IS_FATAL ANY)
run(${CMAKE_COMMAND} -S ${SOURCE} -B ${WORK}/configured -G ${GENERATOR} -DCMAKE_CXX_COMPILER=${COMPILER}
  -DBUILD_SHARED_LIBS=${SHARED} -DZQ_TESTS=OFF -DZQ_TOOLS=OFF -DCMAKE_INSTALL_PREFIX=${WORK}/nothing
  -DCMAKE_INSTALL_LIBDIR=${outside}/libraries -DCMAKE_INSTALL_INCLUDEDIR=${outside}/headers)
file(GLOB library ${BUILD}/librZqCommon.*)
file(COPY ${library} DESTINATION ${WORK}/configured)
run(${CMAKE_COMMAND} --install ${WORK}/configured)
if(EXISTS ${WORK}/nothing)
  message(FATAL_ERROR "Files lie below the prefix, though each has a folder of its own")
endif()
test_hosts(absolute ${outside}/libraries)
file(REMOVE_RECURSE ${outside})
