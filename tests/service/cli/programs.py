"""Runs the programs under test."""

import collections
import os
import pathlib
import subprocess
import tempfile
import unittest

SSOCLIENT = os.environ["SSOCLIENT"]
DATA = pathlib.Path(os.environ["TEST_DATA_DIR"])

DONE, REFUSED, USAGE, BAD_CREDENTIALS, COMMUNICATION = range(5)

Result = collections.namedtuple("Result", "code out err")


def run(*command, stdin=""):
    """Runs a program without a terminal."""
    result = subprocess.run([str(part) for part in command], input=stdin, text=True,
                            capture_output=True, start_new_session=True, timeout=120)
    return Result(result.returncode, result.stdout, result.stderr)


def ssoclient(*arguments, stdin=""):
    return run(SSOCLIENT, *arguments, stdin=stdin)


class ProgramTest(unittest.TestCase):
    """A test with a folder of its own."""

    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = pathlib.Path(folder.name)

    def write(self, name, text):
        path = self.folder / name
        path.write_text(text, "utf-8")
        return path

    def assert_fails(self, result, code, class_name, message):
        """Exactly one line on standard error, and nothing on standard output."""
        self.assertEqual(f"ssoclient: {class_name}: {message}\n", result.err)
        self.assertEqual("", result.out)
        self.assertEqual(code, result.code)

    def assert_fails_matching(self, result, code, class_name, pattern):
        self.assertRegex(result.err, rf"\Assoclient: {class_name}: {pattern}\n\Z")
        self.assertEqual(1, result.err.count("\n"))
        self.assertEqual("", result.out)
        self.assertEqual(code, result.code)


class DevelopmentSts:
    """The development STS, running on a port of its own until `stop`."""

    USER = "alice@example.test"
    PASSWORD = "alice-secret"

    def __init__(self, *switches):
        self._folder = tempfile.TemporaryDirectory()
        self.state = pathlib.Path(self._folder.name)
        self._process = subprocess.Popen(
            [os.environ["DEVSTS"], "--state", str(self.state), *switches],
            stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, text=True)
        self.url = self._read_url()
        self.ca = self.state / "ca.pem"
        self.trust = self.state / "sts.pem"

    def _read_url(self):
        for line in self._process.stdout:
            if line.startswith("listening on "):
                return line.split()[2]
        raise AssertionError("the development STS did not start")

    @property
    def service_options(self):
        return ["--url", self.url, "--ca", self.ca, "--trust", self.trust]

    def stop(self):
        self._process.terminate()
        self._process.wait(timeout=60)
        self._process.stdout.close()
        self._folder.cleanup()
