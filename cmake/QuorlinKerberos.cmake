# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
#
# Decides whether the Kerberos component is built: QUORLIN_HAS_GSSAPI. It needs MIT Kerberos, which has the extensions of
# GSS-API that name a credential cache or a keytab without the environment.

set(QUORLIN_HAS_GSSAPI FALSE)
if(NOT QUORLIN_BUILD_GSSAPI MATCHES "^(AUTO|ON|OFF)$")
  message(FATAL_ERROR "QUORLIN_BUILD_GSSAPI must be AUTO, ON or OFF, not '${QUORLIN_BUILD_GSSAPI}'.")
endif()
if(QUORLIN_BUILD_GSSAPI STREQUAL "OFF")
  message(STATUS "Kerberos: switched off. libquorlin-gssapi and the Kerberos tests are left out.")
  return()
endif()

find_package(PkgConfig QUIET)
if(PKG_CONFIG_FOUND)
  pkg_check_modules(QUORLIN_KRB5_GSSAPI QUIET IMPORTED_TARGET krb5-gssapi>=${QUORLIN_krb5-gssapi_MINIMUM})
endif()
if(QUORLIN_KRB5_GSSAPI_FOUND)
  set(QUORLIN_HAS_GSSAPI TRUE)
  quorlin_check_version(krb5-gssapi "${QUORLIN_KRB5_GSSAPI_VERSION}")
  message(STATUS "Kerberos: found MIT Kerberos ${QUORLIN_KRB5_GSSAPI_VERSION}, libquorlin-gssapi is built.")
elseif(QUORLIN_BUILD_GSSAPI STREQUAL "ON")
  message(FATAL_ERROR "QUORLIN_BUILD_GSSAPI is ON, but pkg-config finds no MIT Kerberos ${QUORLIN_krb5-gssapi_MINIMUM} or newer (krb5-gssapi.pc; on "
    "Debian in libkrb5-dev).")
else()
  message(STATUS "Kerberos: no MIT Kerberos ${QUORLIN_krb5-gssapi_MINIMUM} or newer (on Debian libkrb5-dev). libquorlin-gssapi and the Kerberos tests "
    "are left out.")
endif()
