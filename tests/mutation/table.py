"""The changes that tests must notice: the rows of the *.toml files beside this one.

    [[change]]
    file = "lib/ssoClient/token/SamlTokenImpl.cpp"
    line = "constexpr long long DefaultToleranceSec = 600;"     # stands once in the file
    becomes = "constexpr long long DefaultToleranceSec = 601;"
    tests = "token_tests CreateSamlToken.*Tolerance*"           # program, and filter of tests
    equivalent = "why no test can notice"                       # only where that is so
"""

import dataclasses
import pathlib
import tomllib

ROOT = pathlib.Path(__file__).resolve().parents[2]


@dataclasses.dataclass(frozen=True)
class Change:
    table: str
    file: str
    line: str
    becomes: str
    tests: str
    equivalent: str = ""

    @property
    def program(self):
        return self.tests.split(maxsplit=1)[0]

    @property
    def filter(self):
        return self.tests.split(maxsplit=1)[1]

    def __str__(self):
        return f"{self.file}: {self.line.strip()!r} -> {self.becomes.strip()!r} ({self.tests})"


def changes():
    """All rows, those of one file together."""
    rows = [Change(table=path.stem, **row)
            for path in sorted(pathlib.Path(__file__).parent.glob("*.toml"))
            for row in tomllib.loads(path.read_text("utf-8"))["change"]]
    return sorted(rows, key=lambda change: (change.file, change.line, change.becomes))
