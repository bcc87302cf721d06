# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""The project in docs/getting-started.md builds against the installed package, and its program greets alice.

usage: checkGettingStarted.py CMAKE BUILD_DIRECTORY COMPILER QUORLIN
"""

import json
import subprocess
import sys
import tempfile
from pathlib import Path

from pages import Page, finish, read_root


def find_block(page, language):
    blocks = [block.text for block in page.blocks if block.language == language]
    if len(blocks) != 1:
        sys.exit(f"{page.name} has {len(blocks)} blocks in {language}, and not one")
    return blocks[0]


def run(*command):
    result = subprocess.run(command, capture_output=True, text=True, check=False)
    if result.returncode:
        sys.exit(f"{command}: {result.returncode}\n{result.stdout}{result.stderr}")
    return result.stdout


def build(page, cmake, tree, compiler, url, folder):
    """The program, which has the port and the folder of certificates of the service that runs now."""
    source = find_block(page, "cpp").replace("https://127.0.0.1:8443/sts", url).replace("/tmp/sts/", f"{folder}/")
    (folder / "CMakeLists.txt").write_text(find_block(page, "cmake"), encoding="utf-8")
    (folder / "hello.cpp").write_text(source, encoding="utf-8")
    prefix = folder / "prefix"
    run(cmake, "--install", tree, "--prefix", prefix)
    run(cmake, "-S", folder, "-B", folder / "hello-build", f"-DCMAKE_PREFIX_PATH={prefix}", f"-DCMAKE_CXX_COMPILER={compiler}",
        "-G", "Ninja")
    run(cmake, "--build", folder / "hello-build")
    return folder / "hello-build" / "hello"


def main():
    cmake, tree, compiler, quorlin = sys.argv[1:]
    root = read_root()
    page = Page(root, root / "docs" / "getting-started.md")
    with tempfile.TemporaryDirectory() as name:
        command = [quorlin, "sts", "--write-certs", name]
        with subprocess.Popen(command, stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, text=True) as sts:
            try:
                url = json.loads(sts.stdout.readline())["url"]
                greeting = run(build(page, cmake, tree, compiler, url, Path(name)))
            finally:
                sts.terminate()
    faults = [] if greeting == "hello alice\n" else [f"the program says: {greeting}"]
    finish(faults, "1 program")


main()
