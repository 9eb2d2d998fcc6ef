# Runs PROGRAM with ARGS and checks that it succeeds, reports nothing on standard error (the library's
# reports go there) and prints exactly the text of the file EXPECTED.
#
#   cmake -DPROGRAM=<path> "-DARGS=<arg>;<arg>" -DEXPECTED=<file> -P check_output.cmake
cmake_policy(VERSION 3.20)
execute_process(COMMAND ${PROGRAM} ${ARGS} RESULT_VARIABLE rc OUTPUT_VARIABLE out ERROR_VARIABLE err)
if(NOT rc EQUAL 0)
  message(FATAL_ERROR "${PROGRAM} ${ARGS} failed (${rc}):\n${out}\n${err}")
endif()
if(NOT err STREQUAL "")
  message(FATAL_ERROR "${PROGRAM} ${ARGS} reported:\n${err}")
endif()
file(READ ${EXPECTED} expected)
if(NOT out STREQUAL expected)
  message(FATAL_ERROR "${PROGRAM} ${ARGS} printed\n${out}\ninstead of\n${expected}")
endif()
