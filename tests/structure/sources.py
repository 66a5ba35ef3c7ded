"""Reads the project's sources for the structure tests."""

import pathlib
import re

ROOT = pathlib.Path(__file__).resolve().parents[2]

_INCLUDE = re.compile(r'^\s*#\s*include\s*([<"])([^>"]+)[>"]', re.MULTILINE)
# A string literal is matched first, so that a comment sign within it starts no comment.
_LITERAL_OR_COMMENT = re.compile(
    r'(?P<literal>R"(?P<mark>[^(\s]*)\(.*?\)(?P=mark)"|"(?:\\.|[^"\\\n])*"|\'(?:\\.|[^\'\\\n])+\')'
    r"|//[^\n]*|/\*.*?\*/", re.DOTALL)


def files(*folders):
    """All C++ files under the folders, which must exist; never an empty list."""
    found = []
    for folder in folders:
        inside = [path for path in sorted((ROOT / folder).rglob("*"))
                  if path.suffix in (".h", ".cpp")]
        if not inside:
            raise AssertionError(f"no sources under {folder}")
        found += inside
    return found


def name(path):
    return path.relative_to(ROOT).as_posix()


def without_comments(text):
    return _LITERAL_OR_COMMENT.sub(lambda match: match.group("literal") or " ", text)


class Include:
    def __init__(self, path, style, target):
        self.path = path
        self.is_quoted = style == '"'
        self.target = target

    def __repr__(self):
        return f"{name(self.path)} includes {self.target}"

    def resolves_under(self, *folders):
        return any((ROOT / folder / self.target).is_file() for folder in folders)


def includes(paths):
    return [Include(path, style, target) for path in paths
            for style, target in _INCLUDE.findall(path.read_text("utf-8"))]
