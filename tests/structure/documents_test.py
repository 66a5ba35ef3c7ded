"""The documents agree with the code."""

import os
import re
import subprocess
import unittest

import error_texts
import sources

EXCEPTION = re.compile(r"^class (?:\w+_API )?(\w+)\s*:\s*public (?:Quillon::)?ExceptionOf<",
                       re.MULTILINE)


def read(name):
    return (sources.ROOT / name).read_text("utf-8")


def texts_that_are_no_errors():
    lines = read("tests/structure/texts_that_are_no_errors.txt").splitlines()
    return [line for line in lines if line and not line.startswith("#")]


def error_tables():
    """The tables of docs/errors.md about texts and codes: their columns and their rows."""
    for table in re.findall(r"^\|.*\n\|[ |-]+\n(?:\|.*\n)+", read("docs/errors.md"), re.MULTILINE):
        header, _, *rows = ([cell.strip() for cell in line.strip("|").split(" | ")]
                            for line in table.splitlines())
        if header[0] in ("Text", "Code"):
            yield header, rows


def help_of(*command):
    return subprocess.run([os.environ["SSOCLIENT"], *command, "--help"],
                          capture_output=True, text=True, check=True).stdout


def tests_by_suite():
    """The names of tests and of their suites; of the Python tests, the classes."""
    found = {}
    for path in sources.files("tests"):
        for suite, name in re.findall(r"^TEST(?:_F|_P)?\((\w+),\s*(\w+)\)",
                                      path.read_text("utf-8"), re.MULTILINE):
            found.setdefault(suite, set()).add(f"{suite}.{name}")
    for path in (sources.ROOT / "tests").rglob("*_test.py"):
        for suite in re.findall(r"^class (\w+)\(", path.read_text("utf-8"), re.MULTILINE):
            found.setdefault(suite, set())
    return found


