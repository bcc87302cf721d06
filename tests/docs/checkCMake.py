# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""Every CMake block of a page configures, in a project of its own, against the installed package or against the sources.

What add_subdirectory or FetchContent would bring in is this source tree: nothing is fetched.

usage: checkCMake.py CMAKE BUILD_DIRECTORY COMPILER
"""

import re
import subprocess
import sys
import tempfile
from pathlib import Path

from pages import finish, read_pages, read_root

HEAD = "cmake_minimum_required(VERSION 3.25)\nproject(page LANGUAGES CXX)\n"


def write_project(block, root, folder):
    """A project with the block in it and an empty source for each that it names."""
    (folder / "CMakeLists.txt").write_text(("" if "project(" in block.text else HEAD) + block.text, encoding="utf-8")
    for name in re.findall(r"[\w/]+\.cpp", block.text):
        (folder / name).write_text("int main() {}\n", encoding="utf-8")
    third_party = re.search(r"add_subdirectory\((\S+)\)", block.text)
    if third_party:
        (folder / third_party.group(1)).parent.mkdir(parents=True)
        (folder / third_party.group(1)).symlink_to(root, target_is_directory=True)


def configure(cmake, compiler, root, prefix, folder):
    command = [cmake, "-S", folder, "-B", folder / "build", "-G", "Ninja", f"-DCMAKE_CXX_COMPILER={compiler}"]
    command += [f"-DCMAKE_PREFIX_PATH={prefix}", f"-DFETCHCONTENT_SOURCE_DIR_QUORLIN={root}"]
    result = subprocess.run(command, capture_output=True, text=True, check=False)
    return result.stderr if result.returncode else ""


def main():
    cmake, build, compiler = sys.argv[1:]
    root = read_root()
    blocks = [block for page in read_pages(root) for block in page.blocks if block.language == "cmake"]
    faults = []
    with tempfile.TemporaryDirectory() as folder:
        prefix = Path(folder) / "prefix"
        subprocess.run([cmake, "--install", build, "--prefix", prefix], check=True, stdout=subprocess.DEVNULL)
        for number, block in enumerate(blocks):
            project = Path(folder) / str(number)
            project.mkdir()
            write_project(block, root, project)
            complaints = configure(cmake, compiler, root, prefix, project)
            if complaints:
                faults.append(f"{block}: does not configure\n{complaints}")
    finish(faults, f"{len(blocks)} blocks")


main()
