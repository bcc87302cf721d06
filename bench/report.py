#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
"""usage: bench/report.py BUILD

Runs everything that the build tree BUILD has of the benchmarks, prints the tables, and writes them with their pictures into docs/.
"""

import datetime
import json
import os
import pathlib
import subprocess
import sys

import charts
import shippedFigures

BEGIN = "<!-- measured: from here to the end mark ./dev bench writes -->"
END = "<!-- measured: end -->"


def run_bench(build, directory):
    """Its output, which is also shown as it comes."""
    command = [os.path.join(build, "bin", "quorlin_bench"), "--directory", directory]
    output = []
    with subprocess.Popen(command, stdout=subprocess.PIPE, text=True) as process:
        for line in process.stdout:
            print(line, end="", flush=True)
            output.append(line.rstrip("\n"))
    if process.returncode != 0:
        sys.exit(process.returncode)
    return output


def read_first(path, key):
    """The value of the first line "key ... : value" or "key=value"."""
    for line in pathlib.Path(path).read_text(encoding="utf-8").splitlines():
        if line.startswith(key):
            return line.replace("=", ":", 1).split(":", 1)[1].strip().strip('"')
    return "unknown"


def ask(*command):
    try:
        return subprocess.run(command, check=True, capture_output=True, text=True).stdout.splitlines()[0]
    except (OSError, subprocess.CalledProcessError, IndexError):
        return "unknown"


def describe_machine(load):
    versions = ", ".join(f"{name} {ask('pkg-config', '--modversion', module)}"
                         for name, module in (("OpenSSL", "openssl"), ("expat", "expat"), ("libcurl", "libcurl")))
    return (f"{os.cpu_count()} × {read_first('/proc/cpuinfo', 'model name')}, {read_first('/etc/os-release', 'PRETTY_NAME')}, "
            f"{ask('c++', '--version')}, -O2, {versions}; {datetime.date.today().isoformat()}, load at the start {load:.1f}.")


def replace_measured(page, measured):
    """The page with everything between its two marks replaced. Throws ValueError when they do not stand there once, in order."""
    if page.count(BEGIN) != 1 or page.count(END) != 1 or page.index(BEGIN) > page.index(END):
        raise ValueError("the page does not have its two marks, once each and in order")
    before, _, rest = page.partition(BEGIN)
    _, _, after = rest.partition(END)
    return f"{before}{BEGIN}\n\n{measured}\n{END}{after}"


def compose_measured(machine, pictures, table):
    images = "\n\n".join(f"![{caption}]({name})" for name, caption, _ in pictures)
    text = "\n".join(line.rstrip() for line in table).strip("\n")
    return f"{machine}\n\n{images}\n\n```\n{text}\n```\n"


def write_report(docs, machine, results, table):
    """Into the page and the pictures beside it; pictures of which there are no results go."""
    pictures = charts.draw_all(results)
    page = docs / "benchmarks.md"
    page.write_text(replace_measured(page.read_text(encoding="utf-8"), compose_measured(machine, pictures, table)), encoding="utf-8")
    for old in docs.glob("bench-*.svg"):
        old.unlink()
    for name, _, picture in pictures:
        (docs / name).write_text(picture, encoding="utf-8")


def main():
    if len(sys.argv) != 2:
        sys.exit(__doc__)
    build = sys.argv[1]
    directory = os.path.join(build, "bench", "run")
    os.makedirs(directory, exist_ok=True)
    print("Measuring everything in turns; the tables come at the end.", flush=True)
    machine = describe_machine(os.getloadavg()[0])
    table = run_bench(build, directory)
    shipped = shippedFigures.measure_all(build, directory)
    print("\n".join(shipped))
    results = json.loads(pathlib.Path(directory, "results.json").read_text(encoding="utf-8"))
    docs = pathlib.Path(__file__).resolve().parents[1] / "docs"
    write_report(docs, machine, results, table + shipped)
    print("\nThe tables and their pictures are in docs/benchmarks.md.")


if __name__ == "__main__":
    main()
