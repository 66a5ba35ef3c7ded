"""Draws the course of ten thousand processes: `python3 plot.py fleet_simulation PICTURE.png`."""

import csv
import subprocess
import sys

import matplotlib
matplotlib.use("Agg")
import matplotlib.pyplot as plt  # noqa: E402: after the backend is chosen

OUTAGE = 120  # minutes after the start: when much is due that was not spread
STEADY = 10_000 / (0.7 * 3600)


def course(program, *options):
    output = subprocess.run([program, *options, str(OUTAGE)], check=True, text=True,
                            capture_output=True).stdout
    rows = list(csv.DictReader(output.splitlines()))
    return [float(row["requests_per_second"]) for row in rows]


def draw(axes, requests, title, highest):
    axes.axvspan(OUTAGE, OUTAGE + 10, color="#f3c6c0", label="outage")
    axes.axhline(STEADY, color="#888888", linewidth=0.8, label="steady load")
    axes.axhline(3 * STEADY, color="#888888", linewidth=0.8, linestyle="--", label="3 times that")
    axes.step(range(len(requests)), requests, where="post", color="#1f5f99", linewidth=1,
              label="requests a second")
    axes.set(xlim=(0, 360), ylim=(0, highest), ylabel="requests a second", title=title)


def main(program, picture):
    figure, (above, below) = plt.subplots(2, 1, figsize=(9, 6.4), layout="constrained")
    draw(above, course(program), "As it is (the start goes up to 714)", 14)
    draw(below, course(program, "--plain"), "With jitter alone", 260)
    above.legend(loc="upper right")
    below.set(xlabel="minutes since the first process started")
    figure.savefig(picture, dpi=90, metadata={"Software": None})


if __name__ == "__main__":
    if len(sys.argv) != 3:
        sys.exit(__doc__)
    main(*sys.argv[1:])
