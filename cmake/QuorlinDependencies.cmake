# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
#
# What this project stands on, in which versions: "<name> <minimum> <tested>", where <tested> is the newest series of
# versions with which all tests have passed. An older version than the minimum is an error; a newer one than the tested is
# told and taken. docs/building.md repeats the table for people, and a test compares the two.

set(QUORLIN_DEPENDENCIES
  "Boost 1.74 1.74"
  "EXPAT 2.4 2.5"
  "OpenSSL 3.0 3.0"
  "CURL 7.87 7.88"
  "krb5-gssapi 1.18 1.20"
  "CLI11 2.1 2.1"
  "nlohmann_json 3.11 3.11"
  "GTest 1.12 1.12"
  "Python3 3.10 3.11")

# Sets QUORLIN_<name>_MINIMUM and QUORLIN_<name>_TESTED.
foreach(row IN LISTS QUORLIN_DEPENDENCIES)
  separate_arguments(row UNIX_COMMAND "${row}")
  list(GET row 0 name)
  list(GET row 1 "QUORLIN_${name}_MINIMUM")
  list(GET row 2 "QUORLIN_${name}_TESTED")
endforeach()

# quorlin_check_version(<name> <version>): <version> of <name> was found.
function(quorlin_check_version name version)
  set(minimum "${QUORLIN_${name}_MINIMUM}")
  set(tested "${QUORLIN_${name}_TESTED}")
  if(version VERSION_LESS minimum)
    message(FATAL_ERROR "${name} ${version} is too old: ${minimum} or newer is needed.")
  endif()
  # 3.0.17 is of the series 3.0.
  string(REGEX MATCHALL "[^.]+" parts "${tested}")
  list(LENGTH parts count)
  string(REGEX MATCHALL "[^.]+" series "${version}")
  list(SUBLIST series 0 ${count} series)
  list(JOIN series "." series)
  if(series VERSION_GREATER tested)
    message(STATUS "${name} ${version} is newer than any that was tested (${tested}).")
  endif()
  set_property(GLOBAL PROPERTY "QUORLIN_${name}_FOUND_VERSION" "${version}")
endfunction()

# quorlin_find_dependency(<name> [<argument of find_package>...])
macro(quorlin_find_dependency name)
  find_package(${name} ${QUORLIN_${name}_MINIMUM} REQUIRED ${ARGN})
  # Each finds its own way to say it.
  string(TOUPPER "${name}" quorlin_upper_name)
  set(quorlin_found_version "")
  foreach(variable IN ITEMS ${quorlin_upper_name}_VERSION ${name}_VERSION_STRING ${name}_VERSION)
    if(${variable})
      set(quorlin_found_version "${${variable}}")
    endif()
  endforeach()
  if(NOT quorlin_found_version)
    message(FATAL_ERROR "${name} was found, but not its version.")
  endif()
  quorlin_check_version(${name} "${quorlin_found_version}")
endmacro()
