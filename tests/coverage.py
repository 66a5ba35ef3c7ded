"""Adds up what gcovr says of each source, unit by unit, and judges the units that have a goal."""

import collections
import json
import sys

LINES, BRANCHES = 95.0, 90.0
WITH_GOAL = {"lib/ssoClient/token", "lib/ssoClient/protocol", "lib/quillon/xml",
             "lib/quillon/xml/security"}


def percent(covered, total):
    return 100.0 * covered / total if total else 100.0


def main(summary):
    with open(summary, encoding="utf-8") as file:
        sources = json.load(file)["files"]
    units = collections.defaultdict(lambda: [0, 0, 0, 0])
    for source in sources:
        unit = units[source["filename"].rpartition("/")[0]]
        for i, name in enumerate(("line_covered", "line_total",
                                  "branch_covered", "branch_total")):
            unit[i] += source[name]
    missing = WITH_GOAL - set(units)
    below = sorted(missing)
    print("| Unit | Lines | Branches |\n| --- | --- | --- |")
    for name, (lines, all_lines, branches, all_branches) in sorted(units.items()):
        values = percent(lines, all_lines), percent(branches, all_branches)
        print(f"| `{name}` | {values[0]:.1f} % of {all_lines} "
              f"| {values[1]:.1f} % of {all_branches} |")
        if name in WITH_GOAL and (values[0] < LINES or values[1] < BRANCHES):
            below.append(name)
    for name in below:
        print(f"below {LINES:.0f} % of lines or {BRANCHES:.0f} % of branches: {name}")
    return 1 if below else 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1]))
