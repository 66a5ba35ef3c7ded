"""Draws time and memory over size, from the files that the benchmarks write: plot.py BENCH MEMORY SVG."""

import json
import math
import statistics
import sys

WIDTH, HEIGHT, MARGIN = 420, 320, 60
COLOURS = {"Own": "#0b6e4f", "Floor": "#888888", "xmlsec1": "#c1440e"}
NAMES = {"Own": "SsoClient", "Floor": "floor", "xmlsec1": "xmlsec1"}
PREFIX = "Growth/groups/"


def read_times(path):
    """By who does it, octets of the token and the median of the microseconds."""
    times = {}
    with open(path, encoding="utf-8") as file:
        runs = json.load(file)["benchmarks"]
    for run in runs:
        who, _, operation = run["name"].partition("/")
        if run["run_type"] == "iteration" and operation.startswith(PREFIX):
            times.setdefault(who, {}).setdefault(run["octets"], []).append(run["cpu_time"] / 1e3)
    return {who: sorted((size, statistics.median(all_times)) for size, all_times in sizes.items())
            for who, sizes in times.items()}


def read_peaks(path):
    """By who does it, octets of the token and the largest heap in octets."""
    peaks = {}
    with open(path, encoding="utf-8") as file:
        rows = json.load(file)
    for row in rows:
        who, _, operation = row["name"].partition("/")
        if operation.startswith(PREFIX):
            peaks.setdefault(who, []).append((row["octets"], row["peak"]))
    return {who: sorted(points) for who, points in peaks.items()}


def decades(values):
    return range(math.floor(math.log10(min(values))), math.ceil(math.log10(max(values))) + 1)


OCTETS = ("B", "kB", "MB", "GB")
MICROSECONDS = ("us", "ms", "s")


def describe(power, units):
    step = max(0, min(power // 3, len(units) - 1))
    return f"{10 ** (power - 3 * step):g} {units[step]}"


def draw_panel(left, title, units, lines):
    """One plot with a logarithm on both sides."""
    points = [point for line in lines.values() for point in line]
    across, up = decades([x for x, _ in points]), decades([y for _, y in points])

    def place(x, y):
        return (left + (math.log10(x) - across[0]) / (across[-1] - across[0]) * WIDTH,
                MARGIN + HEIGHT - (math.log10(y) - up[0]) / (up[-1] - up[0]) * HEIGHT)

    out = [f'<text x="{left}" y="{MARGIN - 24}" font-weight="bold">{title}</text>']
    for power in across:
        x, _ = place(10 ** power, 10 ** up[0])
        out.append(f'<path d="M{x:.1f} {MARGIN}v{HEIGHT}" stroke="#dddddd"/>'
                   f'<text x="{x:.1f}" y="{MARGIN + HEIGHT + 18}" text-anchor="middle">'
                   f'{describe(power, OCTETS)}</text>')
    for power in up:
        _, y = place(10 ** across[0], 10 ** power)
        out.append(f'<path d="M{left} {y:.1f}h{WIDTH}" stroke="#dddddd"/>'
                   f'<text x="{left - 6}" y="{y + 4:.1f}" text-anchor="end">'
                   f'{describe(power, units)}</text>')
    for who, line in sorted(lines.items()):
        path = " ".join(f"{x:.1f},{y:.1f}" for x, y in (place(*point) for point in line))
        x, y = place(*line[-1])
        out.append(f'<polyline points="{path}" fill="none" stroke="{COLOURS[who]}" '
                   f'stroke-width="2"/>'
                   f'<text x="{x + 6:.1f}" y="{y + 4:.1f}" fill="{COLOURS[who]}">{NAMES[who]}</text>')
    return "\n".join(out)


def draw(times, peaks):
    full_width, full_height = 2 * (WIDTH + 2 * MARGIN) + 40, HEIGHT + 2 * MARGIN
    panels = (draw_panel(MARGIN + 20, "Verify a token: time", MICROSECONDS, times)
              + draw_panel(WIDTH + 3 * MARGIN + 40, "Verify a token: peak of the heap", OCTETS,
                           peaks))
    return (f'<svg xmlns="http://www.w3.org/2000/svg" width="{full_width}" height="{full_height}" '
            f'font-family="sans-serif" font-size="12">\n<title>Time and memory of a verification '
            f'over the size of the token</title>\n'
            f'<rect width="100%" height="100%" fill="white"/>\n{panels}\n</svg>\n')


def main():
    bench, memory, svg = sys.argv[1:]
    with open(svg, "w", encoding="utf-8") as file:
        file.write(draw(read_times(bench), read_peaks(memory)))


if __name__ == "__main__":
    main()
