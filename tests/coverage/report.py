#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
"""Says how much of lib/ the tests ran, from what gcov counted.

usage: report.py BUILD_DIR [LINES BRANCHES]

Writes BUILD_DIR/coverage.txt (every file, and every line and branch that was not taken) and prints the sums. With two
numbers it fails when fewer per cent of the lines or branches were taken.

Not counted as branches: the edges that the compiler adds for exceptions (gcov marks them), and what it adds on lines that
hold no condition of ours, where it destroys objects. A line of a template counts once, however often it was instantiated;
a closing brace is no line.
"""

import json
import re
import subprocess
import sys
from collections import defaultdict
from pathlib import Path

ROOT = Path(__file__).resolve().parents[2]
# A branch is somebody's decision: a condition, a loop, or the short cut of an operator.
DECISION = re.compile(r"\b(if|for|while|switch|case|default)\b|\?|&&|\|\|")


class File:
    def __init__(self, path):
        self.source = path.read_text(encoding="utf-8").splitlines()
        self.lines = defaultdict(int)
        self.branches = {}

    def text(self, number):
        return self.source[number - 1] if number <= len(self.source) else ""

    def add(self, line):
        number = line["line_number"]
        if self.text(number).strip().rstrip(";") == "}":
            return
        self.lines[number] += line["count"]
        taken = [branch["count"] for branch in line["branches"] if not branch["throw"]]
        if not taken or not DECISION.search(self.text(number)):
            return
        known = self.branches.setdefault(number, {}).setdefault(len(taken), [0] * len(taken))
        for i, count in enumerate(taken):
            known[i] += count

    def missed_lines(self):
        return [number for number, count in sorted(self.lines.items()) if count == 0]

    def missed_branches(self):
        """Pairs of a line and how many of its branches nobody took; lines that did not run are told as such."""
        missed = []
        for number, shapes in sorted(self.branches.items()):
            count = sum(1 for shape in shapes.values() for one in shape if one == 0)
            if count > 0 and self.lines[number] > 0:
                missed.append((number, count))
        return missed

    def branch_counts(self):
        every = [one for shapes in self.branches.values() for shape in shapes.values() for one in shape]
        return sum(1 for one in every if one != 0), len(every)


def read(build):
    files = {}
    objects = sorted(path for path in (build / "lib").rglob("*.gcda"))
    if not objects:
        sys.exit(f"report.py: {build}/lib holds no counts; were the tests run?")
    for start in range(0, len(objects), 16):
        some = [str(path) for path in objects[start:start + 16]]
        output = subprocess.run(["gcov", "--json-format", "--stdout", "--branch-probabilities", *some], cwd=build,
                                check=True, stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, text=True).stdout
        for document in output.splitlines():
            data = json.loads(document)
            for entry in data["files"]:
                path = (Path(data["current_working_directory"]) / entry["file"]).resolve()
                if ROOT / "lib" not in path.parents:
                    continue
                file = files.setdefault(path.relative_to(ROOT), None) or File(path)
                files[path.relative_to(ROOT)] = file
                for line in entry["lines"]:
                    file.add(line)
    return files


def percent(part, whole):
    return 100.0 * part / whole if whole else 100.0


def report(files, output):
    lines = branches = all_lines = all_branches = 0
    for path, file in sorted(files.items()):
        missed = file.missed_lines()
        taken, every = file.branch_counts()
        lines += len(file.lines) - len(missed)
        all_lines += len(file.lines)
        branches += taken
        all_branches += every
        output.write(f"{path}: {len(file.lines) - len(missed)} of {len(file.lines)} lines, {taken} of {every} branches\n")
        for number in missed:
            output.write(f"  line {number}: {file.text(number).strip()}\n")
        for number, count in file.missed_branches():
            output.write(f"  branch {number} ({count}): {file.text(number).strip()}\n")
    return (lines, all_lines), (branches, all_branches)


def main(arguments):
    build = Path(arguments[0]).resolve()
    with open(build / "coverage.txt", "w", encoding="utf-8") as output:
        lines, branches = report(read(build), output)
    print(f"lib/: {lines[0]} of {lines[1]} lines ({percent(*lines):.1f} %), "
          f"{branches[0]} of {branches[1]} branches ({percent(*branches):.1f} %)")
    if len(arguments) == 3 and (percent(*lines) < float(arguments[1]) or percent(*branches) < float(arguments[2])):
        sys.exit(f"report.py: at least {arguments[1]} % of the lines and {arguments[2]} % of the branches are demanded")


if __name__ == "__main__":
    if len(sys.argv) not in (2, 4):
        sys.exit("usage: report.py BUILD_DIR [LINES BRANCHES]")
    main(sys.argv[1:])
