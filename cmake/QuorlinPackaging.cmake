# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
#
# Debian packages by cpack: the shared libraries, what one builds against them, and the command-line tool.

set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_NAME quorlin)
set(CPACK_PACKAGE_VENDOR "The Quorlin authors")
set(CPACK_PACKAGE_CONTACT "The Quorlin authors <quorlin@quorlin.example>")
set(CPACK_PACKAGE_VERSION "${PROJECT_VERSION}")
set(CPACK_PACKAGING_INSTALL_PREFIX "/usr")
set(CPACK_STRIP_FILES ON)
set(CPACK_VERBATIM_VARIABLES ON)
set(CPACK_INSTALL_DEFAULT_DIRECTORY_PERMISSIONS
  OWNER_READ OWNER_WRITE OWNER_EXECUTE GROUP_READ GROUP_EXECUTE WORLD_READ WORLD_EXECUTE)

set(CPACK_DEB_COMPONENT_INSTALL ON)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_ENABLE_COMPONENT_DEPENDS ON)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS_PRIVATE_DIRS "${PROJECT_BINARY_DIR}/lib")
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)
# Before 1.0 the libraries fit programs that were built with just this version.
set(CPACK_DEBIAN_PACKAGE_GENERATE_SHLIBS ON)
set(CPACK_DEBIAN_PACKAGE_GENERATE_SHLIBS_POLICY "=")
# Debian Policy, 8.1.1: libraries tell ldconfig by a trigger.
file(WRITE "${PROJECT_BINARY_DIR}/package/triggers" "activate-noawait ldconfig\n")

# quorlin_package(<component> <package name> <section> <summary> <text>)
macro(quorlin_package component name section summary text)
  string(TOUPPER "${component}" upper)
  list(APPEND CPACK_COMPONENTS_ALL ${component})
  set(CPACK_DEBIAN_${upper}_PACKAGE_NAME "${name}")
  set(CPACK_DEBIAN_${upper}_PACKAGE_SECTION "${section}")
  set(CPACK_COMPONENT_${upper}_DESCRIPTION "${summary}\n${text}")
  # Every Debian package says what changed in it and under which terms it may be used.
  install(FILES "${PROJECT_BINARY_DIR}/package/changelog.gz"
    DESTINATION "${CMAKE_INSTALL_DATADIR}/doc/${name}" COMPONENT ${component})
  install(FILES "${PROJECT_SOURCE_DIR}/packaging/copyright"
    DESTINATION "${CMAKE_INSTALL_DATADIR}/doc/${name}" COMPONENT ${component})
endmacro()

# The changelog in Debian's form says where the real one is; -n leaves the time out, so that two builds are the same.
configure_file("${PROJECT_SOURCE_DIR}/packaging/changelog.in" "${PROJECT_BINARY_DIR}/package/changelog" @ONLY)
execute_process(COMMAND gzip -9 -n -c "${PROJECT_BINARY_DIR}/package/changelog"
  OUTPUT_FILE "${PROJECT_BINARY_DIR}/package/changelog.gz" COMMAND_ERROR_IS_FATAL ANY)

set(CPACK_COMPONENTS_ALL)
quorlin_package(runtime "libquorlin${PROJECT_VERSION_MAJOR}" libs
  "Client library for WS-Trust token services"
  "Asks WS-Trust 1.3 token services for SAML 2.0 tokens and checks tokens\nstrictly. These are the shared libraries.")
set(CPACK_DEBIAN_RUNTIME_PACKAGE_CONTROL_EXTRA "${PROJECT_BINARY_DIR}/package/triggers")

quorlin_package(provider "libquorlin-provider${PROJECT_VERSION_MAJOR}" libs
  "Token provider for the client library for WS-Trust token services"
  "Keeps a SAML 2.0 token of a WS-Trust 1.3 token service at hand, and gets\nthe next one in time. This is the shared library.")
set(CPACK_COMPONENT_PROVIDER_DEPENDS runtime)
set(CPACK_DEBIAN_PROVIDER_PACKAGE_CONTROL_EXTRA "${PROJECT_BINARY_DIR}/package/triggers")

if(TARGET quorlin_gssapi_library)
  quorlin_package(gssapi "libquorlin-gssapi${PROJECT_VERSION_MAJOR}" libs
    "Kerberos for the client library for WS-Trust token services"
    "Asks WS-Trust 1.3 token services for SAML 2.0 tokens by a Kerberos\nticket. This is the shared library.")
  set(CPACK_COMPONENT_GSSAPI_DEPENDS runtime)
  set(CPACK_DEBIAN_GSSAPI_PACKAGE_CONTROL_EXTRA "${PROJECT_BINARY_DIR}/package/triggers")
endif()

quorlin_package(development "libquorlin-dev" libdevel
  "Client library for WS-Trust token services (development files)"
  "Asks WS-Trust 1.3 token services for SAML 2.0 tokens and checks tokens\nstrictly. These are the headers and what CMake and pkg-config need.")
set(CPACK_COMPONENT_DEVELOPMENT_DEPENDS runtime provider)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_DEPENDS "libboost-dev")
if(TARGET quorlin_gssapi_library)
  list(APPEND CPACK_COMPONENT_DEVELOPMENT_DEPENDS gssapi)
endif()

if(TARGET quorlin)
  quorlin_package(tools "quorlin-tools" utils
    "Command-line tool for WS-Trust token services"
    "Asks WS-Trust 1.3 token services for SAML 2.0 tokens, checks tokens, and\nruns a token service for development.")
  set(CPACK_COMPONENT_TOOLS_DEPENDS runtime)
endif()

include(CPack)
