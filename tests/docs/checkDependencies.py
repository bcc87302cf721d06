# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""The versions in docs/building.md are those that cmake/QuorlinDependencies.cmake demands and says were tested."""

import re

from pages import Page, finish, read_root

# What the page calls them.
NAMES = {"Boost (headers only)": "Boost", "expat": "EXPAT", "OpenSSL": "OpenSSL", "libcurl, with OpenSSL": "CURL",
         "MIT Kerberos": "krb5-gssapi", "nlohmann-json": "nlohmann_json", "CLI11": "CLI11", "GoogleTest": "GTest", "Python": "Python3"}


def read_demanded(root):
    text = (root / "cmake" / "QuorlinDependencies.cmake").read_text(encoding="utf-8")
    return {name: (minimum, tested) for name, minimum, tested in re.findall(r'"(\S+) ([\d.]+) ([\d.]+)"', text)}


def read_told(page):
    for line in page.lines[page.lines.index("## Dependencies") :]:
        cells = [cell.strip() for cell in line.split("|")]
        if len(cells) == 7 and cells[2] in NAMES:
            yield NAMES[cells[2]], (cells[3], cells[4])


def main():
    root = read_root()
    demanded = read_demanded(root)
    told = dict(read_told(Page(root, root / "docs" / "building.md")))
    faults = [f"{name}: {demanded.get(name)} is demanded, {told.get(name)} is told"
              for name in sorted(demanded.keys() | told.keys()) if demanded.get(name) != told.get(name)]
    for path in [*root.rglob("CMakeLists.txt"), *(root / "cmake").glob("*")]:
        if "build" in path.relative_to(root).parts[0]:
            continue
        for number, line in enumerate(path.read_text(encoding="utf-8").split("\n"), 1):
            if re.search(r"^\s*find_(?:package|dependency)\(\w+ \d", line):
                faults.append(f"{path.relative_to(root)}:{number}: a version of its own")
    finish(faults, f"{len(demanded)} dependencies")


main()
