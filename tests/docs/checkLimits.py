# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""The limits in docs/security.md have the values of the constants that it names, and every limit of a public header is there."""

import re

from pages import Page, finish, read_root

CONSTANT = re.compile(r"\b(kM(?:ax|in)\w+) = ([\d *+uUlL<]+)[;,\n} ]")
UNITS = {"KiB": 1024, "MiB": 1024 * 1024}


def evaluate(expression):
    """The value of a product or shift of numbers."""
    value = 1
    for factor in re.sub(r"[uUlL ]", "", expression).split("*"):
        base, _, shift = factor.partition("<<")
        value *= int(base) << int(shift or 0)
    return value


def read_constants(root, folder):
    constants = {}
    for path in (root / folder).rglob("*.[ch]*"):
        for name, expression in CONSTANT.findall(path.read_text(encoding="utf-8")):
            constants[name] = evaluate(expression)
    return constants


def read_value(text):
    """"16 MiB" as a number."""
    number, _, unit = text.strip().partition(" ")
    return int(number.replace(",", "")) * UNITS.get(unit, 1)


def read_rows(page):
    """Pairs of a constant's name and its value; a row may have several of each."""
    for line in page.lines[page.lines.index("## Limits") :]:
        cells = line.split("|")
        if len(cells) == 5 and "`k" in cells[3]:
            names = re.findall(r"`(k\w+)`", cells[3])
            values = cells[2].split(";")
            yield from zip(names, values, strict=True)


def main():
    root = read_root()
    constants = read_constants(root, "lib")
    rows = dict(read_rows(Page(root, root / "docs" / "security.md")))
    faults = []
    for name, value in rows.items():
        if constants.get(name) != read_value(value):
            faults.append(f"{name} is {constants.get(name)}, and not {value.strip()}")
    for name in read_constants(root, "lib/public"):
        if name not in rows:
            faults.append(f"{name} of a public header is not told")
    finish(faults, f"{len(rows)} limits")


main()
