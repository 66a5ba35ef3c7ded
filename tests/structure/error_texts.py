"""The texts in the code and those in docs/errors.md, made comparable."""

import re

import sources

_STRING = re.compile(r'R"(?P<mark>[^(\s]*)\((?P<raw>.*?)\)(?P=mark)"|"(?P<plain>(?:\\.|[^"\\\n])*)"',
                     re.DOTALL)
_DIRECTIVE = re.compile(r"^\s*#.*$", re.MULTILINE)
_STATIC_ASSERT = re.compile(r"static_assert\(.*?\);", re.DOTALL)
_ADJACENT = re.compile(r'"\s*\n\s*"')


def literals(path):
    """The string literals of a source, without those that only compilers show."""
    text = sources.without_comments(path.read_text("utf-8"))
    text = _STATIC_ASSERT.sub("", _DIRECTIVE.sub("", text))
    for match in _STRING.finditer(_ADJACENT.sub("", text)):
        if match["raw"] is not None:
            yield match["raw"]
        else:
            yield match["plain"].replace('\\"', '"').replace("\\\\", "\\")


def trimmed(text):
    """A piece of a sentence without what joins it to its neighbours."""
    return text.strip(" .,:;'`\"()…")


def pieces(sentence):
    """What is fixed in a sentence of the document: `…` stands for the rest."""
    return [piece for piece in map(trimmed, sentence.split("…")) if piece]
