# The install tree must serve a project outside this one.
#
# MODE "build": installs the freshly built library and client into a scratch prefix, then configures,
# builds and runs a consumer project that finds them with find_package(ssaopt CONFIG REQUIRED): the
# library alone, the reference client, and the complete front end of the examples, whose output must be
# the one the examples' own test expects.
# MODE "valgrind": runs every consumer that MODE "build" made under valgrind, with the module's own pool
# and with a memory controller of its own; any leak or memory error fails.
cmake_policy(VERSION 3.20)
set(prefix ${WORK_DIR}/prefix)
set(consumer_dir ${WORK_DIR}/build)
set(consumers consumer client_consumer minimal_client)
set(variants "" own-controller)

function(run)
  execute_process(COMMAND ${ARGV} RESULT_VARIABLE rc OUTPUT_VARIABLE out ERROR_VARIABLE err)
  if(NOT rc EQUAL 0)
    message(FATAL_ERROR "command failed (${rc}): ${ARGV}\n${out}\n${err}")
  endif()
endfunction()

if(MODE STREQUAL "build")
  file(REMOVE_RECURSE ${WORK_DIR})
  run(${CMAKE_COMMAND} --install ${BINARY_DIR} --prefix ${prefix})
  run(${CMAKE_COMMAND} -S ${SOURCE_DIR}/tests/install/consumer -B ${consumer_dir} -G ${GENERATOR}
      -DCMAKE_PREFIX_PATH=${prefix} -DCMAKE_BUILD_TYPE=${BUILD_TYPE}
      -DSSAOPT_EXAMPLES_DIR=${SOURCE_DIR}/examples)
  run(${CMAKE_COMMAND} --build ${consumer_dir})
  foreach(variant IN LISTS variants)
    run(${consumer_dir}/consumer ${variant})
    run(${consumer_dir}/client_consumer ${variant})
    run(${CMAKE_COMMAND} -DPROGRAM=${consumer_dir}/minimal_client -DARGS=${variant}
        -DEXPECTED=${SOURCE_DIR}/examples/minimal_client.expected
        -P ${SOURCE_DIR}/examples/check_output.cmake)
  endforeach()
elseif(MODE STREQUAL "valgrind")
  find_program(VALGRIND valgrind)
  if(NOT VALGRIND)
    message("valgrind is not installed: skipping the memory check of the consumers")
    return()
  endif()
  set(memcheck ${VALGRIND} --quiet --error-exitcode=99 --leak-check=full --show-leak-kinds=all
      --errors-for-leak-kinds=all)
  foreach(consumer IN LISTS consumers)
    foreach(variant IN LISTS variants)
      run(${memcheck} ${consumer_dir}/${consumer} ${variant})
    endforeach()
  endforeach()
else()
  message(FATAL_ERROR "unknown MODE '${MODE}'")
endif()
