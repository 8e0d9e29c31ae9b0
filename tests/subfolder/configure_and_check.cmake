# Configures the host of this folder below WORK: it must stay as it is, and the library takes its flags and adds no
# warnings. Nothing is built, an installation that would copy a file fails for want of it.

function(configure name kind)  # ... further arguments
  set(folder ${WORK}/${name})
  execute_process(COMMAND ${CMAKE_COMMAND} -S ${CMAKE_CURRENT_LIST_DIR} -B ${folder} -G ${GENERATOR} -DSOURCE=${SOURCE}
    -DKIND=${kind} -DCMAKE_CXX_COMPILER=${COMPILER} "-DCMAKE_CXX_FLAGS=-Werror -Wunused" ${ARGN}
    COMMAND_ERROR_IS_FATAL ANY)
  execute_process(COMMAND ${CMAKE_COMMAND} --install ${folder} --prefix ${folder}/prefix COMMAND_ERROR_IS_FATAL ANY)
  if(EXISTS ${folder}/prefix)
    message(FATAL_ERROR "The library installs files of its own accord")
  endif()
  file(READ ${folder}/compile_commands.json commands)
  string(REGEX MATCHALL " -W[a-z][a-z-]*" warnings "${commands}")
  list(REMOVE_DUPLICATES warnings)
  if(NOT warnings STREQUAL " -Werror; -Wunused")
    message(FATAL_ERROR "Warnings are not the host's alone:${warnings}")
  endif()
endfunction()

file(REMOVE_RECURSE ${WORK})
configure(shared SHARED_LIBRARY)
configure(static STATIC_LIBRARY -DBUILD_SHARED_LIBS=OFF -DEXCLUDE=EXCLUDE_FROM_ALL)
