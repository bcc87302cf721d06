# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""Every C++ block of a page compiles against the public headers.

A block that stands in examples/ word for word is compiled with the example. A block with an #include is a file of its own. Any
other is the body of a function that sees the names of prelude.h. All are C++11, like the headers.

usage: checkCode.py COMPILER INCLUDE_DIRECTORY...
"""

import subprocess
import sys
import tempfile
import textwrap
from pathlib import Path

from pages import finish, read_pages, read_root


def read_examples(root):
    return [path.read_text(encoding="utf-8") for path in sorted((root / "examples").glob("*.cpp"))]


def is_of_example(text, examples):
    """Whether an example has these lines one after the other, all indented alike."""
    for indent in ("", "  ", "    "):
        if any("\n" + textwrap.indent(text, indent) in example for example in examples):
            return True
    return False


def place_of(block):
    """Lets the compiler name the page and its line."""
    return f'#line {block.line} "{block.page}"\n'


def write_units(blocks):
    """The files to compile: one for each block with an #include, and one for all others."""
    units = [place_of(block) + block.text for block in blocks if "#include" in block.text]
    bodies = '#include "prelude.h"\n'
    for number, block in enumerate(block for block in blocks if "#include" not in block.text):
        bodies += f"void Block{number}();\nvoid Block{number}() {{\n{place_of(block)}{block.text}}}\n"
    return [*units, bodies]


def compile_unit(compiler, directories, text, folder):
    """The compiler's complaints; empty when there are none."""
    file = folder / "unit.cpp"
    file.write_text(text, encoding="utf-8")
    command = [compiler, "-std=c++11", "-Wall", "-Wextra", "-Werror", "-Wno-unused", "-fsyntax-only"]
    command += [f"-I{directory}" for directory in [Path(__file__).parent, *directories]]
    result = subprocess.run([*command, str(file)], capture_output=True, text=True, check=False)
    return result.stderr if result.returncode else ""


def main():
    compiler, *directories = sys.argv[1:]
    root = read_root()
    examples = read_examples(root)
    blocks = [block for page in read_pages(root) for block in page.blocks if block.language in ("cpp", "c++", "c")]
    others = [block for block in blocks if not is_of_example(block.text, examples)]
    with tempfile.TemporaryDirectory() as folder:
        complaints = [compile_unit(compiler, directories, unit, Path(folder)) for unit in write_units(others)]
    faults = [complaint for complaint in complaints if complaint]
    finish(faults, f"{len(blocks)} blocks, of which {len(blocks) - len(others)} are parts of examples")


main()
