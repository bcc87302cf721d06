# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""docs/benchmarks.md has the two marks between which `./dev bench` writes, and there tables and pictures; the pictures are there, well-formed, and no others are. What
draws them gives the same bytes for the same results, and a page that lost a mark is refused."""

import copy
import re
import sys
import xml.etree.ElementTree as ElementTree

from pages import finish, read_root

sys.path.insert(0, str(read_root() / "bench"))

import charts
import report

IMAGE = re.compile(r"!\[[^\]]+\]\(([^)]+)\)")
SVG = "{http://www.w3.org/2000/svg}"


def make_figure(median):
    return {"median": median, "spread": 0.01}


def make_row(name, size, others=()):
    return {"name": name, "bytes": size, "microseconds": make_figure(size / 50), "floor": make_figure(size / 100), "ratio": 2, "aim": 1.5,
            "others": [{"name": other, "microseconds": make_figure(size / 10)} for other in ("cryptography", *others)]}


def make_results():
    rows = [make_row(f"{groups} groups", 1000 + 100 * groups, ("a <peer>",)) for groups in (5, 200, 5000)] + [make_row("50000 groups", 5000000)]
    return {"sections": [{"title": "Validating a token, against the floor", "rows": rows}],
            "callers": [{"callers": 1, "perSecond": make_figure(900), "plainPerSecond": make_figure(1000)}]}


def check_page(root):
    """What is wrong with the page and the pictures beside it."""
    text = (root / "docs" / "benchmarks.md").read_text(encoding="utf-8")
    try:
        report.replace_measured(text, "")
    except ValueError as error:
        return [str(error)]
    measured = text[text.index(report.BEGIN):text.index(report.END)]
    faults = [] if measured.count("\n```\n") == 2 else ["the measured part is not one block of tables"]
    named = IMAGE.findall(measured)
    there = sorted(path.name for path in (root / "docs").glob("bench-*.svg"))
    if sorted(named) != there or not named:
        faults.append(f"the page shows {named}, but there are {there}")
    for name in there:
        faults += check_picture(name, (root / "docs" / name).read_text(encoding="utf-8"))
    return faults


def check_picture(name, picture):
    try:
        element = ElementTree.fromstring(picture)
    except ElementTree.ParseError as error:
        return [f"{name}: {error}"]
    faults = [] if element.tag == SVG + "svg" else [f"{name}: not a picture"]
    title = element.find(SVG + "title")
    if title is None or not title.text:
        faults.append(f"{name}: no title")
    return faults


def check_drawing():
    """What is wrong with how pictures are drawn of results that are no measured ones."""
    results = make_results()
    pictures = charts.draw_all(results)
    faults = [fault for name, _, picture in pictures for fault in check_picture(name, picture)]
    if [name for name, _, _ in pictures] != [name for name, _, _ in charts.CHARTS]:
        faults.append("not every picture is drawn")
    if charts.draw_all(copy.deepcopy(results)) != pictures:
        faults.append("the same results give other pictures")
    for row in results["sections"][0]["rows"]:
        del row["others"][1:]
    if "bench-peers.svg" in [name for name, _, _ in charts.draw_all(results)]:
        faults.append("the peers are drawn although there are none")
    return faults


def check_replacing():
    """What is wrong with how the measured part of a page is replaced."""
    page = f"before\n{report.BEGIN}\nold\n{report.END}\nafter\n"
    replaced = report.replace_measured(page, "new\n")
    faults = [] if replaced == f"before\n{report.BEGIN}\n\nnew\n\n{report.END}\nafter\n" else [f"the measured part is not replaced alone: {replaced!r}"]
    for bad in ("nothing", page + report.BEGIN, f"{report.END}\n{report.BEGIN}"):
        try:
            report.replace_measured(bad, "new")
            faults.append(f"a page without its marks is written: {bad!r}")
        except ValueError:
            pass
    return faults


def main():
    root = read_root()
    finish(check_page(root) + check_drawing() + check_replacing(), f"{len(charts.CHARTS)} pictures")


main()
