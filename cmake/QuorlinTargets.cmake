# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
#
# How every target of ours is compiled and linked.

include(CheckCXXCompilerFlag)
include(CheckPIESupported)
check_pie_supported(LANGUAGES CXX)

# Control-flow protection is the processor's affair: x86 has it as CET, AArch64 as BTI and PAC. Where the compiler knows
# neither, there is none. clang only warns of a flag that its target has no use for, and is to be taken at its word.
set(CMAKE_REQUIRED_FLAGS -Werror)
check_cxx_compiler_flag(-fcf-protection=full QUORLIN_HAS_CF_PROTECTION)
check_cxx_compiler_flag(-mbranch-protection=standard QUORLIN_HAS_BRANCH_PROTECTION)
check_cxx_compiler_flag(-fstack-clash-protection QUORLIN_HAS_STACK_CLASH_PROTECTION)
unset(CMAKE_REQUIRED_FLAGS)

# Warnings are our business alone: linked PRIVATE for the build, never exported.
add_library(quorlin_warnings INTERFACE)
target_compile_options(quorlin_warnings INTERFACE
  -Wall -Wextra -Wpedantic -Wconversion -Wshadow -Wnon-virtual-dtor
  $<$<BOOL:${QUORLIN_WERROR}>:-Werror>)

add_library(quorlin_hardening INTERFACE)
# Checked conditions are part of the product: -UNDEBUG stands after whatever the build type or an outer project defines.
# The macro prefixes keep the builder's paths out of the messages that name a source file; a compiler cache may hand the
# compiler the sources relative to the build tree.
file(RELATIVE_PATH quorlin_sources_from_build "${PROJECT_BINARY_DIR}" "${PROJECT_SOURCE_DIR}")
target_compile_options(quorlin_hardening INTERFACE
  -UNDEBUG
  -fstack-protector-strong
  $<$<BOOL:${QUORLIN_HAS_STACK_CLASH_PROTECTION}>:-fstack-clash-protection>
  $<$<BOOL:${QUORLIN_HAS_CF_PROTECTION}>:-fcf-protection=full>
  $<$<BOOL:${QUORLIN_HAS_BRANCH_PROTECTION}>:-mbranch-protection=standard>
  "-fmacro-prefix-map=${PROJECT_SOURCE_DIR}/="
  "-fmacro-prefix-map=${quorlin_sources_from_build}=")
target_compile_definitions(quorlin_hardening INTERFACE _GLIBCXX_ASSERTIONS)
# _FORTIFY_SOURCE needs an optimised build, and hides accesses from the sanitizers. Level 3 also bounds objects whose size
# is known at run time only; a C library that is too old for it takes it for level 2.
if(NOT QUORLIN_SANITIZE)
  target_compile_options(quorlin_hardening INTERFACE
    $<$<CONFIG:Release,RelWithDebInfo,MinSizeRel>:-U_FORTIFY_SOURCE>
    $<$<CONFIG:Release,RelWithDebInfo,MinSizeRel>:-D_FORTIFY_SOURCE=3>)
endif()
target_link_options(quorlin_hardening INTERFACE -Wl,-z,relro,-z,now)

# quorlin_target_defaults(<target>): language level, visibility, warnings and hardening of one target of ours.
function(quorlin_target_defaults target)
  target_compile_features(${target} PRIVATE cxx_std_17)
  set_target_properties(${target} PROPERTIES
    CXX_EXTENSIONS OFF
    CXX_VISIBILITY_PRESET hidden
    VISIBILITY_INLINES_HIDDEN ON
    POSITION_INDEPENDENT_CODE ON)
  target_link_libraries(${target} PRIVATE $<BUILD_INTERFACE:quorlin_warnings> $<BUILD_INTERFACE:quorlin_hardening>)
endfunction()

# quorlin_library_face(<target> <name> [<base>]): the shared (or, on request, static) library <name> as others see it, with
# the headers of lib/public/<name> as its interface, which are included by their path below <base>: lib/public if none is given. Consumers need no more than C++11. What it exports is bounded by the
# exports.map beside its CMakeLists.txt.
function(quorlin_library_face target name)
  file(GLOB_RECURSE headers CONFIGURE_DEPENDS "${PROJECT_SOURCE_DIR}/lib/public/${name}/*.h")
  set(bases "${PROJECT_SOURCE_DIR}/lib/public" ${ARGN})
  list(GET bases -1 base)
  target_sources(${target} PUBLIC FILE_SET HEADERS BASE_DIRS "${base}" FILES ${headers})
  target_compile_features(${target} INTERFACE cxx_std_11)
  target_link_libraries(${target} PRIVATE $<BUILD_INTERFACE:quorlin_hardening>)
  set_target_properties(${target} PROPERTIES
    OUTPUT_NAME ${name}
    EXPORT_NAME ${name}
    LINKER_LANGUAGE CXX
    VERSION ${PROJECT_VERSION}
    SOVERSION ${PROJECT_VERSION_MAJOR})
  # A symbol nobody provides shall stop our link, not the first program that loads us. The sanitizers' own symbols
  # come from the program, so there the check cannot be made.
  if(QUORLIN_LIBRARY_TYPE STREQUAL "SHARED" AND NOT QUORLIN_SANITIZE AND NOT QUORLIN_LIBFUZZER)
    target_link_options(${target} PRIVATE -Wl,--no-undefined)
    set(exports "${CMAKE_CURRENT_SOURCE_DIR}/exports.map")
    target_link_options(${target} PRIVATE "-Wl,--version-script=${exports}")
    set_property(TARGET ${target} APPEND PROPERTY LINK_DEPENDS "${exports}")
  endif()
endfunction()

# quorlin_run_path(<target> <path>...): where <target> looks for our libraries. Our own build tree lies like an installed one, so
# the path is final from the start: the one CMake would rewrite on installing is padded with empty entries, and to the
# loader an empty entry is the current folder.
function(quorlin_run_path target)
  if(NOT QUORLIN_RUN_PATH)
    set_target_properties(${target} PROPERTIES INSTALL_RPATH "" BUILD_WITH_INSTALL_RPATH ON)
    return()
  endif()
  set(path ${ARGN})
  list(REMOVE_DUPLICATES path)
  set_target_properties(${target} PROPERTIES INSTALL_RPATH "${path}" BUILD_WITH_INSTALL_RPATH ${PROJECT_IS_TOP_LEVEL})
endfunction()
