"""Lists the sections of standards that the libraries cite and no test does.

`python3 tests/structure/standards.py`, from anywhere. A section is cited as `[SAML-CORE 2.5.1.2]`,
several of one standard as `[WST13 4.3, 8]`; the tables of test data have a member for it.
"""

import json
import re

import sources

_CITATION = re.compile(r"\[([A-Z][A-Za-z0-9 -]*?(?: 1\.0,)?) (\d[^\]\n]*|[A-Z]\.[^\]\n]*)\]")


def cited(*folders):
    """The sections, each with the files that cite it."""
    found = {}
    for path in sources.files(*folders):
        for section in sections_in(path.read_text("utf-8")):
            found.setdefault(section, set()).add(sources.name(path))
    return found


def sections_in(text):
    for standard, sections in _CITATION.findall(text):
        for section in sections.split(", "):
            yield f"{standard.rstrip(',')} {section}"


def cited_by_tables():
    """What the rows of the test data say that they hold."""
    found = set()
    for path in (sources.ROOT / "tests" / "data").rglob("expected.json"):
        table = json.loads(path.read_text("utf-8"))
        for row in [table, *table.get("tokens", []), *table.get("assertions", [])]:
            for citation in row.get("standard", row.get("section", "")).split("; "):
                found.update(sections_in(f"[{citation}]"))
    return found


if __name__ == "__main__":
    in_tests = cited("tests").keys() | cited_by_tables()
    for section, paths in sorted(cited("lib").items()):
        if section not in in_tests:
            print(f"{section:40} {' '.join(sorted(paths))}")
