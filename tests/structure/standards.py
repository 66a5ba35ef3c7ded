"""Lists the sections of standards that the libraries cite and no test does.

`python3 tests/structure/standards.py`, from anywhere. A section is cited as `[SAML-CORE 2.5.1.2]`,
several of one standard as `[WST13 4.3, 8]`.
"""

import re

import sources

_CITATION = re.compile(r"\[([A-Z][A-Za-z0-9 -]*?(?: 1\.0,)?) (\d[^\]\n]*|[A-Z]\.[^\]\n]*)\]")


def cited(*folders):
    """The sections, each with the files that cite it."""
    found = {}
    for path in sources.files(*folders):
        for standard, sections in _CITATION.findall(path.read_text("utf-8")):
            for section in sections.split(", "):
                found.setdefault(f"{standard.rstrip(',')} {section}", set()).add(sources.name(path))
    return found


if __name__ == "__main__":
    in_tests = cited("tests")
    for section, paths in sorted(cited("lib").items()):
        if section not in in_tests:
            print(f"{section:40} {' '.join(sorted(paths))}")
