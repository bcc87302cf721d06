# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""The exchanges in docs/wire-format.md are what the command-line tool and the development token service say to each other.

The tool is run through a relay that keeps what passes. A block of the page that has a line <!-- wire: NAME PART --> before it is
compared with PART (head, request or answer) of the exchange NAME; with the word "excerpt" after PART it has to stand in there. The
page may fold lines, indent, and add comments; dates, UUIDs, lengths and base64 values differ from one exchange to the next.

usage: checkExchange.py QUORLIN [--print]
"""

import re
import sys
import tempfile

from pages import Page, finish, read_root
from world import World

MARK = re.compile(r"<!-- wire: (\S+) (\S+)( excerpt)? -->")
BASE64_ELEMENTS = "DigestValue|SignatureValue|X509Certificate|BinarySecurityToken"
MASKS = (
    (re.compile(r"\d{4}-\d\d-\d\dT[\d:.]+Z"), "DATE"),
    (re.compile(r"[0-9a-f]{8}(-[0-9a-f]{4}){3}-[0-9a-f]{12}"), "UUID"),
    (re.compile(r"127\.0\.0\.1:\d+"), "HOST"),
    (re.compile(r"(Content-Length: )\d+"), r"\1N"),
    (re.compile(rf"(<(?:\w+:)?(?:{BASE64_ELEMENTS})\b[^>]*>)[^<]*"), r"\1BASE64"),
)


def normalise(text):
    """The text without XML declaration, comments, layout, and what changes from one exchange to the next."""
    text = re.sub(r"<!--.*?-->|<\?xml.*?\?>", "", text, flags=re.DOTALL)
    text = re.sub(r">\s+<", "><", text.strip())
    text = re.sub(r"\s+", " ", text)
    for pattern, mask in MASKS:
        text = pattern.sub(mask, text)
    return re.sub(r" (/?>)", r"\1", text)


def fold(line):
    """A long start tag with each attribute on a line of its own."""
    if len(line) <= 110:
        return line
    indent = " " * (len(line) - len(line.lstrip()) + 4)
    start, end, rest = line.partition(">")
    return re.sub(r" ([\w:]+=\")", rf"\n{indent}\1", start) + end + rest


def lay_out(text):
    """XML for the eyes: one element a line, base64 cut short."""
    text = re.sub(r"^<\?xml.*?\?>\s*", "", text)
    text = re.sub(rf"(<(?:\w+:)?(?:{BASE64_ELEMENTS})\b[^>]*>)([^<]{{24}})[^<]*", r"\1\2…", text)
    depth = 0
    lines = []
    for piece in re.sub(r"><", ">\n<", text).split("\n"):
        closes = piece.startswith("</")
        depth -= closes
        lines.append(fold("  " * depth + piece))
        opens = piece.startswith("<") and not closes and not piece.endswith("/>") and "</" not in piece
        depth += opens
    return "\n".join(lines)


def compare(page, exchanges):
    faults = []
    count = 0
    for block in page.blocks:
        mark = MARK.fullmatch(block.before)
        if not mark:
            continue
        count += 1
        expected = normalise(block.text)
        actual = normalise(exchanges[mark.group(1)][mark.group(2)])
        if expected != actual and not (mark.group(3) and expected in actual):
            faults.append(f"{block}: is not what was said. The page has\n{expected}\nand the wire\n{actual}")
    finish(faults, f"{count} texts of {len(exchanges)} exchanges")


def record(world):
    """The exchanges that the page shows."""
    alice = ["acquire", "password", "--user", "alice@example.com", "--password-stdin"]
    robot = ["--cert", world.path("cert.pem"), "--key", world.path("key.pem")]
    token = world.path("token.xml")
    exchanges = {}
    world.ask([*alice, "--out", token], "secret\n")
    exchanges["password"] = world.parts
    world.ask(["acquire", "certificate", "--renewable", *robot])
    exchanges["certificate"] = world.parts
    world.ask(["validate", "--token", token])
    exchanges["validate"] = world.parts
    world.ask(alice, "wrong\n", 1)
    exchanges["refused"] = world.parts
    return exchanges


def main():
    with tempfile.TemporaryDirectory() as folder, World(sys.argv[1], folder) as world:
        exchanges = record(world)
    if "--print" in sys.argv:
        for name, parts in exchanges.items():
            for part, text in parts.items():
                print(f"<!-- wire: {name} {part} -->\n\n{lay_out(text) if part != 'head' else text}\n")
        return
    root = read_root()
    compare(Page(root, root / "docs" / "wire-format.md"), exchanges)


main()
