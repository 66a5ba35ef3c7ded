"""The manual pages and completions that are made from the help."""

import os
import pathlib
import re
import unittest

from programs import DONE, run, ssoclient

SHARE = pathlib.Path(os.environ["SHARE"])
COMMANDS = ("", "acquire", "acquire password", "acquire certificate", "acquire token",
            "acquire gss", "keep", "renew", "validate", "inspect", "doctor", "profile", "profile show")
BASH = SHARE / "bash-completion" / "completions" / "ssoclient"
ZSH = SHARE / "zsh" / "site-functions" / "_ssoclient"
FISH = SHARE / "fish" / "vendor_completions.d" / "ssoclient.fish"


def options(command):
    return set(re.findall(r"^  (?:-h,)?(--[a-z-]+)",
                          ssoclient(*command.split(), "--help").out, re.MULTILINE))


class ManualPages(unittest.TestCase):
    def page(self, command):
        return SHARE / "man" / "man1" / ("-".join(["ssoclient", *command.split()]) + ".1")

    def test_there_is_one_for_every_command(self):
        self.assertEqual(sorted(map(self.page, COMMANDS)),
                         sorted((SHARE / "man" / "man1").iterdir()))

    def test_are_well_formed(self):
        result = run("mandoc", "-T", "lint", "-W", "warning", *map(self.page, COMMANDS))
        # A date would make another page of the same source.
        self.assertEqual([], [line for line in result.out.splitlines()
                              if not line.endswith('WARNING: missing date, using "": TH')])

    def test_show_every_option(self):
        for command in COMMANDS:
            with self.subTest(command=command):
                text = run("mandoc", "-T", "ascii", self.page(command)).out
                shown = re.sub(".\b", "", text)  # bold and underlined as on a typewriter
                self.assertEqual(options(command), set(re.findall(
                    r"^ {7}(?:-h, )?(--[a-z-]+)", shown, re.MULTILINE)))


class Completions(unittest.TestCase):
    def assert_quiet(self, *command):
        self.assertEqual((DONE, "", ""), run(*command))

    def test_are_read_by_their_shells(self):
        self.assert_quiet("bash", "-n", BASH)
        self.assert_quiet("zsh", "-n", ZSH)
        self.assert_quiet("fish", "--no-execute", FISH)

    def bash(self, *words):
        script = ('source "$1"; shift; COMP_WORDS=("$@"); COMP_CWORD=$(($# - 1)); _ssoclient; '
                  'printf "%s\\n" "${COMPREPLY[@]}"')
        result = run("bash", "-c", script, "bash", BASH, "ssoclient", *words)
        self.assertEqual((DONE, ""), (result.code, result.err))
        return set(result.out.split())

    def fish(self, *words):
        result = run("fish", "-c", f"source {FISH}; complete -C '{' '.join(['ssoclient', *words])}'")
        self.assertEqual((DONE, ""), (result.code, result.err))
        return {line.split("\t")[0] for line in result.out.splitlines()}

    def test_know_commands_and_options(self):
        for complete in (self.bash, self.fish):
            self.assertEqual({"acquire", "keep", "renew", "validate", "inspect", "doctor",
                              "profile"},
                             complete(""))
            self.assertEqual({"password", "certificate", "token", "gss"}, complete("acquire", ""))
            for command in COMMANDS[2:11]:
                with self.subTest(command=command):
                    self.assertEqual(options(command), complete(*command.split(), "--"))

    def test_know_which_values_are_files(self):
        name = pathlib.Path(__file__).name
        beginning = str(pathlib.Path(__file__).parent / name[:-3])
        for complete in (self.bash, self.fish):
            self.assertTrue(complete("validate", "--trust", beginning))
            self.assertTrue(complete("inspect", beginning))
            self.assertEqual(set(), complete("validate", "--url", beginning))


if __name__ == "__main__":
    unittest.main()
