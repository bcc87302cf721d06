# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""The table "Who uses whom" in docs/architecture.md is what the sources include."""

import re
from collections import defaultdict

from pages import Page, finish, read_root

FOREIGN = {"openssl": "OpenSSL", "curl": "curl", "expat.h": "expat", "boost": "Boost", "nlohmann": "nlohmann-json", "CLI": "CLI11",
           "gssapi": "GSS-API"}
INCLUDE = re.compile(r'^#include [<"]([^>"]+)', re.MULTILINE)


def name_part(path):
    """The part of the program that a source belongs to, as the table calls it."""
    if path.startswith("apps/"):
        return path.split("/")[1] if path.split("/")[1] != "quorlin" else "tool"
    path = re.sub(r"^lib/(public/)?", "", path)
    if path.startswith("pelmar/"):
        return path.split("/")[1] if path.count("/") > 1 else "core"
    for part in ("gssapi", "provider"):
        if path.startswith(f"quorlin-{part}/"):
            return part
    return "libquorlin"


def name_included(root, part, included):
    """The part that an #include is of; nothing for the standard library and the system."""
    first = included.split("/")[0]
    if first in FOREIGN:
        return FOREIGN[first]
    if part == "tool" and (root / "apps" / included).exists():
        return name_part("apps/" + included)
    if first == "devsts":
        return "devsts"
    return name_part("lib/" + included) if first in ("pelmar", "quorlin", "quorlin-gssapi", "quorlin-provider") else ""


def read_uses(root):
    uses = defaultdict(set)
    for path in [*root.glob("lib/**/*.[ch]*"), *root.glob("apps/**/*.[ch]*")]:
        if path.suffix not in (".h", ".cpp"):
            continue
        part = name_part(path.relative_to(root).as_posix())
        uses[part] |= {name_included(root, part, included) for included in INCLUDE.findall(path.read_text(encoding="utf-8"))}
        uses[part] -= {part, ""}
    return uses


def read_table(page):
    """Rows "| `part` | a, b | C, D | ... |" below the heading."""
    rows = {}
    start = page.lines.index("## Who uses whom")
    for line in page.lines[start:]:
        cells = [cell.strip() for cell in line.split("|")]
        if len(cells) > 4 and cells[1].startswith("`"):
            names = f"{cells[2]}, {cells[3]}".split(",")
            rows[cells[1].strip("`")] = {name.strip(" `") for name in names} - {""}
        elif rows and not line:
            break
    return rows


def main():
    root = read_root()
    uses = read_uses(root)
    table = read_table(Page(root, root / "docs" / "architecture.md"))
    faults = [f"{part}: not in the table" for part in uses.keys() - table.keys()]
    faults += [f"{part}: not in the sources" for part in table.keys() - uses.keys()]
    for part in sorted(uses.keys() & table.keys()):
        faults += [f"{part}: uses {name}, which the table does not say" for name in sorted(uses[part] - table[part])]
        faults += [f"{part}: does not use {name}" for name in sorted(table[part] - uses[part])]
    finish(faults, f"{len(uses)} parts")


main()
