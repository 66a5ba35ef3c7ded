"""docs/situations.md tells what the program says, and every failure leaves a next step."""

import contextlib
import unittest

import situations

# Where the line itself says what to do.
TOLD = ("(see: ssoclient ", "name the file itself", ": use --", "say --insecure-http",
        "; did you mean ")


class Situations(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        with contextlib.ExitStack() as stack:
            cls.results = list(situations.provoke(stack))

    def test_every_one_fails_with_one_line_and_a_next_step(self):
        self.assertGreater(len(self.results), 60)
        for group, title, result in self.results:
            with self.subTest(group=group, situation=title):
                self.assertIn(result.code, range(1, 6), result.err)
                self.assertEqual("", result.out)
                line, *rest = [each for each in result.err.splitlines()
                               if not each.startswith("ssoclient: passage: ")]
                self.assertRegex(line, r"\Assoclient: [A-Z][A-Za-z]+: .")
                if not any(phrase in line for phrase in TOLD):
                    hint, = rest
                    self.assertRegex(hint, r"\Assoclient: hint: .")

    def test_the_document_tells_them_as_they_are(self):
        self.maxDiff = None
        self.assertEqual(situations.DOCUMENT.read_text("utf-8"),
                         situations.describe(self.results))


if __name__ == "__main__":
    unittest.main()
