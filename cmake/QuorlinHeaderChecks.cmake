# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
#
# Each public header has to compile alone, as C++11, without a warning: one generated source includes each.

file(GLOB_RECURSE public_headers CONFIGURE_DEPENDS RELATIVE "${PROJECT_SOURCE_DIR}/lib/public"
  "${PROJECT_SOURCE_DIR}/lib/public/*.h")

set(header_check_sources)
foreach(header IN LISTS public_headers)
  string(MAKE_C_IDENTIFIER "${header}" name)
  set(source "${PROJECT_BINARY_DIR}/header_checks/${name}.cpp")
  file(CONFIGURE OUTPUT "${source}" CONTENT "#include <${header}>\n")
  list(APPEND header_check_sources "${source}")
endforeach()

if(header_check_sources)
  add_library(header_checks OBJECT ${header_check_sources})
  set_target_properties(header_checks PROPERTIES
    CXX_STANDARD 11
    CXX_STANDARD_REQUIRED ON
    CXX_EXTENSIONS OFF)
  target_compile_options(header_checks PRIVATE
    -Wall -Wextra -Wpedantic $<$<BOOL:${QUORLIN_WERROR}>:-Werror>)
  target_link_libraries(header_checks PRIVATE Quorlin::quorlin)
endif()
