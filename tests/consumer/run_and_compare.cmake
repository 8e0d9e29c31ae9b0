# Runs PROGRAM in an empty FOLDER. The log must hold header, a line for each of MESSAGES and footer, and the folder
# nothing else.

file(REMOVE_RECURSE ${FOLDER})
file(MAKE_DIRECTORY ${FOLDER})
execute_process(COMMAND ${PROGRAM} WORKING_DIRECTORY ${FOLDER} COMMAND_ERROR_IS_FATAL ANY)

file(GLOB names RELATIVE ${FOLDER} ${FOLDER}/*)
if(NOT names STREQUAL "app.log")
  message(FATAL_ERROR "Expected app.log alone, found: ${names}")
endif()
file(READ ${FOLDER}/app.log log)
set(time "[0-9][0-9][0-9][0-9]-[0-9][0-9]-[0-9][0-9] [0-9][0-9]:[0-9][0-9]:[0-9][0-9]:[0-9][0-9][0-9]")
list(TRANSFORM MESSAGES REPLACE "(.+)" "${time} - Info root - \\1\n" OUTPUT_VARIABLE lines)
list(JOIN lines "" lines)
if(NOT log MATCHES "^Log started on : [^\n]+\n${lines}Log stopped on : [^\n]+$")
  message(FATAL_ERROR "Unexpected log:\n${log}")
endif()
