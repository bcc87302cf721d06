# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
#
# A dependency that is too old stops the configuration, one that is newer than any that was tested is told, and all others are
# taken without a word. SOURCE_DIR is the project's folder.

# Checking this version of OpenSSL has to end so (0: accepted), with this text.
function(expect version result text)
  set(script "${CMAKE_CURRENT_BINARY_DIR}/dependency.cmake")
  file(WRITE "${script}" "include(\"${SOURCE_DIR}/cmake/QuorlinDependencies.cmake\")
    set(QUORLIN_OpenSSL_MINIMUM 3.0)\nset(QUORLIN_OpenSSL_TESTED 3.2)\nquorlin_check_version(OpenSSL ${version})\n")
  execute_process(COMMAND "${CMAKE_COMMAND}" -P "${script}"
    RESULT_VARIABLE actual OUTPUT_VARIABLE output ERROR_VARIABLE errors)
  string(REGEX REPLACE "[ \n]+" " " output "${output}${errors}")
  string(FIND "${output}" "${text}" found)
  if(NOT actual EQUAL result OR found EQUAL -1 OR (text STREQUAL "" AND NOT output STREQUAL ""))
    message(FATAL_ERROR "OpenSSL ${version} gave ${actual}: ${output}")
  endif()
endfunction()

expect(2.9.9 1 "OpenSSL 2.9.9 is too old: 3.0 or newer is needed.")
expect(3.0 0 "")
expect(3.0.17 0 "")
expect(3.2.99 0 "")
expect(3.3.0 0 "OpenSSL 3.3.0 is newer than any that was tested (3.2).")
expect(4 0 "OpenSSL 4 is newer than any that was tested (3.2).")
