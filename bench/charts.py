# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""Draws the benchmark's results (results.json) as SVG pictures. The same results give the same bytes. Each picture brings its own background, a light or a
dark one as the reader prefers."""

import html
import math

WIDTH = 860
MARGIN = 16
FONT_SIZE = 13
ROW_HEIGHT = 19
LABEL_WIDTH = 270
VALUE_WIDTH = 80

STYLE = """<style>
.paper{fill:#ffffff}.ink{fill:#1f2328}.faint{stroke:#d0d7de}.mark{stroke:#1f2328}
.a{fill:#0969da}.b{fill:#8c959f}.c{fill:#bc4c00}.d{fill:#8250df}
.la{stroke:#0969da}.lb{stroke:#8c959f}.lc{stroke:#bc4c00}.ld{stroke:#8250df}
@media (prefers-color-scheme:dark){.paper{fill:#1c2128}.ink{fill:#e6edf3}.faint{stroke:#444c56}.mark{stroke:#e6edf3}
.a{fill:#539bf5}.b{fill:#768390}.c{fill:#e0823d}.d{fill:#b083f0}.la{stroke:#539bf5}.lb{stroke:#768390}.lc{stroke:#e0823d}.ld{stroke:#b083f0}}
</style>"""

OURS, FLOOR, OTHER, SECOND = "a", "b", "c", "d"


def text(x, y, content, anchor="start", bold=False):
    weight = ' font-weight="bold"' if bold else ""
    return f'<text class="ink" x="{x:.0f}" y="{y:.0f}" text-anchor="{anchor}"{weight}>{html.escape(content, quote=False)}</text>'


def line(x1, y1, x2, y2, style, width=1):
    return f'<line class="{style}" x1="{x1:.1f}" y1="{y1:.1f}" x2="{x2:.1f}" y2="{y2:.1f}" stroke-width="{width}"/>'


def picture(height, title, parts):
    return "\n".join([
        f'<svg xmlns="http://www.w3.org/2000/svg" width="{WIDTH}" height="{height:.0f}" viewBox="0 0 {WIDTH} {height:.0f}" role="img" '
        f'font-family="DejaVu Sans, Verdana, sans-serif" font-size="{FONT_SIZE}">',
        f"<title>{html.escape(title, quote=False)}</title>", STYLE,
        f'<rect class="paper" width="{WIDTH}" height="{height:.0f}" rx="8"/>',
        text(MARGIN, MARGIN + FONT_SIZE, title, bold=True), *parts, "</svg>", ""])


def format_number(value):
    """Three digits that mean something."""
    return f"{value:.0f}" if value >= 100 else f"{value:.1f}" if value >= 10 else f"{value:.2f}"


class Bar:
    """A bar of a chart: what it is, how long, in which colour, and where its aim is if there is one."""

    def __init__(self, label, value, colour, aim=0):
        self.label = label
        self.value = value
        self.colour = colour
        self.aim = aim


def draw_bars(title, groups, unit, logarithmic=False):
    """Bars below each other, in groups (heading, bars)."""
    values = [bar.value for _, bars in groups for bar in bars] + [bar.aim for _, bars in groups for bar in bars]
    longest = max(values)
    left = LABEL_WIDTH + MARGIN
    room = WIDTH - left - VALUE_WIDTH - MARGIN
    # A logarithmic bar starts at half of the shortest one.
    low = min(value for value in values if value > 0) / 2

    def measure(value):
        if logarithmic:
            return room * math.log(value / low) / math.log(longest / low)
        return room * value / longest

    parts = []
    y = MARGIN + 2 * ROW_HEIGHT
    for heading, bars in groups:
        y += ROW_HEIGHT * 0.7
        parts.append(text(MARGIN, y, heading, bold=True))
        y += 7
        for bar in bars:
            length = max(measure(bar.value), 1)
            parts.append(text(left - 8, y + FONT_SIZE, bar.label, "end"))
            parts.append(f'<rect class="{bar.colour}" x="{left}" y="{y + 2:.1f}" width="{length:.1f}" height="{ROW_HEIGHT - 5}"/>')
            end = left + length
            if bar.aim:
                at = left + measure(bar.aim)
                parts.append(line(at, y, at, y + ROW_HEIGHT - 1, "mark", 2))
                end = max(end, at)
            parts.append(text(end + 6, y + FONT_SIZE, f"{format_number(bar.value)}{unit}"))
            y += ROW_HEIGHT
        y += 6
    return picture(y + MARGIN, title, parts)


def draw_peers(results):
    """Each contender in times the floor, token by token."""
    groups = []
    for row in results["sections"][0]["rows"]:
        # Of the longest token there are no peers: the picture of the growth has it.
        if len(row["others"]) < 2:
            continue
        floor = row["floor"]["median"]
        alone, *peers = row["others"]
        bars = [Bar(alone["name"], alone["microseconds"]["median"] / floor, FLOOR), Bar("the floor", 1, FLOOR),
                Bar("libquorlin", row["ratio"], OURS, row["aim"])]
        bars += [Bar(peer["name"], peer["microseconds"]["median"] / floor, OTHER) for peer in peers]
        groups.append((f'{row["name"]} ({row["bytes"]:,} bytes, floor {format_number(floor)} µs)', bars))
    if not groups:
        return ""
    return draw_bars("Validating a token: processor time in times the floor, logarithmic (mark: our aim)", groups, " ×", logarithmic=True)


def draw_ratios(results):
    """Every row in times its floor."""
    groups = [(section["title"].split(",")[0].split(":")[0],
               [Bar(row["name"], row["ratio"], OURS, row["aim"]) for row in section["rows"]])
              for section in results["sections"]]
    return draw_bars("Processor time in times the floor of each (mark: our aim)", groups, " ×")


def draw_callers(results):
    """Acquisitions in a second by number of callers."""
    groups = [(f'{row["callers"]} caller{"s" if row["callers"] > 1 else ""}',
               [Bar("libquorlin", row["perSecond"]["median"], OURS),
                Bar("libcurl alone and the validation", row["plainPerSecond"]["median"], FLOOR)])
              for row in results["callers"]]
    return draw_bars("Acquisitions over HTTPS in a second, handshakes resumed", groups, " /s")


def list_ticks(low, high):
    """The powers of ten from low to high."""
    return [10.0 ** power for power in range(math.floor(math.log10(low)), math.ceil(math.log10(high)) + 1)]


def describe_tick(value, units):
    for factor, unit in units:
        if value >= factor:
            return f"{value / factor:g} {unit}"
    return f"{value:g}"


def draw_growth(results):
    """Time over size, both logarithmic, where linear growth is a straight line that rises by a decade for each decade."""
    rows = results["sections"][0]["rows"][:4]
    curves = [("libquorlin", OURS, [(row["bytes"], row["microseconds"]["median"]) for row in rows]),
              ("the floor", FLOOR, [(row["bytes"], row["floor"]["median"]) for row in rows]),
              (rows[0]["others"][0]["name"], SECOND, [(row["bytes"], row["others"][0]["microseconds"]["median"]) for row in rows])]
    x_ticks = list_ticks(min(row["bytes"] for row in rows), max(row["bytes"] for row in rows))
    times = [time for _, _, points in curves for _, time in points]
    y_ticks = list_ticks(min(times), max(times))
    left, right, top, bottom = 90, WIDTH - 230, 56, 400

    def place(size, time):
        x = left + (right - left) * math.log(size / x_ticks[0]) / math.log(x_ticks[-1] / x_ticks[0])
        y = bottom - (bottom - top) * math.log(time / y_ticks[0]) / math.log(y_ticks[-1] / y_ticks[0])
        return x, y

    parts = []
    for tick in x_ticks:
        x, _ = place(tick, y_ticks[0])
        parts += [line(x, top, x, bottom, "faint"), text(x, bottom + 20, describe_tick(tick, ((1e6, "MB"), (1e3, "kB"))), "middle")]
    for tick in y_ticks:
        _, y = place(x_ticks[0], tick)
        parts += [line(left, y, right, y, "faint"), text(left - 8, y + 5, describe_tick(tick, ((1e3, "ms"), (1, "µs"))), "end")]
    for name, colour, points in curves:
        places = [place(*point) for point in points]
        path = " ".join(f"{x:.1f},{y:.1f}" for x, y in places)
        parts.append(f'<polyline class="l{colour}" fill="none" stroke-width="2" points="{path}"/>')
        parts += [f'<circle class="{colour}" cx="{x:.1f}" cy="{y:.1f}" r="4"/>' for x, y in places]
        parts.append(text(places[-1][0] + 10, places[-1][1] + 5, f"{name}"))
    return picture(bottom + 40, "Validating a token of 5, 200, 5,000 and 50,000 groups", parts)


CHARTS = (("bench-peers.svg", "Validation beside the floor and the peers", draw_peers),
          ("bench-growth.svg", "Validation by size of the token", draw_growth),
          ("bench-ratios.svg", "Every operation beside its floor", draw_ratios),
          ("bench-callers.svg", "Acquisitions by number of callers", draw_callers))


def draw_all(results):
    """(file name, what it shows, SVG text) of each picture; without peers there is one less."""
    drawn = [(name, caption, draw(results)) for name, caption, draw in CHARTS]
    return [picture_ for picture_ in drawn if picture_[2]]
