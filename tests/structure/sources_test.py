"""Every source is built because a CMakeLists.txt names it, and none because it lies there."""

import re
import unittest

import sources

FOLDERS = ("lib", "tools", "tests")
LISTS = [path for folder in FOLDERS for path in sorted((sources.ROOT / folder).rglob("CMakeLists.txt"))]
WORD = re.compile(r"[^\s()]+\.cpp\b")


def named(cmake):
    """The sources that a CMakeLists.txt names."""
    words = WORD.findall(cmake.read_text("utf-8"))
    # A path that is absolute replaces the folder in front of it.
    return {cmake.parent / word.replace("${PROJECT_SOURCE_DIR}", str(sources.ROOT))
            for word in words}


class Sources(unittest.TestCase):
    def test_every_source_is_named(self):
        all_named = set().union(*map(named, LISTS))
        self.assertEqual([], [sources.name(path) for path in sources.files(*FOLDERS)
                              if path.suffix == ".cpp" and path not in all_named])

    def test_no_list_is_a_pattern(self):
        self.assertEqual([], [sources.name(path) for path in LISTS
                              if "file(GLOB" in path.read_text("utf-8")])


if __name__ == "__main__":
    unittest.main()
