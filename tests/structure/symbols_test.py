"""The libraries export what is listed: no name comes or goes by accident."""

import os
import pathlib
import unittest

import symbols

BUILD = pathlib.Path(os.environ["BUILD_DIR"])


class Symbols(unittest.TestCase):
    def test_each_library_exports_what_is_listed(self):
        for name, library in symbols.LIBRARIES.items():
            with self.subTest(library=name):
                self.assertEqual(symbols.listed(name), symbols.exported(BUILD / library),
                                 "\nIf that is wanted: " + symbols.__doc__)


if __name__ == "__main__":
    unittest.main()
