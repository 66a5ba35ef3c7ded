"""Words that must not stand in the project, or not in one of its layers."""

import re
import subprocess
import unittest

import sources

# Put together from pieces, so that this file does not hold the words itself.
UNWANTED = re.compile("|".join([
    r"\bParts? [1-5]" + r"\.[0-9]",
    "spec" + r"\.md",
    "[Tt]he speci" + "fication",
    "[Ss]eed docu" + "ment",
    "as speci" + "fied",
    "per the sp" + r"ec\b",
    r"\.libr" + "ary",
    "/wo" + "rk/",
    "/fa" + "rm/",
]))

PROTOCOL_WORDS = re.compile(r"saml|soap|ws-?trust|wsse|\bwst\b|security ?token", re.IGNORECASE)


def git(*arguments):
    return subprocess.run(
        ["git", "-C", str(sources.ROOT), *arguments], capture_output=True, check=True).stdout


def is_git_checkout():
    try:
        git("rev-parse", "--git-dir")
    except (OSError, subprocess.CalledProcessError):
        return False
    return True


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

    @unittest.skipUnless(is_git_checkout(), "not a git checkout")
    def test_tracked_files_hold_no_unwanted_words(self):
        names = git("ls-files", "-z").decode().split("\0")
        paths = [sources.ROOT / name for name in names if name]
        self.assertIn(sources.ROOT / "CMakeLists.txt", paths)
        self.assert_nowhere(UNWANTED, (
            (sources.name(path), path.read_text("utf-8", "replace"))
            for path in paths if path.is_file()))

    @unittest.skipUnless(is_git_checkout(), "not a git checkout")
    def test_commit_messages_hold_no_unwanted_words(self):
        self.assert_nowhere(UNWANTED, [("log", git("log", "--format=%B").decode())])


class WordsTestItself(unittest.TestCase):
    def test_comments_go_and_literals_stay(self):
        text = 'a("saml // x"); // soap\n/* soap\n */ b(R"x(/* wst */)x", \'"\'); // "saml"'
        bare = sources.without_comments(text)
        self.assertIn("saml // x", bare)
        self.assertIn("/* wst */", bare)
        self.assertNotIn("soap", bare)
        self.assertNotIn('"saml"', bare)

    def test_unwanted_words_are_found(self):
        for text in ("see Part 2" + ".1", "the speci" + "fication says", "/wo" + "rk/x"):
            self.assertTrue(UNWANTED.search(text), text)


if __name__ == "__main__":
    unittest.main()
