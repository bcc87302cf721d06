# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""The project's Markdown pages: their fenced blocks, their prose, and how a check reports what it found."""

import re
import sys
from pathlib import Path

FENCE = re.compile(r"^(\s*)(`{3,}|~{3,})\s*([\w+-]*)\s*$")


class Block:
    """A fenced block: its page, language, first line number (of the content), text, and the line before the fence."""

    def __init__(self, page, language, line, text, before):
        self.page = page
        self.language = language
        self.line = line
        self.text = text
        self.before = before

    def __str__(self):
        return f"{self.page}:{self.line}"


class Page:
    """One Markdown file: `lines` without the fenced blocks (left empty), and the blocks."""

    def __init__(self, root, path):
        self.path = path
        self.name = path.relative_to(root).as_posix()
        self.lines = []
        self.blocks = []
        self._read(path.read_text(encoding="utf-8").split("\n"))

    def _read(self, lines):
        block = None
        fence = before = ""
        for number, line in enumerate(lines, 1):
            match = FENCE.match(line)
            if block is None and match:
                fence = match.group(2)
                block = Block(self.name, match.group(3), number + 1, [], before)
            elif block is not None and line.strip() == fence:
                block.text = "\n".join(block.text) + "\n"
                self.blocks.append(block)
                block = None
            elif block is not None:
                block.text.append(line)
                self.lines.append("")
                continue
            else:
                self.lines.append(line)
                before = line.strip() or before
                continue
            self.lines.append("")
        if block is not None:
            sys.exit(f"{self.name}:{block.line - 1}: the block is not closed")


def read_pages(root):
    """All pages that people are sent to, in a fixed order."""
    paths = sorted(root.glob("*.md")) + sorted((root / "docs").rglob("*.md")) + sorted((root / "examples").glob("*.md"))
    return [Page(root, path) for path in paths]


def read_root():
    """The project's folder: this file is in tests/docs below it."""
    return Path(__file__).resolve().parents[2]


def finish(faults, what):
    """Ends the check: prints the faults and fails, or says what was looked at. Nothing looked at is a fault, too."""
    for fault in faults:
        print(fault)
    if faults:
        sys.exit(f"{len(faults)} fault(s)")
    if not what or what.startswith("0 "):
        sys.exit("there was nothing to check")
    print(f"checked {what}")
