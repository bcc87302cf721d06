# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
#
# The settings a person may choose. Inside another project only the libraries are built unless asked otherwise.

option(QUORLIN_BUILD_APPS "Build the command-line tool and the development token service" ${PROJECT_IS_TOP_LEVEL})
option(QUORLIN_BUILD_DEVSTS "Build the development token service alone, as a library to test one's own code with" OFF)
option(QUORLIN_BUILD_TESTS "Build the tests and the checks of the public headers" ${PROJECT_IS_TOP_LEVEL})
option(QUORLIN_BUILD_BENCH "Build the benchmarks" ${PROJECT_IS_TOP_LEVEL})
option(QUORLIN_BUILD_FUZZ "Build the fuzz targets" ${PROJECT_IS_TOP_LEVEL})
option(QUORLIN_INSTALL "Generate the install rules" ${PROJECT_IS_TOP_LEVEL})
option(QUORLIN_PACKAGE "Set cpack up to make Debian packages" OFF)
option(QUORLIN_RUN_PATH "Let programs and libraries find the libraries they were installed with, wherever that is" ON)
option(QUORLIN_WERROR "Treat warnings in our own code as errors" OFF)
option(QUORLIN_LIBFUZZER "Link the fuzz targets with libFuzzer (clang only) instead of the corpus replayer" OFF)

set(QUORLIN_BUILD_GSSAPI AUTO CACHE STRING
  "Build the Kerberos component libquorlin-gssapi: ON, OFF, or AUTO for when MIT Kerberos is there")
set_property(CACHE QUORLIN_BUILD_GSSAPI PROPERTY STRINGS AUTO ON OFF)

set(QUORLIN_SANITIZE "" CACHE STRING "Sanitizers for the whole tree, for example address,undefined")
set(QUORLIN_VENDOR_URI_BASE "http://schemas.quorlin.example" CACHE STRING
  "Scheme and host of the vendor URIs that the deployed token service uses")

# Shared unless the user, or the project around us, decided otherwise.
if(DEFINED BUILD_SHARED_LIBS AND NOT BUILD_SHARED_LIBS)
  set(QUORLIN_LIBRARY_TYPE STATIC)
else()
  set(QUORLIN_LIBRARY_TYPE SHARED)
endif()

if(PROJECT_IS_TOP_LEVEL)
  if(NOT CMAKE_BUILD_TYPE AND NOT CMAKE_CONFIGURATION_TYPES)
    set(CMAKE_BUILD_TYPE Release CACHE STRING "Build type" FORCE)
  endif()

  set(CMAKE_EXPORT_COMPILE_COMMANDS ON)
  set(CMAKE_RUNTIME_OUTPUT_DIRECTORY "${PROJECT_BINARY_DIR}/bin")
  set(CMAKE_LIBRARY_OUTPUT_DIRECTORY "${PROJECT_BINARY_DIR}/lib")
  set(CMAKE_ARCHIVE_OUTPUT_DIRECTORY "${PROJECT_BINARY_DIR}/lib")

  find_program(QUORLIN_CCACHE ccache)
  mark_as_advanced(QUORLIN_CCACHE)
  if(QUORLIN_CCACHE AND NOT DEFINED CMAKE_CXX_COMPILER_LAUNCHER)
    set(CMAKE_CXX_COMPILER_LAUNCHER "${QUORLIN_CCACHE}")
  endif()
endif()

# A sanitizer only sees what was built with it, so these go to every target.
if(QUORLIN_SANITIZE)
  add_compile_options(-fsanitize=${QUORLIN_SANITIZE} -fno-sanitize-recover=all -fno-omit-frame-pointer)
  add_link_options(-fsanitize=${QUORLIN_SANITIZE})
  if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
    # What the sanitizers put between the lines makes g++ 12 take members of std::optional and <regex> for uninitialised,
    # which they are not.
    add_compile_options(-Wno-maybe-uninitialized)
  endif()
endif()
if(QUORLIN_LIBFUZZER)
  if(NOT CMAKE_CXX_COMPILER_ID MATCHES "Clang")
    message(FATAL_ERROR "QUORLIN_LIBFUZZER needs clang++; with other compilers leave it off to get the corpus replayer.")
  endif()
  add_compile_options(-fsanitize=fuzzer-no-link)
endif()
