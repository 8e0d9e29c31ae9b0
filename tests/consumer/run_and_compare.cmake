# Runs PROGRAM in an empty FOLDER. The log must hold header, line and footer, and the folder nothing else.

file(REMOVE_RECURSE ${FOLDER})
file(MAKE_DIRECTORY ${FOLDER})
execute_process(COMMAND ${PROGRAM} WORKING_DIRECTORY ${FOLDER} COMMAND_ERROR_IS_FATAL ANY)

file(GLOB names RELATIVE ${FOLDER} ${FOLDER}/*)
if(NOT names STREQUAL "app.log")
  message(FATAL_ERROR "Expected app.log alone, found: ${names}")
endif()
file(READ ${FOLDER}/app.log log)
set(time "[0-9][0-9][0-9][0-9]-[0-9][0-9]-[0-9][0-9] [0-9][0-9]:[0-9][0-9]:[0-9][0-9]:[0-9][0-9][0-9]")
if(NOT log MATCHES "^Log started on : [^\n]+\n${time} - Info root - started\nLog stopped on : [^\n]+$")
  message(FATAL_ERROR "Unexpected log:\n${log}")
endif()
