# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""What the libraries cost as they are shipped, seen from a host: memory, instructions, size, start-up."""

import os
import re
import shutil
import statistics
import subprocess
import time

TOKENS = (("5 groups", "small"), ("200 groups", "medium"), ("5000 groups", "large"), ("50000 groups", "huge"))
MEMORY_AIM = 6
STARTS = 41
# How many validations are counted: the difference of two runs leaves the start-up and the first one out.
COUNTED = {"small": 100, "medium": 30, "large": 3}
BEFORE_COUNTING = 3


def name_files(directory, token):
    return [os.path.join(directory, token + ending) for ending in (".xml", ".pem")]


def format_row(name, cells):
    return f"  {name:<37}" + "".join(f" {cell:>{width}}" for cell, width in cells)


def heading(title, columns):
    return ["", title, format_row("", columns)]


def measure_memory(build, directory):
    """Memory of one validation: lines for people."""
    files = [path for _, token in TOKENS for path in name_files(directory, token)]
    output = subprocess.run([os.path.join(build, "bin", "quorlin_bench_memory"), *files], check=True, capture_output=True, text=True).stdout
    lines = heading("Memory of one validation, in bytes; the token's text, which the caller holds, not counted",
                    (("text", 9), ("at most", 11), ("x text", 7), ("kept", 11), ("requests", 9), ("aim", 7), ("reached", 7)))
    for (name, _), row in zip(TOKENS, output.splitlines(), strict=True):
        size, peak, kept, requests = map(int, row.split())
        ratio = peak / size
        lines.append(format_row(name, ((size, 9), (peak, 11), (f"{ratio:.2f}", 7), (kept, 11), (requests, 9), (f"<= {MEMORY_AIM}", 7),
                                       ("yes" if ratio <= MEMORY_AIM else "NO", 7))))
    return lines


def count_instructions(valgrind, program, files, count):
    command = [valgrind, "--tool=callgrind", "--callgrind-out-file=/dev/null", program, *files, str(count)]
    output = subprocess.run(command, check=True, capture_output=True, text=True).stderr
    return int(re.search(r"Collected : (\d+)", output).group(1))


def measure_instructions(build, directory):
    """Instructions of one validation as callgrind counts them."""
    title = "Instructions of one validation, counted by callgrind"
    valgrind = shutil.which("valgrind")
    if valgrind is None:
        return ["", "Instructions are not counted: valgrind is absent (Debian package valgrind)."]
    lines = heading(title, (("text", 9), ("instructions", 13), ("a byte", 8)))
    program = os.path.join(build, "bin", "quorlin_bench_once")
    for name, token in TOKENS:
        if token not in COUNTED:
            continue
        files = name_files(directory, token)
        few, many = (count_instructions(valgrind, program, files, BEFORE_COUNTING + more) for more in (0, COUNTED[token]))
        each = (many - few) / COUNTED[token]
        size = os.path.getsize(files[0])
        lines.append(format_row(name, ((size, 9), (f"{each:.0f}", 13), (f"{each / size:.1f}", 8))))
    return lines


def measure_sizes(build):
    """Text and data of the libraries."""
    lines = heading("Size of the shared libraries, in bytes", (("code", 11), ("data", 9), ("zeroed data", 11), ("file", 11)))
    for name in ("libpelmar.so", "libquorlin.so"):
        path = os.path.join(build, "lib", name)
        output = subprocess.run(["size", path], check=True, capture_output=True, text=True).stdout
        text, data, zeroed = output.splitlines()[1].split()[:3]
        lines.append(format_row(name, ((text, 11), (data, 9), (zeroed, 11), (os.path.getsize(path), 11))))
    return lines


def time_start(command):
    """Wall and processor time of one run, in milliseconds."""
    start = time.perf_counter()
    process = os.posix_spawn(command[0], command, os.environ)
    _, status, usage = os.wait4(process, 0)
    wall = time.perf_counter() - start
    if status != 0:
        raise RuntimeError(f"{command[0]} fails")
    return 1000 * wall, 1000 * (usage.ru_utime + usage.ru_stime)


def measure_start(build, directory):
    """From the start of a process to its end, after no and after one token."""
    program = os.path.join(build, "bin", "quorlin_bench_once")
    files = name_files(directory, "small")
    commands = (("a program that does nothing (true)", [shutil.which("true")]),
                ("a host that validates no token", [program, *files, "0"]),
                ("a host that validates its first token", [program, *files, "1"]))
    times = {name: [] for name, _ in commands}
    for _ in range(STARTS):
        for name, command in commands:
            times[name].append(time_start(command))
    lines = heading("From the start of a process to its end, in milliseconds", (("by the clock", 13), ("processor", 10)))
    for name, _ in commands:
        wall, processor = (statistics.median(column) for column in zip(*times[name]))
        lines.append(format_row(name, ((f"{wall:.1f}", 13), (f"{processor:.1f}", 10))))
    return lines


def measure_all(build, directory):
    """All of it, as lines of text."""
    return [*measure_memory(build, directory), *measure_instructions(build, directory), *measure_sizes(build),
            *measure_start(build, directory)]
