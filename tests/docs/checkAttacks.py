# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""Every row of the tables of attacks in docs/security.md has a test, and every test that it names is in the sources."""

import re

from pages import Page, finish, read_root

TEST = re.compile(r"^\s*TEST(?:_F|_P)?\(\s*(\w+),\s*(\w+)\s*\)", re.MULTILINE)
CTEST = re.compile(r"add_test\(NAME ((?:package|docs)\.\w+)")


def read_tests(root):
    """All tests, as ctest knows them but for what stands around the names of parameterised ones."""
    names = set()
    for path in (root / "tests").rglob("*.cpp"):
        names |= {f"{suite}.{name}" for suite, name in TEST.findall(path.read_text(encoding="utf-8"))}
    for path in (root / "tests").rglob("CMakeLists.txt"):
        names |= set(CTEST.findall(path.read_text(encoding="utf-8")))
    return names


def read_rows(page):
    """The cells of each row between the two headings, without the heads of the tables."""
    start, end = page.lines.index("## Attacks and faults"), page.lines.index("## Limits")
    for number, line in enumerate(page.lines[start:end], start + 1):
        cells = [cell.strip() for cell in line.split("|")]
        if line.startswith("|") and not line.startswith(("| attack or fault |", "|---")):
            yield number, cells[1:-1]


def main():
    root = read_root()
    tests = read_tests(root)
    faults, rows = [], list(read_rows(Page(root, root / "docs" / "security.md")))
    for number, cells in rows:
        place = f"docs/security.md:{number}"
        if len(cells) != 3 or not all(cells):
            faults.append(f"{place}: not an attack, a test and an outcome")
            continue
        names = re.findall(r"`([^`]+)`", cells[1])
        if not names:
            faults.append(f"{place}: has no test")
        faults += [f"{place}: there is no test {name}" for name in names if name not in tests]
    finish(faults, f"{len(rows)} rows")


main()
