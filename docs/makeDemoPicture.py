#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
"""usage: docs/makeDemoPicture.py QUORLIN

Runs the demo of the program QUORLIN and draws what it prints as docs/demo.svg, the picture in the README.
"""

import html
import pathlib
import subprocess
import sys

COLUMNS = 124
FONT_SIZE = 13
CHARACTER_WIDTH = 7.83  # Of the fonts below, at that size.
LINE_HEIGHT = 18
MARGIN = 16
BAR_HEIGHT = 28


def wrap(line):
    """As a terminal of that many columns does."""
    return [line[i:i + COLUMNS] for i in range(0, len(line), COLUMNS)] or [""]


def draw(lines):
    width = round(COLUMNS * CHARACTER_WIDTH) + 2 * MARGIN
    height = BAR_HEIGHT + len(lines) * LINE_HEIGHT + 2 * MARGIN
    parts = [
        f'<svg xmlns="http://www.w3.org/2000/svg" width="{width}" height="{height}" viewBox="0 0 {width} {height}">',
        f'<rect width="{width}" height="{height}" rx="8" fill="#1c2128"/>',
        f'<rect width="{width}" height="{BAR_HEIGHT}" rx="8" fill="#2d333b"/>',
        '<g fill="#cdd9e5" font-family="DejaVu Sans Mono, Menlo, Consolas, monospace" '
        f'font-size="{FONT_SIZE}" xml:space="preserve">',
    ]
    for number, line in enumerate(lines, 1):
        y = BAR_HEIGHT + MARGIN + number * LINE_HEIGHT - 4
        colour = ' fill="#7ee787"' if line.startswith("$ ") else ""
        parts.append(f'<text x="{MARGIN}" y="{y}"{colour}>{html.escape(line, quote=False)}</text>')
    return "\n".join(parts + ["</g>", "</svg>", ""])


def main():
    if len(sys.argv) != 2:
        sys.exit(__doc__)
    output = subprocess.run([sys.argv[1], "demo"], check=True, capture_output=True, text=True).stdout
    lines = [piece for line in ["$ quorlin demo"] + output.rstrip("\n").split("\n") for piece in wrap(line)]
    pathlib.Path(__file__).with_name("demo.svg").write_text(draw(lines), encoding="utf-8")


if __name__ == "__main__":
    main()
