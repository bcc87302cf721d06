# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""What was built is hardened, as its own headers say.

usage: hardeningIsOn.py BUILD_DIRECTORY PROGRAM_OR_LIBRARY...

Of each file: position independent, relocations read-only from the start, no executable stack, no writable code, a stack
protector, no search path but beside itself. Of each object of ours: the marks of control-flow protection. The linker takes these
out of a file when the C library's start files lack them, and then they are not looked for there. Of each of our sources:
compiled with _FORTIFY_SOURCE=3, since what a file calls does not tell whether there was nothing to protect.
"""

import json
import re
import subprocess
import sys
from pathlib import Path

CONTROL_FLOW = {"x86_64": ("IBT", "SHSTK"), "aarch64": ("BTI", "PAC")}


def run(*command):
    return subprocess.run(command, check=True, capture_output=True, text=True, env={"LC_ALL": "C", "PATH": "/usr/bin:/bin"}).stdout


def read_marks(path):
    """The marks in the notes of a file; for an archive, those of each member."""
    members = re.split(r"^File: .*$", run("readelf", "-nW", path), flags=re.MULTILINE)
    return [set(re.findall(r"\b(?:IBT|SHSTK|BTI|PAC)\b", member)) for member in members if member.strip()]


def check_file(path, marks):
    header, segments = run("readelf", "-hW", path), run("readelf", "-lW", path)
    dynamic, symbols = run("readelf", "-dW", path), run("readelf", "-sW", "--dyn-syms", path)
    if not re.search(r"Type:\s+DYN", header):
        yield "is not position independent"
    if "GNU_RELRO" not in segments or not re.search(r"\(FLAGS\).*BIND_NOW", dynamic):
        yield "has relocations that stay writable"
    if not re.search(r"GNU_STACK.* RW ", segments):
        yield "has an executable stack"
    if re.search(r"LOAD.* RWE ", segments) or "TEXTREL" in dynamic:
        yield "has writable code"
    if "__stack_chk_fail" not in symbols:
        yield "has no stack protector"
    for search in re.findall(r"\((?:RPATH|RUNPATH)\).*\[(.*)\]", dynamic):
        if not all(part.startswith("$ORIGIN") for part in search.split(":")):
            yield f"looks for libraries in {search}"
    for mark in marks:
        if not all(mark in found for found in read_marks(path)):
            yield f"lacks the mark {mark}"


def check_objects(build, marks):
    """Our own code, whatever the start files are. Our sources are those below lib and apps."""
    objects = [path for folder in ("lib", "apps") for path in (build / folder).rglob("*.o")]
    for path in objects:
        for mark in marks:
            if not all(mark in found for found in read_marks(path) or [set()]):
                yield f"{path.name}: lacks the mark {mark}"
    if not objects:
        yield "there are no objects to look at"


def check_commands(build):
    commands = json.loads((build / "compile_commands.json").read_text(encoding="utf-8"))
    ours = [entry for entry in commands if re.match(r"(?:.*/)?(?:lib|apps)/", str(Path(entry["file"]).relative_to(build.parent))
                                                   if build.parent in Path(entry["file"]).parents else "")]
    for entry in ours:
        if "-D_FORTIFY_SOURCE=3" not in entry["command"]:
            yield f"{entry['file']}: is compiled without _FORTIFY_SOURCE=3"
    if not ours:
        yield "there are no commands to look at"


def main():
    build, files = Path(sys.argv[1]), [Path(name) for name in sys.argv[2:]]
    machine = run("uname", "-m").strip()
    marks = CONTROL_FLOW.get(machine, ())
    start_files = [run("gcc", f"-print-file-name={name}").strip() for name in ("crti.o", "crtbeginS.o")]
    linked_marks = [mark for mark in marks if all(mark in found for name in start_files for found in read_marks(name) or [set()])]
    faults = [f"{path.name}: {fault}" for path in files for fault in check_file(path, linked_marks)]
    faults += check_objects(build, marks)
    faults += check_commands(build)
    for fault in faults:
        print(fault)
    if faults or not files:
        sys.exit(f"{len(faults)} fault(s) in {len(files)} files")
    print(f"checked {len(files)} files; control-flow marks in the objects: {' '.join(marks) or 'none on this machine'}; "
          f"in the files: {' '.join(linked_marks) or 'none, as the start files have none'}")


main()
