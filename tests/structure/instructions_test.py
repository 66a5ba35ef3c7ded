"""The count of instructions counts those of the libraries' own code, and complains of more than it is
allowed to grow."""

import pathlib
import sys
import unittest

ROOT = pathlib.Path(__file__).resolve().parents[2]
sys.path.insert(0, str(ROOT / "benchmarks"))

import instructions  # noqa: E402

# [Callgrind Format Specification]: a line after calls= is what was called, and an object, once it has
# been named, has a number.
PROFILE = """\
events: Ir
ob=(1) /usr/lib/libxml2.so.2
fl=(1) x.c
fn=(1) parse
10 5
ob=(2) /build/lib/libquillon.so
fn=(2) build
20 7
+3 2
* 1
cob=(1)
cfn=(1)
calls=3 10
+1 1000
ob=(1)
fn=(1)
12 100
ob=(3) /build/program
fn=(3) main
1 4
cob=(2)
cfn=(2)
calls=1 20
2 1010
"""


class Instructions(unittest.TestCase):
    def test_those_of_the_folder_are_counted_without_what_they_call(self):
        self.assertEqual(7 + 2 + 1 + 4, instructions.own_cost(PROFILE, pathlib.PurePath("/build")))
        self.assertEqual(105, instructions.own_cost(PROFILE, pathlib.PurePath("/usr")))

    def test_five_percent_more_are_allowed(self):
        self.assertIsNone(instructions.complaint("sign", 1050, 1000))
        self.assertIsNone(instructions.complaint("sign", 10, 1000))
        self.assertIn("sign takes 1,051 instructions of our own, recorded are 1,000: +5.1%.",
                      instructions.complaint("sign", 1051, 1000))

    def test_each_operation_is_recorded(self):
        self.assertEqual(set(instructions.OPERATIONS),
                         set(instructions.json.loads(instructions.RECORD.read_text("utf-8"))))


if __name__ == "__main__":
    unittest.main()
