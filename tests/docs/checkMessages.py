# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""docs/errors.md, or docs/kerberos.md, tells every message that the libraries can throw, and docs/logging.md every line that they
log.

The texts are taken from the sources: every string literal in code of lib/ that reads like words. What a message is put together
from is looked for piece by piece.
"""

import re

from pages import finish, read_root

TOKEN = re.compile(r'//[^\n]*|/\*.*?\*/|"(?:[^"\\\n]|\\.)*"|\'(?:[^\'\\\n]|\\.)*\'', re.DOTALL)
WORDS = re.compile(r"[A-Za-z]{2,}[a-z]* [A-Za-z]+|^[A-Z][a-z]{3,}\b.*[:'`]$")

# Lines on which literals are not for a person: fatal checks show their condition (docs/errors.md tells about them in general).
OTHER = re.compile(r"\bVerify\(|VerifyFailed\(|PanicNotReached|static_assert|#include|#error")

# Literals that read like words and are neither message nor log line.
NO_MESSAGES = {
    "Accept-Encoding: identity",
    "Proxy-Connection:",
}


def unescape(literal):
    return re.sub(r"\\(.)", lambda match: {"n": "\n", "t": "\t"}.get(match.group(1), match.group(1)), literal)


def read_literals(text):
    """The string literals of a C++ source with their offsets, adjacent ones joined as the compiler joins them."""
    literals = []
    end = 0
    for match in TOKEN.finditer(text):
        if match.group().startswith(("//", "/*", "'")):
            continue
        value = unescape(match.group()[1:-1])
        if literals and not text[end : match.start()].strip():
            literals[-1][1] += value
        else:
            literals.append([match.start(), value])
        end = match.end()
    return literals


def is_other(text, offset):
    """Whether the statement that the literal stands in is one whose texts are not told."""
    start = max(text.rfind(mark, 0, offset) for mark in ";{}")
    return OTHER.search(text[start + 1 : offset]) is not None


def normalise(text):
    text = re.sub(r"%[\ds]", "…", text)
    return re.sub(r"\s+", " ", text).strip(" '`\".:;,()[]{}=")


def main():
    root = read_root()
    told = ""
    for name in ("errors.md", "kerberos.md", "logging.md"):
        page = (root / "docs" / name).read_text(encoding="utf-8")
        told += re.sub(r"\s+", " ", page.replace("\\|", "|").replace("\\", "")) + "\n"
    faults = []
    count = 0
    for path in sorted((root / "lib").rglob("*.[ch]*")):
        if path.suffix in (".h", ".cpp"):
            text = path.read_text(encoding="utf-8")
            for offset, literal in read_literals(text):
                if not WORDS.search(literal) or literal in NO_MESSAGES or is_other(text, offset):
                    continue
                count += 1
                if normalise(literal) not in told:
                    line = text.count("\n", 0, offset) + 1
                    faults.append(f"{path.relative_to(root)}:{line}: not told: {literal}")
    finish(faults, f"{count} texts")


main()
