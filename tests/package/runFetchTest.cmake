# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
#
# Builds the project in fetched/, which takes the library from SOURCE_DIR into its own build below WORK_DIR, and runs it. CXX
# is the compiler, LAUNCHER what it is called through, if anything.

function(run)
  execute_process(COMMAND ${ARGV} COMMAND_ECHO STDOUT COMMAND_ERROR_IS_FATAL ANY)
endfunction()

file(REMOVE_RECURSE "${WORK_DIR}")
run("${CMAKE_COMMAND}" -S "${CMAKE_CURRENT_LIST_DIR}/fetched" -B "${WORK_DIR}" -G Ninja
  "-DCMAKE_CXX_COMPILER=${CXX}" "-DCMAKE_CXX_COMPILER_LAUNCHER=${LAUNCHER}" -DCMAKE_BUILD_TYPE=Release
  -DFETCHCONTENT_FULLY_DISCONNECTED=ON "-DFETCHCONTENT_SOURCE_DIR_QUORLIN=${SOURCE_DIR}")
run("${CMAKE_COMMAND}" --build "${WORK_DIR}" --target consumer)
run("${WORK_DIR}/consumer")
