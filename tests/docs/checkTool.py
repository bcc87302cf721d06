# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""The JSON in docs/command-line.md is what the tool prints, but for dates, identifiers and digests; its tables name every command
and every exit code, and docs/dev-sts.md every switch of the service.

usage: checkTool.py QUORLIN
"""

import json
import re
import subprocess
import sys
import tempfile

from pages import Page, finish, read_root
from world import World

MARK = re.compile(r"<!-- tool: (\w+) -->")
MASKS = (
    (re.compile(r"\d{4}-\d\d-\d\dT[\d:.]+Z"), "DATE"),
    (re.compile(r"_[0-9a-f]{8}(-[0-9a-f]{4}){3}-[0-9a-f]{12}"), "ID"),
    (re.compile(r"\b[0-9a-f]{64}\b"), "SHA256"),
)


def normalise(text):
    text = json.dumps(json.loads(text), indent=1)
    for pattern, mask in MASKS:
        text = pattern.sub(mask, text)
    return text


def run_all(world):
    alice = ["acquire", "password", "--user", "alice@example.com", "--password-stdin", "--json"]
    token = world.path("token.xml")
    return {
        "token": world.ask([*alice, "--audience", "https://files.example.com/", "--out", token], "secret\n"),
        "error": world.ask(alice, "wrong\n", 1),
        "verdict": world.ask(["validate", "--token", token, "--json"]),
    }


def read_commands(program, command=()):
    """The commands that have no commands below them."""
    text = subprocess.run([program, *command, "--help"], capture_output=True, text=True, check=True).stdout
    section = re.search(r"^Subcommands:\n((?:  .*\n)+)", text, re.MULTILINE)
    if not section:
        return [" ".join(("quorlin", *command))]
    names = re.findall(r"^  (\S+)", section.group(1), re.MULTILINE)
    return [found for name in names for found in read_commands(program, (*command, name))]


def find_untold_switches(program, root):
    """The switches of "quorlin sts" that no row of its page begins with."""
    text = subprocess.run([program, "sts", "--help"], capture_output=True, text=True, check=True).stdout
    rows = [line for line in Page(root, root / "docs" / "dev-sts.md").lines if line.startswith("| `--")]
    told = re.findall(r"`(--[\w-]+)", "\n".join(row.split("|")[1] for row in rows))
    return sorted(set(re.findall(r"^  (--[\w-]+)", text, re.MULTILINE)) - set(told))


def main():
    root = read_root()
    page = Page(root, root / "docs" / "command-line.md")
    with tempfile.TemporaryDirectory() as folder, World(sys.argv[1], folder) as world:
        outputs = run_all(world)
    faults = []
    shown = {MARK.fullmatch(block.before).group(1): block for block in page.blocks if MARK.fullmatch(block.before)}
    for name, output in outputs.items():
        if name not in shown or normalise(shown[name].text) != normalise(output):
            faults.append(f"{page.name}: the tool prints as {name}\n{normalise(output)}")
    commands = read_commands(sys.argv[1])
    table = "\n".join(page.lines)
    faults += [f"{page.name}: does not name {command}" for command in commands if f"| `{command}` |" not in table]
    codes = (root / "apps" / "quorlin" / "ExitCode.h").read_text(encoding="utf-8")
    for code in re.findall(r"EXIT_\w+ = (\d+)", codes):
        if f"\n| {code} | " not in table:
            faults.append(f"{page.name}: does not tell exit code {code}")
    faults += [f"docs/dev-sts.md: does not tell {switch}" for switch in find_untold_switches(sys.argv[1], root)]
    finish(faults, f"{len(outputs)} outputs and {len(commands)} commands")


main()
