# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
#
# Installs the build tree BUILD_DIR below WORK_DIR and builds the project beside this script twice against what was
# installed: with find_package and with pkg-config. Both programs have to run. CXX is the compiler. The same for the token
# provider, and with GSSAPI for the Kerberos component; without it, asking for it has to be refused.

set(prefix "${WORK_DIR}/prefix")

function(run)
  execute_process(COMMAND ${ARGV} COMMAND_ECHO STDOUT COMMAND_ERROR_IS_FATAL ANY)
endfunction()

file(REMOVE_RECURSE "${WORK_DIR}")
run("${CMAKE_COMMAND}" --install "${BUILD_DIR}" --prefix "${prefix}")

set(configure "${CMAKE_COMMAND}" -S "${CMAKE_CURRENT_LIST_DIR}" -G Ninja
  "-DCMAKE_PREFIX_PATH=${prefix}" "-DCMAKE_CXX_COMPILER=${CXX}")

# Configuring with these components has to fail, with this text.
function(refuse_components components text)
  execute_process(COMMAND ${configure} -B "${WORK_DIR}/refused" "-DCOMPONENTS=${components}"
    RESULT_VARIABLE result OUTPUT_QUIET ERROR_VARIABLE errors)
  string(REGEX REPLACE "[ \n]+" " " errors "${errors}")
  string(FIND "${errors}" "${text}" found)
  if(result EQUAL 0 OR found EQUAL -1)
    message(FATAL_ERROR "The components ${components} were not refused with \"${text}\" but gave ${result}: ${errors}")
  endif()
endfunction()

# build_with_pkg_config(<name> <package>...): compiles <name>.cpp by hand, and runs it.
function(build_with_pkg_config name)
  execute_process(
    COMMAND pkg-config --cflags --libs ${ARGN}
    OUTPUT_VARIABLE flags OUTPUT_STRIP_TRAILING_WHITESPACE COMMAND_ECHO STDOUT COMMAND_ERROR_IS_FATAL ANY)
  separate_arguments(flags UNIX_COMMAND "${flags}")
  run("${CXX}" -std=c++11 "${CMAKE_CURRENT_LIST_DIR}/${name}.cpp" -o "${WORK_DIR}/${name}" ${flags}
    "-Wl,-rpath,${prefix}/${LIBDIR}")
  run("${WORK_DIR}/${name}")
endfunction()

set(ENV{PKG_CONFIG_PATH} "${prefix}/${LIBDIR}/pkgconfig")
set(components provider)
if(GSSAPI)
  string(APPEND components ",gssapi")
else()
  refuse_components(gssapi "This Quorlin was built without its component gssapi, which needs MIT Kerberos.")
endif()
refuse_components(toaster "Quorlin has no component 'toaster'; there are: gssapi, provider.")

run(${configure} -B "${WORK_DIR}/build" "-DCOMPONENTS=${components}")
run("${CMAKE_COMMAND}" --build "${WORK_DIR}/build")
run("${WORK_DIR}/build/consumer")
build_with_pkg_config(consumer quorlin pelmar)
run("${WORK_DIR}/build/providerConsumer")
build_with_pkg_config(providerConsumer quorlin-provider)
if(GSSAPI)
  run("${WORK_DIR}/build/gssapiConsumer")
  build_with_pkg_config(gssapiConsumer quorlin-gssapi)
endif()

# The tool finds the libraries it was installed with.
if(EXISTS "${prefix}/bin/quorlin")
  run("${prefix}/bin/quorlin" --help)
endif()
