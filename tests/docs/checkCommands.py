# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""Every command line of quorlin and ./dev that a page shows, in a block or in the text, has a command and flags that are there.

usage: checkCommands.py QUORLIN
"""

import re
import shlex
import subprocess
import sys

from pages import finish, read_pages, read_root

SHELL = ("", "sh", "bash", "shell", "console")
PLACEHOLDER = "COMMAND"
INLINE = re.compile(r"`((?:quorlin|\./dev) [^`]*)`")


class Tool:
    """What `quorlin ... --help` says."""

    def __init__(self, program):
        self._program = program
        self._texts = {}

    def read_help(self, command):
        key = tuple(command)
        if key not in self._texts:
            result = subprocess.run([self._program, *command, "--help"], capture_output=True, text=True, check=False)
            self._texts[key] = result.stdout if result.returncode == 0 else ""
        return self._texts[key]

    def read_subcommands(self, command):
        section = re.search(r"^Subcommands:\n((?:  .*\n)+)", self.read_help(command), re.MULTILINE)
        return re.findall(r"^  (\S+)", section.group(1), re.MULTILINE) if section else []

    def read_flags(self, command):
        text = self.read_help(command)
        flags = set(re.findall(r"^  (?:-\w,)?(--[\w-]+)", text, re.MULTILINE))
        return flags | set(re.findall(r"^  (-\w)\b", text, re.MULTILINE))


def check_quorlin(tool, words):
    command = []
    words = words[1:]
    while words and words[0] in tool.read_subcommands(command):
        command.append(words.pop(0))
    if words and words[0] == PLACEHOLDER:
        return ""
    if words and tool.read_subcommands(command) and not words[0].startswith("-"):
        return f"there is no command '{' '.join(command + words[:1])}'"
    flags = tool.read_flags(command)
    for word in words:
        if re.match(r"--?[a-z]", word) and word.split("=")[0] not in flags:
            return f"quorlin {' '.join(command)} has no {word}"
    return ""


def check_dev(usage, words):
    names = re.findall(r"^  ([a-z]+)", usage, re.MULTILINE)
    if len(words) > 1 and words[1] not in names and words[1] != PLACEHOLDER:
        return f"./dev has no command '{words[1]}'"
    return ""


def split_commands(text):
    """The simple commands of a shell text: continued lines joined, pipes and lists taken apart."""
    text = re.sub(r"\\\n", " ", text)
    for line in text.split("\n"):
        line = re.sub(r"^\$ ", "", line.strip())
        try:
            lexer = shlex.shlex(line, posix=True, punctuation_chars="|&;()")
            lexer.whitespace_split = True
            words = list(lexer)
        except ValueError:
            continue
        command = []
        for word in [*words, ";"]:
            if set(word) <= set("|&;()"):
                if command:
                    yield command
                command = []
            else:
                command.append(word)


def read_commands(page):
    for block in page.blocks:
        if block.language in SHELL:
            for words in split_commands(block.text):
                yield str(block), words
    for number, line in enumerate(page.lines, 1):
        for match in INLINE.finditer(line):
            for words in split_commands(match.group(1)):
                yield f"{page.name}:{number}", words


def main():
    tool = Tool(sys.argv[1])
    root = read_root()
    usage = subprocess.run([str(root / "dev"), "help"], capture_output=True, text=True, check=True).stdout
    faults = []
    count = 0
    for page in read_pages(root):
        for place, words in read_commands(page):
            if words[0] in ("quorlin", "build/bin/quorlin"):
                fault = check_quorlin(tool, words)
            elif words[0] == "./dev":
                fault = check_dev(usage, words)
            else:
                continue
            count += 1
            if fault:
                faults.append(f"{place}: {fault}")
    finish(faults, f"{count} commands")


main()
