"""What the formatter does not see to."""

import re
import unittest

import sources

FOLDERS = ("lib", "tools", "tests", "benchmarks", "examples")
TYPE = re.compile(r"^(class|struct|enum class|using [A-Z]\w+ =)[ \n]", re.MULTILINE)
CONST_BEHIND = re.compile(r"[\w>] const ?&(?!&)")


def texts(*folders):
    return ((sources.name(path), path.read_text("utf-8")) for path in sources.files(*folders))


def defines_a_type(header):
    return any(TYPE.search(path.read_text("utf-8"))
               for path in (header, header.with_suffix(".cpp")) if path.exists())


class Style(unittest.TestCase):
    def test_every_header_is_included_once(self):
        self.assertEqual([], [name for name, text in texts("lib", "tools", "tests", "benchmarks")
                              if name.endswith(".h") and text.count("#pragma once\n") != 1])

    def test_every_header_of_the_libraries_says_what_it_is_for(self):
        self.assertEqual([], [name for name, text in texts("lib")
                              if name.endswith(".h")
                              and not re.search(r"^ *(/\*\*|//)", text, re.MULTILINE)])

    def test_a_private_header_of_functions_alone_has_a_small_letter(self):
        headers = [path for path in sources.files("lib")
                   if path.suffix == ".h" and "public" not in path.parts
                   and path.name[0].isupper()]
        self.assertEqual([], [sources.name(path) for path in headers if not defines_a_type(path)])

    def test_const_stands_before_the_type(self):
        self.assertEqual([], [f"{name}: {match.group()}" for name, text in texts(*FOLDERS)
                              for match in CONST_BEHIND.finditer(sources.without_comments(text))])


if __name__ == "__main__":
    unittest.main()
