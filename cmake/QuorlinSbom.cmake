# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
#
# The list of what this build stands on, in the versions that were found: a CycloneDX 1.5 file, which is installed with the
# documentation. It has neither a time nor a serial number, so that two builds of the same are the same.

# quorlin_sbom_component(<variable> <name> <license> <scope> <purpose>): appends to the list of components in <variable>, and
# to that of their references in <variable>_REFERENCES. What was not found is not part of the build.
function(quorlin_sbom_component variable name license scope purpose)
  get_property(version GLOBAL PROPERTY "QUORLIN_${name}_FOUND_VERSION")
  if(NOT version)
    return()
  endif()
  string(TOLOWER "${name}" id)
  string(REGEX REPLACE "^curl$" "libcurl" id "${id}")
  set(reference "pkg:generic/${id}@${version}")
  set(component "{}")
  foreach(pair IN ITEMS "type=library" "bom-ref=${reference}" "name=${id}" "version=${version}" "scope=${scope}"
      "description=${purpose}" "purl=${reference}")
    string(REGEX MATCH "^([^=]+)=(.*)$" ignored "${pair}")
    string(JSON component SET "${component}" "${CMAKE_MATCH_1}" "\"${CMAKE_MATCH_2}\"")
  endforeach()
  string(JSON component SET "${component}" licenses "[{\"license\": {\"id\": \"${license}\"}}]")
  set(${variable} ${${variable}} "${component}" PARENT_SCOPE)
  set(${variable}_REFERENCES ${${variable}_REFERENCES} "\"${reference}\"" PARENT_SCOPE)
endfunction()

set(sbom_components)
set(sbom_components_REFERENCES)
quorlin_sbom_component(sbom_components Boost BSL-1.0 required "Headers of the interface")
quorlin_sbom_component(sbom_components EXPAT MIT required "Reads XML")
quorlin_sbom_component(sbom_components OpenSSL Apache-2.0 required "Cryptography and TLS")
quorlin_sbom_component(sbom_components CURL curl required "HTTP")
if(TARGET quorlin_gssapi_library)
  quorlin_sbom_component(sbom_components krb5-gssapi MIT optional "Kerberos, for the component gssapi")
endif()
if(TARGET quorlin)
  quorlin_sbom_component(sbom_components CLI11 BSD-3-Clause optional "Command line, for the tool")
  quorlin_sbom_component(sbom_components nlohmann_json MIT optional "JSON, for the tool")
endif()

list(JOIN sbom_components ", " components)
list(JOIN sbom_components_REFERENCES ", " references)
set(own_reference "pkg:generic/quorlin@${PROJECT_VERSION}")
set(sbom "{\"bomFormat\": \"CycloneDX\", \"specVersion\": \"1.5\", \"version\": 1}")
string(JSON sbom SET "${sbom}" metadata "{\"component\": {\"type\": \"library\", \"bom-ref\": \"${own_reference}\", \
\"name\": \"quorlin\", \"version\": \"${PROJECT_VERSION}\", \"purl\": \"${own_reference}\", \
\"licenses\": [{\"license\": {\"id\": \"Apache-2.0\"}}]}}")
string(JSON sbom SET "${sbom}" components "[${components}]")
string(JSON sbom SET "${sbom}" dependencies "[{\"ref\": \"${own_reference}\", \"dependsOn\": [${references}]}]")
file(CONFIGURE OUTPUT "${PROJECT_BINARY_DIR}/package/quorlin.cdx.json" CONTENT "${sbom}\n" @ONLY)

install(FILES "${PROJECT_BINARY_DIR}/package/quorlin.cdx.json" DESTINATION "${CMAKE_INSTALL_DOCDIR}"
  COMPONENT development)
