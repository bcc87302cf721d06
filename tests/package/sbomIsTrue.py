# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""The list of components is well-formed, and names every foreign library that what was built is linked with.

usage: sbomIsTrue.py SBOM PROGRAM_OR_LIBRARY...
"""

import json
import re
import subprocess
import sys

# The components behind the libraries; none for our own and for those of the compiler and the C library.
COMPONENTS = {"libexpat": "expat", "libssl": "openssl", "libcrypto": "openssl", "libcurl": "libcurl", "libgssapi_krb5": "krb5-gssapi"}
TOOLCHAIN = {"libpelmar", "libquorlin", "libquorlin-gssapi", "libquorlin-provider", "libstdc++", "libgcc_s", "libc", "libm", "libpthread",
             "ld-linux-x86-64", "ld-linux-aarch64"}
COMPONENT_KEYS = {"type", "bom-ref", "name", "version", "scope", "description", "purl", "licenses"}


def read_needed(path):
    output = subprocess.run(["readelf", "-dW", path], check=True, capture_output=True, text=True).stdout
    return {name.split(".so")[0] for name in re.findall(r"\(NEEDED\).*\[(.*)\]", output)}


def check_shape(sbom):
    if (sbom.get("bomFormat"), sbom.get("specVersion"), sbom.get("version")) != ("CycloneDX", "1.5", 1):
        yield "the head is not that of CycloneDX 1.5"
    own = sbom["metadata"]["component"]
    references = []
    for component in sbom["components"]:
        references.append(component["bom-ref"])
        if set(component) != COMPONENT_KEYS or not all(component.values()):
            yield f"{component.get('name')}: has other members, or empty ones"
        if component["purl"] != f"pkg:generic/{component['name']}@{component['version']}":
            yield f"{component['name']}: its purl is another's"
        if not re.fullmatch(r"\d+(\.\w+)+", component["version"]):
            yield f"{component['name']}: {component['version']} is no version"
    if len(set(references)) != len(references):
        yield "a component is there twice"
    if sbom["dependencies"] != [{"ref": own["bom-ref"], "dependsOn": references}]:
        yield "the dependencies are not the components"


def main():
    with open(sys.argv[1], encoding="utf-8") as file:
        sbom = json.load(file)
    faults = list(check_shape(sbom))
    named = {component["name"] for component in sbom["components"]}
    needed = set().union(*(read_needed(path) for path in sys.argv[2:])) - TOOLCHAIN
    faults += [f"{library} is linked, and not told" for library in sorted(needed) if COMPONENTS.get(library) not in named]
    for fault in faults:
        print(fault)
    if faults or not needed:
        sys.exit(f"{len(faults)} fault(s), {len(needed)} libraries")
    print(f"checked {len(named)} components, {len(needed)} libraries")


main()
