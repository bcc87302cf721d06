# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""Every link of a page that stays inside the project leads to a file that is there, and to a heading that it has; the indexes lead to every page and
every example."""

import re
from urllib.parse import unquote

from pages import finish, read_pages, read_root

LINK = re.compile(r"\[[^\]]*\]\(([^)\s]+)\)|^\[[^\]]+\]:\s*(\S+)")
CODE = re.compile(r"``.*?``|`[^`]*`")
HEADING = re.compile(r"^#{1,6}\s+(.*?)\s*#*$")


def make_anchor(heading):
    """The anchor that the usual Markdown renderers give a heading."""
    text = re.sub(r"\[([^\]]*)\]\([^)]*\)", r"\1", heading).replace("`", "").lower()
    return re.sub(r"[^\w\- ]", "", text).replace(" ", "-")


def read_anchors(page):
    anchors = set()
    for line in page.lines:
        match = HEADING.match(line)
        if match:
            anchor = make_anchor(match.group(1))
            number = 1
            unique = anchor
            while unique in anchors:
                unique = f"{anchor}-{number}"
                number += 1
            anchors.add(unique)
    return anchors


def read_links(page):
    for number, line in enumerate(page.lines, 1):
        for match in LINK.finditer(CODE.sub("", line)):
            yield number, match.group(1) or match.group(2)


def check_link(root, page, target, anchors):
    """What is wrong with a link, or nothing."""
    path, _, anchor = target.partition("#")
    file = (page.path.parent / unquote(path)).resolve() if path else page.path
    if root not in file.parents and file != root:
        return "leads out of the project"
    if not file.exists():
        return "leads to nothing"
    if anchor and anchor not in anchors.get(file, set()):
        return "leads to a heading that is not there"
    return ""


def main():
    root = read_root()
    pages = read_pages(root)
    anchors = {page.path.resolve(): read_anchors(page) for page in pages}
    faults = []
    count = 0
    for page in pages:
        for number, target in read_links(page):
            if re.match(r"[a-z][a-z0-9+.-]*:", target):
                continue
            count += 1
            fault = check_link(root, page, target, anchors)
            if fault:
                faults.append(f"{page.name}:{number}: {target} {fault}")
    index = (root / "docs" / "README.md").read_text(encoding="utf-8")
    for page in pages:
        if page.path.parent == root / "docs" and page.path.name != "README.md" and f"({page.path.name})" not in index:
            faults.append(f"docs/README.md: does not lead to {page.path.name}")
    listed = (root / "examples" / "README.md").read_text(encoding="utf-8")
    for example in sorted((root / "examples").glob("*.cpp")):
        if f"({example.name})" not in listed:
            faults.append(f"examples/README.md: does not lead to {example.name}")
    finish(faults, f"{count} links")


main()
