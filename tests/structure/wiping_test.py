"""Secrets are overwritten in one place."""

import pathlib
import re
import tempfile
import unittest

import sources

# What C offers for it, and what a compiler may leave out.
CALLS = re.compile(r"\b(explicit_bzero|explicit_memset|memset_s|bzero|OPENSSL_cleanse)\s*\(")


def files_that_wipe(paths):
    return [path for path in paths
            if CALLS.search(sources.without_comments(path.read_text("utf-8")))]


class Wiping(unittest.TestCase):
    def test_the_call_stands_in_one_file(self):
        self.assertEqual([sources.ROOT / "lib/public/quillon/Wiped.h"],
                         files_that_wipe(sources.files("lib", "tools", "examples")))

    def test_a_second_call_is_found(self):
        with tempfile.TemporaryDirectory() as folder:
            source = pathlib.Path(folder) / "secret.cpp"
            for text, is_call in (("void f() { ::explicit_bzero(p, 1); }", True),
                                 ("void f() { OPENSSL_cleanse (p, 1); }", True),
                                 ("void f() { Wipe(p, 1); } // not explicit_bzero(p, 1)", False)):
                source.write_text(text, "utf-8")
                self.assertEqual(is_call, bool(files_that_wipe([source])), text)


if __name__ == "__main__":
    unittest.main()