class Documents(unittest.TestCase):
    def test_every_promise_of_the_threat_model_is_held_by_tests_that_exist(self):
        suites = tests_by_suite()
        names = set(suites).union(*suites.values())
        section = read("docs/threat-model.md").split("## Promises, and what holds them")[1]
        rows = re.findall(r"^\| ([^|]+) \| ([^|]+) \|$", section.split("\n## ")[0], re.MULTILINE)
        promises = [row for row in rows if row[0] != "Promise" and set(row[0]) != {"-"}]
        self.assertGreater(len(promises), 20)
        for promise, tests in promises:
            held_by = re.findall(r"`([^`]+)`", tests)
            with self.subTest(promise=promise):
                self.assertTrue(held_by)
                self.assertEqual([], [name for name in held_by if name not in names])

    def test_readme_shows_the_example_program(self):
        blocks = re.findall(r"^```cpp\n(.*?)^```$", read("README.md"), re.MULTILINE | re.DOTALL)
        self.assertIn(read("examples/acquire_with_password.cpp"), blocks)

    def test_guide_of_token_sources_shows_its_example_program(self):
        blocks = re.findall(r"^```cpp\n(.*?)^```$", read("docs/long-running.md"),
                            re.MULTILINE | re.DOTALL)
        self.assertIn(read("examples/keep_token.cpp"), blocks)

    def test_every_exception_class_is_described(self):
        text = read("docs/errors.md")
        classes = [name for path in sources.files("lib/public")
                   for name in EXCEPTION.findall(path.read_text("utf-8"))]
        self.assertIn("ParseException", classes)
        self.assertIn("InvalidArgumentException", classes)
        self.assertEqual([], [name for name in classes if f"`{name}`" not in text])

    def test_every_error_has_a_cause_and_a_remedy(self):
        count = 0
        for header, rows in error_tables():
            self.assertEqual(["Cause", "Remedy"], header[-2:])
            for row in rows:
                count += 1
                with self.subTest(row=row):
                    self.assertEqual(len(header), len(row))
                    self.assertTrue(all(row))
        self.assertGreater(count, 250)

    def test_every_fault_code_of_the_standards_is_described(self):
        codes = {code for header, rows in error_tables() if header[0] == "Code" for row in rows
                 for code in re.findall(r"`([\w:]+)`", row[0])}
        trust = ("AuthenticationBadElements", "BadRequest", "ExpiredData", "FailedAuthentication",
                 "InvalidRequest", "InvalidScope", "InvalidSecurityToken", "InvalidTimeRange",
                 "RenewNeeded", "RequestFailed", "UnableToRenew")  # [WST13 11]
        security = ("FailedAuthentication", "FailedCheck", "InvalidSecurity", "InvalidSecurityToken",
                    "MessageExpired", "SecurityTokenUnavailable", "UnsupportedAlgorithm",
                    "UnsupportedSecurityToken")  # [WSS 12]
        soap = ("Client", "MustUnderstand", "Server", "VersionMismatch")  # [SOAP11 4.4.1]
        expected = {f"{prefix}:{name}" for prefix, names in (
            ("wst", trust), ("wsse", security), ("S", soap)) for name in names}
        self.assertEqual(expected, codes - {"wsu:MessageExpired"})

    def test_every_text_of_an_error_stands_in_the_code(self):
        rows = [text for header, rows in error_tables() if header[0] == "Text" for row in rows
                for text in re.findall(r"`([^`]+)`", row[0])]
        self.assertGreater(len(rows), 100)
        code = "\n".join(literal for path in sources.files("lib")
                         for literal in error_texts.literals(path))
        self.assertEqual([], [row for row in rows
                              if any(piece not in code for piece in error_texts.pieces(row))])

    def test_every_text_of_the_code_is_an_error_that_is_described_or_none(self):
        described = " ".join(read("docs/errors.md").split())
        others = set(map(error_texts.trimmed, texts_that_are_no_errors()))
        undescribed = {
            f"{sources.name(path)}: {literal}" for path in sources.files("lib")
            for literal in error_texts.literals(path)
            if " " in literal.strip() and error_texts.trimmed(literal) not in others
            and error_texts.trimmed(literal) not in described}
        self.assertEqual([], sorted(undescribed))

    def test_texts_that_are_no_errors_stand_in_the_code(self):
        code = {error_texts.trimmed(literal) for path in sources.files("lib")
                for literal in error_texts.literals(path)}
        self.assertEqual([], [text for text in texts_that_are_no_errors()
                              if error_texts.trimmed(text) not in code])

    @unittest.skipUnless("SSOCLIENT" in os.environ, "the command line is not built")
    def test_every_option_of_the_command_line_is_described(self):
        text = read("docs/usage.md")
        for command in (["acquire", "password"], ["acquire", "certificate"], ["acquire", "token"],
                        ["acquire", "gss"], ["keep"], ["renew"], ["validate"], ["inspect"], ["doctor"]):
            options = set(re.findall(r"--[a-z][a-z-]+", help_of(*command))) - {"--help"}
            self.assertIn("--trust", options)
            for option in options:
                with self.subTest(command=command, option=option):
                    self.assertIn(option, text)

    def test_every_option_of_the_build_is_described(self):
        text = read("docs/building.md")
        options = {name for path in (sources.ROOT / "cmake").glob("*.cmake") for names in re.findall(
            r"^\s*(?:option\((\w+)|set\((\w+) .*CACHE)", path.read_text("utf-8"), re.MULTILINE)
            for name in names if name}
        self.assertIn("SSOCLIENT_BUILD_GSS", options)
        self.assertIn("SSOCLIENT_SANITIZE", options)
        self.assertEqual([], [name for name in sorted(options)
                              if not name.startswith("SSOCLIENT_") or f"| `{name}` |" not in text])
        described = set(re.findall(r"^\| `(SSOCLIENT_\w+)` \|", text, re.MULTILINE))
        self.assertEqual(options, described)

    def test_links_between_documents_lead_somewhere(self):
        documents = [*sources.ROOT.glob("*.md"), *(sources.ROOT / "docs").rglob("*.md")]
        self.assertGreater(len(documents), 5)
        dead = [f"{sources.name(document)}: {target}" for document in documents
                for target in re.findall(r"\]\(([^)#:]+)(?:#[^)]*)?\)", document.read_text("utf-8"))
                if not (document.parent / target).exists()]
        self.assertEqual([], dead)


if __name__ == "__main__":
    unittest.main()
