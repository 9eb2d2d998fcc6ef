# Writes OUTPUT, a header defining SSAOPT_GIT_DESCRIPTION as `git describe` gives it for SOURCE_DIR
# (empty outside a git checkout or without git). The file is rewritten only when the description
# changes, so a build without new commits compiles nothing again.
find_package(Git QUIET)
set(description "")
if(GIT_FOUND AND EXISTS "${SOURCE_DIR}/.git")
  execute_process(
    COMMAND "${GIT_EXECUTABLE}" describe --tags --always --dirty
    WORKING_DIRECTORY "${SOURCE_DIR}"
    OUTPUT_VARIABLE description
    OUTPUT_STRIP_TRAILING_WHITESPACE
    ERROR_QUIET
    RESULT_VARIABLE status)
  if(NOT status EQUAL 0)
    set(description "")
  endif()
endif()
set(text "#define SSAOPT_GIT_DESCRIPTION \"${description}\"\n")
if(EXISTS "${OUTPUT}")
  file(READ "${OUTPUT}" previous)
endif()
if(NOT previous STREQUAL text)
  file(WRITE "${OUTPUT}" "${text}")
endif()
