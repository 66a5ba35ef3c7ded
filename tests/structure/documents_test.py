"""The documents agree with the code."""

import os
import re
import subprocess
import unittest

import sources

EXCEPTION = re.compile(r"^class (?:\w+_API )?(\w+)\s*:\s*public (?:Quillon::)?ExceptionOf<",
                       re.MULTILINE)


def read(name):
    return (sources.ROOT / name).read_text("utf-8")


def help_of(*command):
    return subprocess.run([os.environ["SSOCLIENT"], *command, "--help"],
                          capture_output=True, text=True, check=True).stdout


class Documents(unittest.TestCase):
    def test_readme_shows_the_example_program(self):
        blocks = re.findall(r"^```cpp\n(.*?)^```$", read("README.md"), re.MULTILINE | re.DOTALL)
        self.assertIn(read("examples/acquire_with_password.cpp"), blocks)

    def test_every_exception_class_is_described(self):
        text = read("docs/errors.md")
        classes = [name for path in sources.files("lib/public")
                   for name in EXCEPTION.findall(path.read_text("utf-8"))]
        self.assertIn("ParseException", classes)
        self.assertIn("InvalidArgumentException", classes)
        self.assertEqual([], [name for name in classes if f"`{name}`" not in text])

    def test_every_text_of_an_error_stands_in_the_code(self):
        text = read("docs/errors.md")
        texts = re.findall(r"^\| `([^`]+)` \|", text[text.index("## Every operation"):], re.MULTILINE)
        self.assertGreater(len(texts), 40)
        code = "".join(sources.without_comments(path.read_text("utf-8"))
                       for path in sources.files("lib"))
        code = re.sub(r'"\s*"', "", code).replace("\\\\", "\\")
        self.assertEqual([], [text for text in texts
                              if any(piece.strip() not in code
                                     for piece in re.split("'…'|…", text))])

    @unittest.skipUnless("SSOCLIENT" in os.environ, "the command line is not built")
    def test_every_option_of_the_command_line_is_described(self):
        text = read("docs/usage.md")
        for command in (["acquire", "password"], ["acquire", "certificate"], ["acquire", "token"],
                        ["acquire", "gss"], ["renew"], ["validate"], ["inspect"]):
            options = set(re.findall(r"--[a-z][a-z-]+", help_of(*command))) - {"--help"}
            self.assertIn("--trust", options)
            for option in options:
                with self.subTest(command=command, option=option):
                    self.assertIn(option, text)

    def test_links_between_documents_lead_somewhere(self):
        documents = [*sources.ROOT.glob("*.md"), *(sources.ROOT / "docs").rglob("*.md")]
        self.assertGreater(len(documents), 5)
        dead = [f"{sources.name(document)}: {target}" for document in documents
                for target in re.findall(r"\]\(([^)#:]+)(?:#[^)]*)?\)", document.read_text("utf-8"))
                if not (document.parent / target).exists()]
        self.assertEqual([], dead)


if __name__ == "__main__":
    unittest.main()
