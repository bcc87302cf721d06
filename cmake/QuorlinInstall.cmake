# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
#
# The installed package: find_package(Quorlin) gives Quorlin::quorlin and Pelmar::pelmar, pkg-config gives quorlin and
# pelmar. Two CMake packages, because the platform stands on its own. With the component gssapi there is Quorlin::gssapi
# too, or quorlin-gssapi; with provider Quorlin::provider, or quorlin-provider.

include(CMakePackageConfigHelpers)

# The .pc files find their prefix from where they lie, so that an installed tree may be moved.
file(RELATIVE_PATH pc_to_prefix "/prefix/${CMAKE_INSTALL_LIBDIR}/pkgconfig" "/prefix")
string(REGEX REPLACE "/$" "" pc_to_prefix "${pc_to_prefix}")
if(QUORLIN_LIBRARY_TYPE STREQUAL "STATIC")
  set(pc_pelmar_requires "expat openssl >= ${QUORLIN_OpenSSL_MINIMUM} libcurl >= ${QUORLIN_CURL_MINIMUM}")
  set(pc_gssapi_requires "krb5-gssapi >= ${QUORLIN_krb5-gssapi_MINIMUM}")
endif()

# quorlin_install_target(<target> <name> <package> <export> <component>): library, headers and .pc file of one library, and its
# imported target in <export>.cmake of <package>. The shared library itself goes into the Debian package <component>.
function(quorlin_install_target target name package export component)
  install(TARGETS ${target} EXPORT ${export}
    LIBRARY DESTINATION "${CMAKE_INSTALL_LIBDIR}" COMPONENT ${component} NAMELINK_COMPONENT development
    ARCHIVE DESTINATION "${CMAKE_INSTALL_LIBDIR}" COMPONENT development
    FILE_SET HEADERS DESTINATION "${CMAKE_INSTALL_INCLUDEDIR}" COMPONENT development)
  install(EXPORT ${export} NAMESPACE ${package}:: DESTINATION "${CMAKE_INSTALL_LIBDIR}/cmake/${package}"
    COMPONENT development)

  set(generated_pc "${PROJECT_BINARY_DIR}/package/${name}.pc")
  configure_file("${PROJECT_SOURCE_DIR}/cmake/${name}.pc.in" "${generated_pc}" @ONLY)
  install(FILES "${generated_pc}" DESTINATION "${CMAKE_INSTALL_LIBDIR}/pkgconfig" COMPONENT development)
endfunction()

# quorlin_install_library(<target> <name> <package>): a library that is a CMake package of its own.
function(quorlin_install_library target name package)
  set(package_dir "${CMAKE_INSTALL_LIBDIR}/cmake/${package}")
  set(generated_dir "${PROJECT_BINARY_DIR}/package")
  quorlin_install_target(${target} ${name} ${package} ${package}Targets runtime)

  configure_package_config_file("${PROJECT_SOURCE_DIR}/cmake/${package}Config.cmake.in"
    "${generated_dir}/${package}Config.cmake" INSTALL_DESTINATION "${package_dir}")
  # Before 1.0 a minor version may change the interface.
  write_basic_package_version_file("${generated_dir}/${package}ConfigVersion.cmake"
    VERSION ${PROJECT_VERSION} COMPATIBILITY SameMinorVersion)
  install(FILES "${generated_dir}/${package}Config.cmake" "${generated_dir}/${package}ConfigVersion.cmake"
    DESTINATION "${package_dir}" COMPONENT development)
endfunction()

quorlin_install_library(pelmar_library pelmar Pelmar)
quorlin_install_library(quorlin_library quorlin Quorlin)
quorlin_install_target(quorlin_provider_library quorlin-provider Quorlin QuorlinProviderTargets provider)
if(TARGET quorlin_gssapi_library)
  quorlin_install_target(quorlin_gssapi_library quorlin-gssapi Quorlin QuorlinGssapiTargets gssapi)
endif()

if(TARGET quorlin)
  install(TARGETS quorlin RUNTIME DESTINATION "${CMAKE_INSTALL_BINDIR}" COMPONENT tools)
  set(help_dir "${PROJECT_BINARY_DIR}/help")
  # Debian Policy, 12.1: the pages of packages are compressed.
  if(QUORLIN_PACKAGE)
    install(FILES "${help_dir}/quorlin.1.gz" DESTINATION "${CMAKE_INSTALL_MANDIR}/man1" COMPONENT tools)
  else()
    install(FILES "${help_dir}/quorlin.1" DESTINATION "${CMAKE_INSTALL_MANDIR}/man1" COMPONENT tools)
  endif()
  install(FILES "${help_dir}/quorlin.bash" RENAME quorlin
    DESTINATION "${CMAKE_INSTALL_DATADIR}/bash-completion/completions" COMPONENT tools)
  # Where zsh looks depends on whether the system or the administrator installed a program.
  if(CMAKE_INSTALL_PREFIX STREQUAL "/usr")
    set(zsh_dir vendor-completions)
  else()
    set(zsh_dir site-functions)
  endif()
  install(FILES "${help_dir}/_quorlin" DESTINATION "${CMAKE_INSTALL_DATADIR}/zsh/${zsh_dir}" COMPONENT tools)
  install(FILES "${help_dir}/quorlin.fish"
    DESTINATION "${CMAKE_INSTALL_DATADIR}/fish/vendor_completions.d" COMPONENT tools)
endif()
include(QuorlinSbom)
install(FILES "${PROJECT_SOURCE_DIR}/LICENSE" "${PROJECT_SOURCE_DIR}/SECURITY.md" DESTINATION "${CMAKE_INSTALL_DOCDIR}" COMPONENT development)
