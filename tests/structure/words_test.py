"""Words that must not stand in the lower layer."""

import re
import unittest

import sources

PROTOCOL_WORDS = re.compile(r"saml|soap|ws-?trust|wsse|\bwst\b|security ?token", re.IGNORECASE)


class Words(unittest.TestCase):
    def assert_nowhere(self, pattern, texts):
        self.assertEqual([], [
            f"{name}: {match.group()}" for name, text in texts
            for match in pattern.finditer(text)])

    def test_quillon_knows_no_protocol(self):
        paths = sources.files("lib/quillon", "lib/public/quillon")
        self.assert_nowhere(PROTOCOL_WORDS, (
            (sources.name(path), sources.without_comments(path.read_text("utf-8")))
            for path in paths))


if __name__ == "__main__":
    unittest.main()
