"""Runs `ssoclient keep`, and waits for what it says and does."""

import json
import os
import queue
import re
import signal
import subprocess
import threading
import time

from programs import DONE, SSOCLIENT, DevelopmentSts, ServiceTest, ssoclient

DEADLINE = 60  # seconds; far beyond what anything here takes
WRITTEN = r"ssoclient: a new token of \S+ is in `.+', valid until (\S+Z); another is asked for at \S+Z\Z"


def wait_for(condition, what):
    """Looks again and again, as nobody tells when it is so."""
    end = time.monotonic() + DEADLINE
    while not condition():
        if time.monotonic() > end:
            raise AssertionError(f"waited in vain for {what}")
        threading.Event().wait(0.01)


class Keeping:
    """A running `ssoclient keep`."""

    def __init__(self, *arguments, launcher=(), environment=None, stdin=None):
        self.process = subprocess.Popen(
            [*launcher, SSOCLIENT, "keep", *map(str, arguments)], text=True,
            stdin=subprocess.DEVNULL if stdin is None else subprocess.PIPE,
            stdout=subprocess.PIPE, stderr=subprocess.PIPE,
            env=None if environment is None else {**os.environ, **environment})
        if stdin is not None:
            self.process.stdin.write(stdin)
            self.process.stdin.close()
        self._lines = queue.Queue()
        self._reader = threading.Thread(target=self._read)
        self._reader.start()

    def _read(self):
        for line in self.process.stderr:
            self._lines.put(line.rstrip("\n"))
        self._lines.put(None)

    def line(self):
        """The next line of standard error; None at its end."""
        return self._lines.get(timeout=DEADLINE)

    def find(self, pattern):
        """The match of the first further line that has one."""
        passed = []
        while (line := self.line()) is not None:
            if match := re.search(pattern, line):
                return match
            passed.append(line)
        raise AssertionError(f"no line has {pattern}: {passed}")

    def send(self, number):
        self.process.send_signal(number)

    def end(self, number=signal.SIGTERM):
        """Ends it. Returns the exit code and the lines that nobody has read."""
        if self.process.poll() is None:
            self.process.send_signal(number)
        code = self.process.wait(timeout=DEADLINE)
        self._reader.join(timeout=DEADLINE)
        lines = []
        while not self._lines.empty():
            lines.append(self._lines.get())
        self.process.stdout.close()
        self.process.stderr.close()
        return code, [line for line in lines if line is not None]


class KeepTest(ServiceTest):
    """A test with a development STS, a token file and a status file."""

    def setUp(self):
        super().setUp()
        self.file = self.folder / "token.xml"
        self.status_file = self.folder / "status.json"

    @property
    def by_password(self):
        return ["--method", "password", *self.sts.service_options, "--user", DevelopmentSts.USER,
                "--password-file", self.password]

    def keep(self, *options, way=None, file=None, **others):
        keeping = Keeping(file or self.file, *(self.by_password if way is None else way), *options,
                          **others)
        self.addCleanup(self._end, keeping)
        return keeping

    @staticmethod
    def _end(keeping):
        if not keeping.process.stderr.closed:
            keeping.process.kill()
            keeping.end()

    def token_id(self):
        """The ID of the token in the file, which verifies."""
        result = ssoclient("inspect", self.file, "--trust", self.sts.trust, "--json")
        self.assertEqual((DONE, ""), (result.code, result.err))
        return json.loads(result.out)["id"]

    def status(self):
        return json.loads(self.status_file.read_text("utf-8"))

    def assert_ends(self, keeping, number=signal.SIGTERM):
        code, lines = keeping.end(number)
        self.assertEqual(0, code, lines)
        return lines
