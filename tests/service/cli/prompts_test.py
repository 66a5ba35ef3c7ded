"""What `ssoclient` asks for, at a terminal of the test's own."""

import os
import signal
import subprocess
import sys
import unittest

from programs import DESCRIPTION, DONE, USAGE, DevelopmentSts
from terminals import TerminalTest

PROMPT = b"Password: "

# Runs a program as a shell would: as the terminal's foreground job, told of its stops.
JOB_CONTROL = """
import os, signal, sys
terminal = int(sys.argv[1])
job = os.fork()
if job == 0:
    os.setpgid(0, 0)
    signal.signal(signal.SIGTTOU, signal.SIG_IGN)
    os.tcsetpgrp(terminal, os.getpid())
    signal.signal(signal.SIGTTOU, signal.SIG_DFL)
    os.execv(sys.argv[2], sys.argv[2:])
_, status = os.waitpid(job, os.WUNTRACED)
if os.WIFSTOPPED(status):
    print("stopped", flush=True)
    sys.stdin.readline()
    os.killpg(job, signal.SIGCONT)
    _, status = os.waitpid(job, 0)
sys.exit(os.waitstatus_to_exitcode(status))
"""


class PasswordPrompt(TerminalTest):
    def acquire_at_terminal(self, options=(), **others):
        return self.start("acquire", "password", *self.sts.service_options,
                          "--user", DevelopmentSts.USER, *options, **others)

    def test_reads_without_echo(self):
        process = self.acquire_at_terminal()
        self.assertEqual(PROMPT, self.read_until(PROMPT))
        self.assertFalse(self.echoes())
        os.write(self.terminal, DevelopmentSts.PASSWORD.encode() + b"\n")
        out, err = process.communicate(timeout=120)
        self.assertEqual((DONE, ""), (process.returncode, err))
        self.assertRegex(out, DESCRIPTION)
        self.assertEqual(b"\r\n", os.read(self.terminal, 100))
        self.assertTrue(self.echoes())

    def test_signals_find_the_terminal_echoing(self):
        for number in (signal.SIGINT, signal.SIGTERM, signal.SIGHUP, signal.SIGQUIT):
            with self.subTest(signal=number):
                process = self.acquire_at_terminal()
                self.read_until(PROMPT)
                os.write(self.terminal, b"half a pass")
                process.send_signal(number)
                self.assertEqual(-number, process.wait(timeout=120))
                self.assertTrue(self.echoes())

    def test_signal_at_the_prompt_leaves_no_file(self):
        before = set(self.folder.iterdir())
        for number in (signal.SIGINT, signal.SIGTERM):
            with self.subTest(signal=number):
                process = self.acquire_at_terminal(options=["--out", self.folder / "token.xml"])
                self.read_until(PROMPT)
                process.send_signal(number)
                self.assertEqual(-number, process.wait(timeout=120))
                self.assertEqual(before, set(self.folder.iterdir()))

    def test_asks_again_after_a_stop(self):
        process = self.acquire_at_terminal(
            launcher=[sys.executable, "-c", JOB_CONTROL, str(self.far_end)],
            stdin=subprocess.PIPE)
        self.addCleanup(process.stdin.close)
        self.read_until(PROMPT)
        os.write(self.terminal, b"half a pass\x1a")  # the terminal's stop character
        self.assertEqual("stopped\n", process.stdout.readline())
        self.assertTrue(self.echoes())
        process.stdin.write("continue\n")
        process.stdin.flush()
        self.read_until(PROMPT)
        self.assertFalse(self.echoes())
        os.write(self.terminal, DevelopmentSts.PASSWORD.encode() + b"\n")
        self.assertRegex(process.stdout.readline(), DESCRIPTION)
        self.assertEqual(DONE, process.wait(timeout=120))

    def test_end_of_input_is_an_empty_password(self):
        process = self.acquire_at_terminal()
        self.read_until(PROMPT)
        os.write(self.terminal, b"\x04")
        _, err = process.communicate(timeout=120)
        self.assertEqual((USAGE, "ssoclient: UsageError: the password is empty\n"),
                         (process.returncode, err))
        self.assertTrue(self.echoes())


class KeyPassphrasePrompt(TerminalTest):
    PROMPT = b"Key passphrase: "
    PASSPHRASE = "key-secret"

    def setUp(self):
        super().setUp()
        self.key = self.encrypted_key(self.PASSPHRASE)

    def start_with_key(self, key, *command):
        return self.start("acquire", *command, *self.sts.service_options, "--key", key,
                          "--cert", self.sts.certificate)

    def answer(self, prompt, text):
        self.assertTrue(self.read_until(prompt).endswith(prompt))
        self.assertFalse(self.echoes())
        os.write(self.terminal, text.encode() + b"\n")

    def assert_done(self, process):
        out, err = process.communicate(timeout=120)
        self.assertEqual((DONE, ""), (process.returncode, err))
        self.assertRegex(out, r"confirmationType=1\]\n\Z")
        shown = os.read(self.terminal, 100)
        self.assertEqual(b"\r\n", shown)
        self.assertTrue(self.echoes())

    def test_reads_without_echo_once(self):
        for key in (self.key, f"file:{self.key}"):
            with self.subTest(key=key):
                process = self.start_with_key(key, "certificate")
                self.answer(self.PROMPT, self.PASSPHRASE)
                self.assert_done(process)

    def test_comes_before_the_password(self):
        process = self.start_with_key(self.key, "password", "--user", DevelopmentSts.USER)
        self.answer(self.PROMPT, self.PASSPHRASE)
        self.answer(PROMPT, DevelopmentSts.PASSWORD)
        self.assert_done(process)

    def test_wrong_passphrase(self):
        process = self.start_with_key(self.key, "certificate")
        self.answer(self.PROMPT, "wrong-secret")
        _, err = process.communicate(timeout=120)
        self.assertEqual(
            (USAGE, f"ssoclient: UsageError: cannot use the private key `{self.key}': "
             "Cannot read the private key: the passphrase is wrong\n"), (process.returncode, err))


if __name__ == "__main__":
    unittest.main()
