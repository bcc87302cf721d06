# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
#
# Installs the build tree BUILD_DIR below WORK_DIR and builds the project beside this script twice against what was
# installed: with find_package and with pkg-config. Both programs have to run. CXX is the compiler.

set(prefix "${WORK_DIR}/prefix")

function(run)
  execute_process(COMMAND ${ARGV} COMMAND_ECHO STDOUT COMMAND_ERROR_IS_FATAL ANY)
endfunction()

file(REMOVE_RECURSE "${WORK_DIR}")
run("${CMAKE_COMMAND}" --install "${BUILD_DIR}" --prefix "${prefix}")

run("${CMAKE_COMMAND}" -S "${CMAKE_CURRENT_LIST_DIR}" -B "${WORK_DIR}/build" -G Ninja
  "-DCMAKE_PREFIX_PATH=${prefix}" "-DCMAKE_CXX_COMPILER=${CXX}")
run("${CMAKE_COMMAND}" --build "${WORK_DIR}/build")
run("${WORK_DIR}/build/consumer")

set(ENV{PKG_CONFIG_PATH} "${prefix}/${LIBDIR}/pkgconfig")
execute_process(
  COMMAND pkg-config --cflags --libs quorlin pelmar
  OUTPUT_VARIABLE flags OUTPUT_STRIP_TRAILING_WHITESPACE COMMAND_ECHO STDOUT COMMAND_ERROR_IS_FATAL ANY)
separate_arguments(flags UNIX_COMMAND "${flags}")
run("${CXX}" -std=c++11 "${CMAKE_CURRENT_LIST_DIR}/consumer.cpp" -o "${WORK_DIR}/consumer" ${flags}
  "-Wl,-rpath,${prefix}/${LIBDIR}")
run("${WORK_DIR}/consumer")

# The tool finds the libraries it was installed with.
if(EXISTS "${prefix}/bin/quorlin")
  run("${prefix}/bin/quorlin" --help)
endif()
