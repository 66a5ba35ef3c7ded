"""The tables of changes fit the sources. (Trying the changes takes a while: ./run mutate.)"""

import collections
import unittest

import table


class Table(unittest.TestCase):
    def test_each_line_stands_once_in_its_file(self):
        wrong = []
        for change in table.changes():
            count = (table.ROOT / change.file).read_text("utf-8").count(change.line)
            if count != 1:
                wrong.append(f"{count} times: {change}")
        self.assertEqual([], wrong)

    def test_each_change_changes_something(self):
        self.assertEqual([], [str(change) for change in table.changes()
                              if change.line == change.becomes])

    def test_no_change_is_listed_twice(self):
        counts = collections.Counter(
            (change.file, change.line, change.becomes, change.tests) for change in table.changes())
        self.assertEqual([], [row for row, count in counts.items() if count > 1])

    def test_each_change_is_in_the_libraries_and_names_program_and_tests(self):
        self.assertEqual([], [str(change) for change in table.changes()
                              if not change.file.startswith("lib/")
                              or len(change.tests.split()) != 2])

    def test_there_are_enough(self):
        self.assertGreaterEqual(len(table.changes()), 150)


if __name__ == "__main__":
    unittest.main()
